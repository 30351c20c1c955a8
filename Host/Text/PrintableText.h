#pragma once

/// Text of anybody's, made fit for a terminal: it can neither steer the terminal nor change how the text around it reads.
///
/// What is replaced or escaped: controls with their escape sequences, line ends, marks and overrides of direction and the other
/// characters of format, and whatever is no valid text. The joiners of emoji and of several scripts stay.
/// Threads: pure functions. Errors: none.

#include <string>
#include <string_view>

namespace palisade {

/// On one line, with U+FFFD for each such character.
std::string printableText(std::string_view text);

/// JSON that says the same in printable characters: such characters can only stand in its strings, where they are escaped.
std::string printableJson(std::string_view json);

}  // namespace palisade
