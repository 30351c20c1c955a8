#pragma once

/// Tells whether a consent message reads like something that a person wrote: what can be said of it without knowing its words.

#include <string>
#include <string_view>
#include <vector>

namespace palisade {

/// What is wrong with the message; empty when nothing is.
std::vector<std::string> flawsOf(std::string_view message, std::string_view appName);

}  // namespace palisade
