#include "Host/Preferences/TomlFile.h"

#include <fcntl.h>
#include <unistd.h>

#include <toml++/toml.h>
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string_view>

#include "Host/Files/Exposure.h"

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

// Where a place of the parser's is in the text: it counts lines, and characters in a line, from 1.
std::size_t offsetOf(const toml::source_position& place, std::string_view content) {
  std::size_t offset = 0;
  for (toml::source_index line = 1; line < place.line; ++line) offset = content.find('\n', offset) + 1;
  for (toml::source_index column = 1; column < place.column; ++column) {
    do {
      ++offset;
    } while (offset < content.size() && (content[offset] & 0xC0) == 0x80);
  }
  return offset;
}

std::size_t nextLine(std::size_t offset, std::string_view content) {
  const std::size_t end = content.find('\n', offset);
  return end == std::string_view::npos ? content.size() : end + 1;
}

bool hasLinesOfItsOwn(const toml::node& node) {
  return (node.is_table() && !node.as_table()->is_inline()) || node.is_array_of_tables();
}

// A new line goes below the last one of its kind, or above all tables.
std::size_t placeOfNewLine(const toml::table& table, std::string_view content) {
  std::size_t place = table.empty() ? content.size() : 0;
  for (const auto& [key, node] : table) {
    if (!hasLinesOfItsOwn(node)) place = std::max(place, nextLine(offsetOf(node.source().end, content), content));
  }
  return place;
}

// `content` with the line of a key replaced, added, or, when `line` is empty, removed along with the comment behind it.
std::string edit(std::string content, const toml::table& table, const std::string& key, const std::string& line) {
  const auto entry = table.find(key);
  if (entry == table.end()) {
    if (line.empty()) return content;
    std::size_t place = placeOfNewLine(table, content);
    if (place > 0 && content[place - 1] != '\n') content.insert(place++, "\n");
    return content.insert(place, line + "\n");
  }
  const std::size_t begin = offsetOf(entry->first.source().begin, content);
  std::size_t end = offsetOf(entry->second.source().end, content);
  if (line.empty()) end = nextLine(end, content);
  return content.replace(begin, end - begin, line);
}

bool says(const std::string& content, const Dictionary& wanted) {
  try {
    return dictionaryFromToml(toml::parse(content)) == wanted;
  } catch (const toml::parse_error&) {
    return false;
  }
}

// None when there is no such file.
std::optional<std::string> contentOf(const std::filesystem::path& path) {
  std::ifstream file(path);
  if (!file) {
    if (errno == ENOENT || errno == ENOTDIR) return std::nullopt;
    failToRead(path);
  }
  try {
    // Read here: the parser takes a failure, such as a folder's, for the end of the file.
    return std::string(std::istreambuf_iterator<char>(file), {});
  } catch (const std::ios_base::failure&) {
    failToRead(path);
  }
}

toml::table parse(const std::string& content, const std::filesystem::path& path) {
  try {
    return toml::parse(content, path.string());
  } catch (const toml::parse_error& error) {
    throw TomlError(path.string() + ", line " + std::to_string(error.source().begin.line) + ", column " +
                    std::to_string(error.source().begin.column) + ": " + std::string(error.description()) + ".");
  }
}

void replaceFile(const std::filesystem::path& path, const std::string& content) {
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

}  // namespace

std::optional<Dictionary> readTomlFile(const std::filesystem::path& path) {
  const auto content = contentOf(path);
  return content ? std::optional(dictionaryFromToml(parse(*content, path))) : std::nullopt;
}

void requireUnexposed(const std::filesystem::path& path) {
  const auto exposure = exposureOfFile(path);
  if (!exposure) return;
  throw ExposedFile(path.string() + " is not read, because others could have written it: " + exposure->path.string() + " " +
                    exposure->problem + ". Look at what the file says, then run " + exposure->remedy + ".");
}

std::optional<Dictionary> readConfiguration(const std::filesystem::path& path) {
  requireUnexposed(path);
  return readTomlFile(path);
}

void setInTomlFile(const std::filesystem::path& path, const std::string& key, const std::optional<Value>& value) {
  const std::string content = contentOf(path).value_or("");
  const toml::table table = parse(content, path);
  Dictionary wanted;
  for (const auto& [name, entry] : dictionaryFromToml(table)) {
    if (name != key) wanted.set(name, entry);
  }
  if (value) wanted.set(key, *value);

  const std::string line = value ? textOf(tableFromDictionary({{key, *value}})) : "";
  const std::string edited = edit(content, table, key, line);
  replaceFile(path, says(edited, wanted) ? edited : textOf(tableFromDictionary(wanted)) + "\n");
}

void writeTomlFile(const std::filesystem::path& path, const Dictionary& table) {
  replaceFile(path, textOf(tableFromDictionary(table)) + "\n");
}

}  // namespace palisade
