#include "Host/Strings/LanguagePreference.h"

#include <algorithm>
#include <cstdlib>
#include <optional>

namespace palisade {
namespace {

constexpr const char* english = "en";

// Letters and digits of the C locale, whatever the process has set.
bool isLetter(char character) { return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z'); }
bool isDigit(char character) { return character >= '0' && character <= '9'; }
char lower(char character) {
  return character >= 'A' && character <= 'Z' ? static_cast<char>(character - 'A' + 'a') : character;
}
char upper(char character) {
  return character >= 'a' && character <= 'z' ? static_cast<char>(character - 'a' + 'A') : character;
}

template <typename Change>
std::string changed(std::string_view text, Change change) {
  std::string result(text);
  std::transform(result.begin(), result.end(), result.begin(), change);
  return result;
}

bool consistsOf(std::string_view text, bool (*kind)(char)) { return std::all_of(text.begin(), text.end(), kind); }

std::vector<std::string_view> split(std::string_view text, std::string_view dividers) {
  std::vector<std::string_view> pieces;
  while (true) {
    const std::size_t divider = text.find_first_of(dividers);
    pieces.push_back(text.substr(0, divider));
    if (divider == std::string_view::npos) return pieces;
    text.remove_prefix(divider + 1);
  }
}

struct Language {
  std::string language;
  std::string script;  // lower case, or empty
  std::string region;  // upper case, or empty
};

std::optional<Language> parsed(std::string_view name) {
  const std::vector<std::string_view> pieces = split(name.substr(0, name.find_first_of(".@")), "-_");
  if (pieces[0].size() < 2 || pieces[0].size() > 3 || !consistsOf(pieces[0], isLetter)) return std::nullopt;
  Language language{.language = changed(pieces[0], lower), .script = {}, .region = {}};
  for (std::size_t index = 1; index < pieces.size(); ++index) {
    const std::string_view piece = pieces[index];
    const bool isRegion =
        (piece.size() == 2 && consistsOf(piece, isLetter)) || (piece.size() == 3 && consistsOf(piece, isDigit));
    if (isRegion && language.region.empty()) {
      language.region = changed(piece, upper);
    } else if (piece.size() == 4 && consistsOf(piece, isLetter) && language.script.empty()) {
      language.script = changed(piece, lower);
    }
  }
  return language;
}

bool writesTraditionalChinese(std::string_view region) { return region == "TW" || region == "HK" || region == "MO"; }

// Chinese catalogues are named after a region, but readers choose a script: a reader of one script is not given the other.
std::vector<std::string> chineseCatalogues(const Language& chinese) {
  const bool traditional = chinese.script.empty() ? writesTraditionalChinese(chinese.region) : chinese.script == "hant";
  const std::string common = traditional ? "zh_TW" : "zh_CN";
  const std::string regional = "zh_" + chinese.region;
  const bool fits = !chinese.region.empty() && writesTraditionalChinese(chinese.region) == traditional;
  if (fits && regional != common) return {regional, common, "zh"};
  return {common, "zh"};
}

}  // namespace

// The first variable that says something decides.
std::string environmentLanguages() {
  for (const char* variable : {"LANGUAGE", "LC_ALL", "LC_MESSAGES", "LANG"}) {
    if (const char* languages = std::getenv(variable); languages != nullptr && *languages != '\0') return languages;
  }
  return {};
}

std::vector<std::string> cataloguesForLanguage(std::string_view name) {
  const std::string_view bare = name.substr(0, name.find_first_of(".@"));
  if (bare == "C" || bare == "POSIX") return {english};
  const std::optional<Language> language = parsed(name);
  if (!language) return {};
  if (language->language == "zh") return chineseCatalogues(*language);
  // The C library still names Hebrew by the code that was withdrawn.
  const std::string code = language->language == "iw" ? "he" : language->language;
  if (language->region.empty()) return {code};
  return {code + "_" + language->region, code};
}

std::vector<std::string> preferredCatalogues(std::string_view languages) {
  std::vector<std::string> preferred;
  const auto append = [&preferred](const std::vector<std::string>& catalogues) {
    for (const std::string& catalogue : catalogues) {
      if (std::find(preferred.begin(), preferred.end(), catalogue) == preferred.end()) preferred.push_back(catalogue);
    }
  };
  for (const std::string_view language : split(languages, ":")) append(cataloguesForLanguage(language));
  append({english});
  return preferred;
}

}  // namespace palisade
