#pragma once

/// Text of somebody else's that stands between quotation marks in a sentence, and stays there.
///
/// Threads: pure functions. Errors: none; the text is UTF-8.

#include <cstddef>
#include <string>
#include <string_view>

namespace palisade {

/// Whether some language quotes with it, or it looks as if one did.
bool isQuotationMark(char32_t character);

/// The text without anything that could leave its quotation marks or join them: quotation marks of every language become dots,
/// and apostrophes within a word strokes; what would combine with the character before or behind the text is left out, and of
/// characters that take no column no more than four stand in a row.
std::string quotable(std::string_view text);

/// The text if it takes at most that many columns, else as much of its beginning as does, and an ellipsis. It is cut between
/// what people take for characters.
std::string fitted(std::string_view text, std::size_t columns);

/// The same, with the ellipsis in the middle: both ends stay.
std::string fittedInItsMiddle(std::string_view text, std::size_t columns);

}  // namespace palisade
