#include "Host/Strings/GettextStringTable.h"

#include <map>
#include <mutex>
#include <utility>
#include <vector>

#include "Host/Strings/LanguagePreference.h"
#include "Host/Strings/MessageCatalogue.h"

namespace palisade {
namespace {

// The empty key is a catalogue's own header, and a zero byte would name another file.
bool canBeLookedUp(std::string_view key, std::string_view table) {
  return !key.empty() && !table.empty() && table.find_first_of(std::string_view("/\0", 2)) == std::string_view::npos;
}

}  // namespace

/// The catalogues that have been asked for, each read once.
class GettextStringTable::Catalogues {
 public:
  explicit Catalogues(std::filesystem::path folder) : _folder(std::move(folder)) {}

  /// Those for a list of languages, best first. A look-up asks anew; the names are made again when the list has changed.
  std::shared_ptr<const std::vector<std::string>> preferred(std::string languages) {
    const std::lock_guard guard(_mutex);
    if (_preferred == nullptr || languages != _languages) {
      _preferred = std::make_shared<const std::vector<std::string>>(preferredCatalogues(languages));
      _languages = std::move(languages);
    }
    return _preferred;
  }

  /// Lives as long as this object.
  const CatalogueTexts& find(const std::string& catalogue, std::string_view table) {
    const std::lock_guard guard(_mutex);
    auto ofTable = _read.find(table);
    if (ofTable == _read.end()) ofTable = _read.emplace(table, std::map<std::string, CatalogueTexts>()).first;
    auto position = ofTable->second.find(catalogue);
    if (position == ofTable->second.end()) {
      const std::filesystem::path file = _folder / catalogue / "LC_MESSAGES" / (std::string(table) + ".mo");
      position = ofTable->second.emplace(catalogue, readCatalogue(file)).first;
    }
    return position->second;
  }

 private:
  const std::filesystem::path _folder;
  std::mutex _mutex;  // guards what follows
  std::string _languages;
  std::shared_ptr<const std::vector<std::string>> _preferred;
  std::map<std::string, std::map<std::string, CatalogueTexts>, std::less<>> _read;  // by table, catalogue
};

GettextStringTable::GettextStringTable(std::filesystem::path resourcesFolder, std::optional<std::string> fixedLanguage)
    : _catalogues(std::make_unique<Catalogues>(std::move(resourcesFolder))),
      _fixedLanguage(std::move(fixedLanguage)) {}

GettextStringTable::~GettextStringTable() = default;

std::string GettextStringTable::localizedString(std::string_view key, std::string_view defaultValue,
                                                std::string_view tableName) const {
  if (canBeLookedUp(key, tableName)) {
    const auto preferred = _catalogues->preferred(_fixedLanguage ? *_fixedLanguage : environmentLanguages());
    for (const std::string& catalogue : *preferred) {
      const CatalogueTexts& texts = _catalogues->find(catalogue, tableName);
      const auto text = texts.find(key);
      if (text != texts.end() && !text->second.empty()) return text->second;
    }
  }
  return std::string(defaultValue);
}

}  // namespace palisade
