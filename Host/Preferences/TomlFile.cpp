#include "Host/Preferences/TomlFile.h"

#include <fcntl.h>
#include <unistd.h>

#include <toml++/toml.h>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>
#include <sstream>

namespace palisade {
namespace {

Value valueFromToml(const toml::node& node);

Dictionary dictionaryFromToml(const toml::table& table) {
  Dictionary dictionary;
  for (const auto& [key, node] : table) dictionary.set(std::string(key.str()), valueFromToml(node));
  return dictionary;
}

template <typename Content>
std::string textOf(const Content& content) {
  std::ostringstream text;
  text << content;
  return text.str();
}

Value valueFromToml(const toml::node& node) {
  if (const auto* table = node.as_table()) return dictionaryFromToml(*table);
  if (const auto* list = node.as_array()) {
    Array array;
    for (const toml::node& element : *list) array.push_back(valueFromToml(element));
    return array;
  }
  if (const auto* text = node.as_string()) return text->get();
  if (const auto* boolean = node.as_boolean()) return boolean->get();
  if (const auto* integer = node.as_integer()) return integer->get();
  if (const auto* real = node.as_floating_point()) return real->get();
  if (const auto* date = node.as_date()) return textOf(date->get());
  if (const auto* time = node.as_time()) return textOf(time->get());
  return textOf(node.as_date_time()->get());
}

toml::table tableFromDictionary(const Dictionary& dictionary);
toml::array arrayFromValues(const Array& array);

// Calls `insert` with the TOML form of `value`; not at all for null, which TOML lacks.
template <typename Insert>
void insertAsToml(const Value& value, const Insert& insert) {
  if (const bool* boolean = value.boolean()) insert(*boolean);
  if (const std::int64_t* integer = value.integer()) insert(*integer);
  if (const std::uint64_t* largeInteger = value.largeInteger()) insert(static_cast<double>(*largeInteger));
  if (const double* real = value.real()) insert(*real);
  if (const std::string* text = value.string()) insert(*text);
  if (const Array* array = value.array()) insert(arrayFromValues(*array));
  if (const Dictionary* dictionary = value.dictionary()) insert(tableFromDictionary(*dictionary));
}

toml::array arrayFromValues(const Array& array) {
  toml::array list;
  for (const Value& element : array) insertAsToml(element, [&](const auto& content) { list.push_back(content); });
  return list;
}

toml::table tableFromDictionary(const Dictionary& dictionary) {
  toml::table table;
  for (const auto& entry : dictionary) {
    insertAsToml(entry.second, [&](const auto& content) { table.insert_or_assign(entry.first, content); });
  }
  return table;
}

[[noreturn]] void failToRead(const std::filesystem::path& path) {
  throw TomlError(path.string() + " cannot be read: " + std::strerror(errno) + ".");
}

[[noreturn]] void failToWrite(const std::filesystem::path& path) {
  throw TomlError(path.string() + " cannot be written: " + std::strerror(errno) + ".");
}

}  // namespace

std::optional<Dictionary> readTomlFile(const std::filesystem::path& path) {
  std::ifstream file(path);
  if (!file) {
    if (errno == ENOENT || errno == ENOTDIR) return std::nullopt;
    failToRead(path);
  }
  try {
    // Read here: the parser takes a failure, such as a folder's, for the end of the file.
    const std::string content(std::istreambuf_iterator<char>(file), {});
    return dictionaryFromToml(toml::parse(content, path.string()));
  } catch (const std::ios_base::failure&) {
    failToRead(path);
  } catch (const toml::parse_error& error) {
    throw TomlError(path.string() + ", line " + std::to_string(error.source().begin.line) + ", column " +
                    std::to_string(error.source().begin.column) + ": " + std::string(error.description()) + ".");
  }
}

void writeTomlFile(const std::filesystem::path& path, const Dictionary& table) {
  const std::string content = textOf(tableFromDictionary(table)) + "\n";
  // The name begins with a dot, so whoever watches the folder passes over the file until it has its real name.
  const std::filesystem::path draft = path.parent_path() / ("." + path.filename().string() + "." + std::to_string(getpid()));
  const int file = open(draft.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW, 0600);
  if (file < 0) failToWrite(path);
  const bool isWritten =
      write(file, content.data(), content.size()) == static_cast<ssize_t>(content.size()) && fsync(file) == 0;
  const int error = errno;
  close(file);
  errno = error;
  if (!isWritten || rename(draft.c_str(), path.c_str()) != 0) {
    const int cause = errno;
    unlink(draft.c_str());
    errno = cause;
    failToWrite(path);
  }
}

}  // namespace palisade
