#include "Host/Strings/GettextStringTable.h"

#include <boost/locale/gnu_gettext.hpp>
#include <boost/locale/message.hpp>
#include <locale>
#include <map>
#include <mutex>
#include <utility>

#include "Host/Strings/LanguagePreference.h"
#include "Host/Strings/MessageCatalogue.h"

namespace palisade {
namespace {

using Messages = boost::locale::message_format<char>;

// A locale with the messages of one catalogue, or with none when there is no such catalogue. The facet is made directly and not
// by a generator: a generator goes from "de_DE" to "de" by itself, while the order of languages is decided here.
std::locale loadCatalogue(const std::filesystem::path& folder, const std::string& catalogue, const std::string& table) {
  boost::locale::gnu_gettext::messages_info info;
  info.language = catalogue;
  info.encoding = "UTF-8";
  info.domains.emplace_back(table);
  info.paths.push_back(folder.string());
  info.callback = [](const std::string& file, const std::string&) { return readCatalogue(file); };
  return std::locale(std::locale::classic(), boost::locale::gnu_gettext::create_messages_facet<char>(info));
}

// The empty key is a catalogue's own header, and a zero byte would cut a key short or name another file.
bool canBeLookedUp(std::string_view key, std::string_view table) {
  return !key.empty() && key.find('\0') == std::string_view::npos && !table.empty() &&
         table.find_first_of(std::string_view("/\0", 2)) == std::string_view::npos;
}

}  // namespace

/// The catalogues that have been asked for, each loaded once.
class GettextStringTable::Catalogues {
 public:
  explicit Catalogues(std::filesystem::path folder) : _folder(std::move(folder)) {}

  std::locale find(const std::string& catalogue, const std::string& table) {
    const std::lock_guard guard(_mutex);
    auto& loaded = _loaded[table];
    auto position = loaded.find(catalogue);
    if (position == loaded.end()) position = loaded.emplace(catalogue, load(catalogue, table)).first;
    return position->second;
  }

 private:
  std::locale load(const std::string& catalogue, const std::string& table) const {
    try {
      return loadCatalogue(_folder, catalogue, table);
    } catch (const std::exception&) {
      return std::locale::classic();
    }
  }

  const std::filesystem::path _folder;
  std::mutex _mutex;
  std::map<std::string, std::map<std::string, std::locale>> _loaded;  // guarded by _mutex; by table, then by catalogue
};

GettextStringTable::GettextStringTable(std::filesystem::path resourcesFolder, std::optional<std::string> fixedLanguage)
    : _catalogues(std::make_unique<Catalogues>(std::move(resourcesFolder))),
      _fixedLanguage(std::move(fixedLanguage)) {}

GettextStringTable::~GettextStringTable() = default;

std::string GettextStringTable::localizedString(std::string_view key, std::string_view defaultValue,
                                                std::string_view tableName) const {
  if (canBeLookedUp(key, tableName)) {
    const std::string id(key);
    const std::string table(tableName);
    for (const std::string& catalogue : preferredCatalogues(_fixedLanguage)) {
      const std::locale locale = _catalogues->find(catalogue, table);
      if (!std::has_facet<Messages>(locale)) continue;
      const char* text = std::use_facet<Messages>(locale).get(0, nullptr, id.c_str());
      if (text != nullptr && *text != '\0') return text;
    }
  }
  return std::string(defaultValue);
}

}  // namespace palisade
