#pragma once

/// A text in several languages, and the one that the user reads.
///
/// Threads: safe from every thread, as long as nobody changes the environment at that moment. Errors: none.

#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace palisade {

struct LocalizedText {
  /// For English, and for languages that are missing.
  std::string untranslated;
  /// By locale: "de", "pt_BR", "sr@latin".
  std::map<std::string, std::string, std::less<>> translations = {};

  friend bool operator==(const LocalizedText&, const LocalizedText&) = default;
};

/// The locales that the environment names at this moment, best first: the first of LANGUAGE (a list divided by colons), LC_ALL,
/// LC_MESSAGES and LANG that is not empty.
std::vector<std::string> userLocales();

/// The text in the first of `locales` that there is a text for: for the language with its region and variant, with its region,
/// with its variant, alone.
const std::string& textForLocales(const LocalizedText& text, const std::vector<std::string>& locales);

}  // namespace palisade
