#pragma once

/// Tells whether a consent message reads like something that a person wrote: what can be said of it without knowing its words.
/// Languages differ in their quotation marks only; commas and full stops of all scripts are known.

#include <string>
#include <string_view>
#include <vector>

namespace palisade {

/// Whether the text stands in the message in the language's quotation marks. Marks that steer the direction of writing may
/// stand between them and the text. False for a language whose quotation marks are not known.
bool isQuotedIn(std::string_view message, std::string_view text, std::string_view language);

/// What is wrong with the message; empty when nothing is.
std::vector<std::string> flawsOf(std::string_view message, std::string_view applicationName, std::string_view language);

}  // namespace palisade
