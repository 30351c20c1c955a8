#include "Host/Identity/LocalizedText.h"

#include <algorithm>
#include <cstddef>
#include <cstdlib>

namespace palisade {
namespace {

std::string_view textBehind(std::string_view text, char sign) {
  const std::size_t position = text.find(sign);
  return position == std::string_view::npos ? std::string_view() : text.substr(position);
}

// "sr_RS.UTF-8@latin" may be translated as sr_RS@latin, sr_RS, sr@latin and sr. Language tags ("pt-BR") mean the same as
// locales.
std::vector<std::string> translationsFor(std::string_view locale) {
  const std::string modifier(textBehind(locale, '@'));
  std::string place(locale.substr(0, locale.find_first_of(".@")));
  std::replace(place.begin(), place.end(), '-', '_');
  const std::string language = place.substr(0, place.find('_'));
  return {place + modifier, place, language + modifier, language};
}

bool isUntranslated(const std::string& language) { return language == "en" || language == "C" || language == "POSIX"; }

}  // namespace

std::vector<std::string> userLocales() {
  for (const char* variable : {"LANGUAGE", "LC_ALL", "LC_MESSAGES", "LANG"}) {
    const char* value = std::getenv(variable);
    if (value == nullptr || *value == '\0') continue;
    std::vector<std::string> locales;
    std::string_view list = value;
    while (!list.empty()) {
      const std::size_t end = std::min(list.find(':'), list.size());
      if (end != 0) locales.emplace_back(list.substr(0, end));
      list.remove_prefix(std::min(end + 1, list.size()));
    }
    return locales;
  }
  return {};
}

const std::string& textForLocales(const LocalizedText& text, const std::vector<std::string>& locales) {
  for (const std::string& locale : locales) {
    const std::vector<std::string> names = translationsFor(locale);
    for (const std::string& name : names) {
      const auto translation = text.translations.find(name);
      if (translation != text.translations.end()) return translation->second;
    }
    // Whoever reads English before German has the text already, and is not given the German one.
    if (isUntranslated(names.back())) break;
  }
  return text.untranslated;
}

}  // namespace palisade
