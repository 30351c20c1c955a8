#pragma once

/// Text as a terminal shows it: measured in columns, made harmless, and broken into lines.
///
/// Words that are written from right to left stay in the order in which they are read: terminals that know such writing turn
/// them around themselves, and those that do not would show any other order as wrongly.
/// Threads: all functions are pure. Errors: bytes that are not UTF-8 show as U+FFFD.

#include <string>
#include <string_view>
#include <vector>

namespace palisade {

/// How many columns `text` takes; East Asian wide characters take two.
std::size_t columnsOf(std::string_view text);

/// `text` with every control character and line break replaced by a blank, and without the marks, isolates and overrides of
/// the direction of writing, which take no column: what an application calls itself can neither move the cursor nor rearrange
/// the sentence around it.
std::string harmless(std::string_view text);

/// `text`, which is harmless, in lines of at most `columns` columns. They end where such text may be broken: after a blank or,
/// where words stand without blanks, as in Chinese and Japanese, between characters, but never so that a line begins with a
/// mark that closes or ends with one that opens. Korean words stay whole. What is too long for a line is broken at its edge.
std::vector<std::string> wrapped(std::string_view text, std::size_t columns);

}  // namespace palisade
