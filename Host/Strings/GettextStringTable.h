#pragma once

/// The localised texts in one resources folder: compiled gettext catalogues, one file a language and table.
///
/// The text of a key is read from `FOLDER/LANGUAGE/LC_MESSAGES/TABLE.mo`. Keys are symbolic names, so English is a catalogue
/// like the others. Each look-up asks for the user's language anew: the fixed language, otherwise the first of the
/// environment's LANGUAGE (a list divided by colons), LC_ALL, LC_MESSAGES and LANG that is not empty. Locale names
/// ("de_DE.UTF-8@euro") and language tags ("pt-BR", "zh-Hant") are both understood; "C" and "POSIX" mean English. A text that a
/// catalogue lacks or leaves empty is looked for under the language with its region, the language alone, the list's next
/// languages, English, and is the caller's default value in the end. Threads: safe from every thread, as long as nobody changes
/// the environment at that moment. Ownership: owns its catalogues. Errors: none. A catalogue that is missing or damaged counts
/// as one without texts. Each is read once, on first use; a file that is added or replaced later is seen by the next object.

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "Platform/StringTable.h"

namespace palisade {

class GettextStringTable final : public StringTable {
 public:
  explicit GettextStringTable(std::filesystem::path resourcesFolder, std::optional<std::string> fixedLanguage = std::nullopt);
  ~GettextStringTable() override;

  std::string localizedString(std::string_view key, std::string_view defaultValue, std::string_view tableName) const override;

 private:
  class Catalogues;

  std::unique_ptr<Catalogues> _catalogues;
  std::optional<std::string> _fixedLanguage;
};

}  // namespace palisade
