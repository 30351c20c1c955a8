#pragma once

/// The text of a JSON document before anything is parsed: whether it is text at all, and where in it a byte lies.
///
/// Threads: safe from every thread. Ownership: none; texts are borrowed. Errors: no operation fails.

#include <cstddef>
#include <string_view>

namespace palisade {

/// Where the first byte sequence that is not UTF-8 (RFC 3629) begins; the text's size when there is none.
std::size_t positionOfInvalidUtf8(std::string_view text);

/// Counted from 1. A column is a character; a line ends with U+000A.
struct TextPlace {
  std::size_t line = 1;
  std::size_t column = 1;
};

/// The place of the character that begins at `position`, which is at most the text's size. The text before it is UTF-8.
TextPlace placeInText(std::string_view text, std::size_t position);

}  // namespace palisade
