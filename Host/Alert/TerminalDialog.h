#pragma once

/// How an alert looks on a terminal: a frame with a title, the message, who asks for what account, and two buttons.
///
/// Threads: a pure function. The texts are data: controls in them show as blanks, what turns the direction of writing is left
/// out. What a terminal would make of marks around a name nobody knows, so there are none; a name is kept apart by its line.

#include <cstddef>
#include <string>

#include "Host/Alert/AlertQuestion.h"

namespace palisade {

enum class DialogButton { refuse, allow };

/// The dialog as lines that end with "\r\n", at most `columns` wide. The selected button stands in reverse video.
std::string drawDialog(const AlertQuestion& question, DialogButton selected, std::size_t columns);

}  // namespace palisade
