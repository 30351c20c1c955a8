#pragma once

/// The one rule for text that crosses a border of the system: UTF-8 (RFC 3629) without U+0000 and without the code points that
/// Unicode has set apart as noncharacters (U+FDD0 to U+FDEF, and the last two of each plane).
///
/// It is the rule of the library that the daemons speak to the bus with, which neither sends nor reads any other text. The bus
/// itself, JSON, TOML, file names and SQLite are less strict, so text of every other source has to be held against it.
///
/// Threads: pure functions. Ownership: none. Errors: none.

#include <cstddef>
#include <string>
#include <string_view>

namespace palisade {

bool isNoncharacter(char32_t character);

bool isValidText(std::string_view text);

/// The text with U+FFFD in place of each character that may not stand in it, and of each byte that belongs to none.
std::string validText(std::string_view text);

/// The beginning of a text that is longer than so many bytes, with "…" at its end. No character is cut in two.
std::string shortened(std::string_view text, std::size_t mostBytes);

}  // namespace palisade
