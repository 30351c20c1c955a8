#include "Host/Identity/ClientRecord.h"

#include <algorithm>
#include <initializer_list>
#include <string_view>

#include "Host/Identity/ApplicationID.h"
#include "Host/Identity/DesktopEntry.h"
#include "Host/Identity/DisplayName.h"

namespace palisade {
namespace {

std::string inQuotes(std::string_view key) { return "'" + std::string(key) + "'"; }

// Takes a table apart. `place` is put before the keys in messages: "match." for the keys of that table.
class TableReader {
 public:
  TableReader(const Dictionary& table, std::string place, std::initializer_list<std::string_view> keys)
      : _table(table),
        _place(std::move(place)) {
    for (const auto& entry : table) {
      if (std::ranges::find(keys, entry.first) != keys.end()) continue;
      std::string known;
      for (const std::string_view key : keys) known += (known.empty() ? "" : ", ") + inQuotes(_place + std::string(key));
      throw ClientRecordError(inQuotes(_place + entry.first) + " is unknown here. Known are " + known + ".");
    }
  }

  // The text under `key`, which `isFit` judges; `description` completes "must be".
  template <typename Judge>
  std::optional<std::string> text(std::string_view key, std::string_view description, const Judge& isFit) const {
    const Value* value = _table.find(key);
    if (value == nullptr) return std::nullopt;
    const std::string* content = value->string();
    if (content == nullptr || !isFit(*content)) {
      throw ClientRecordError(inQuotes(_place + std::string(key)) + " must be " + std::string(description) + ".");
    }
    return *content;
  }

  std::vector<std::string> texts(std::string_view key) const {
    const Value* value = _table.find(key);
    if (value == nullptr) return {};
    std::vector<std::string> result;
    if (const Array* array = value->array()) {
      forEachString(*array, [&](const std::string& element) { result.push_back(element); });
      if (result.size() == array->size()) return result;
    }
    throw ClientRecordError(inQuotes(_place + std::string(key)) + " must be a list of texts.");
  }

  const Dictionary* table(std::string_view key) const {
    const Value* value = _table.find(key);
    if (value == nullptr) return nullptr;
    if (value->dictionary() == nullptr) throw ClientRecordError(inQuotes(_place + std::string(key)) + " must be a table.");
    return value->dictionary();
  }

 private:
  const Dictionary& _table;
  std::string _place;
};

bool isName(std::string_view text) { return !displayName(text).empty(); }

bool isDesktopFile(std::string_view text) {
  return text.ends_with(".desktop") && text.find('/') == std::string_view::npos && isShownAsItIs(text);
}

bool isUnit(std::string_view text) { return !text.empty() && text.find('/') == std::string_view::npos && isShownAsItIs(text); }

bool isExecutable(std::string_view text) { return text.starts_with('/') && !text.ends_with('/') && isShownAsItIs(text); }

std::map<std::string, std::string, std::less<>> translationsIn(const Dictionary& names) {
  std::map<std::string, std::string, std::less<>> translations;
  for (const auto& [locale, value] : names) {
    if (value.string() == nullptr || !isName(*value.string())) {
      throw ClientRecordError(inQuotes("names." + locale) + " must be a name that can be shown.");
    }
    std::string key = locale;
    std::replace(key.begin(), key.end(), '-', '_');
    translations[key] = *value.string();
  }
  return translations;
}

ClientMatch matchIn(const Dictionary& table) {
  const TableReader reader(table, "match.", {"flatpak", "snap", "unit", "executable"});
  ClientMatch match;
  match.flatpak = reader.text("flatpak", "the ID of a Flatpak application, such as \"org.example.Photos\"", isApplicationID);
  match.snap = reader.text("snap", "the name of a snap, such as \"photos\"", isSnapName);
  match.unit = reader.text("unit", "an application's ID or the name of a unit, such as \"org.example.Photos\"", isUnit);
  if (const auto path = reader.text("executable", "an absolute path, such as \"/usr/bin/photos\"", isExecutable)) {
    match.executable = std::filesystem::path(*path).lexically_normal();
  }
  return match;
}

}  // namespace

ClientRecord clientRecordFromTable(const Dictionary& table) {
  const TableReader reader(table, "", {"bundle_id", "name", "names", "desktop_file", "match", "entitlements"});
  const auto bundleID = reader.text("bundle_id", "a reverse-DNS identifier, such as \"org.example.photos\"", isApplicationID);
  if (!bundleID) throw ClientRecordError("'bundle_id' is missing.");

  ClientRecord record{.bundleID = *bundleID};
  const auto name = reader.text("name", "a name that can be shown", isName);
  record.desktopFile =
      reader.text("desktop_file", "the name of a file without folders, such as \"org.example.photos.desktop\"", isDesktopFile);
  if (!name && !record.desktopFile) throw ClientRecordError("'name' is missing, and so is 'desktop_file'.");
  record.name.untranslated = name.value_or(*bundleID);
  if (const Dictionary* names = reader.table("names")) record.name.translations = translationsIn(*names);

  const Dictionary* match = reader.table("match");
  if (match == nullptr || match->empty()) {
    throw ClientRecordError(
        "'match' must say how the application is recognised: by 'flatpak', 'snap', 'unit' or 'executable'.");
  }
  record.match = matchIn(*match);
  record.entitlements = reader.texts("entitlements");
  return record;
}

std::string localizedName(const ClientRecord& record) {
  const auto locales = userLocales();
  if (record.desktopFile) {
    if (const auto name = nameInDesktopFile(*record.desktopFile)) {
      std::string shown = displayName(textForLocales(*name, locales));
      if (!shown.empty()) return shown;
    }
  }
  return displayName(textForLocales(record.name, locales));
}

}  // namespace palisade
