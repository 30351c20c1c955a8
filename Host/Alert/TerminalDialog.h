#pragma once

/// How an alert looks on a terminal: a frame with a title, the message, who asks for what account, two buttons, and the keys
/// that answer.
///
/// Threads: a pure function. The texts are data: controls in them show as blanks, what turns the direction of writing is left
/// out. What a terminal would make of marks around a name nobody knows, so there are none; a name is kept apart by its line.

#include <cstddef>
#include <string>

#include "Host/Alert/AlertFocus.h"
#include "Host/Alert/AlertQuestion.h"

namespace palisade {

/// The dialog as lines that end with "\r\n", at most `columns` wide. What is selected is in reverse video: a button itself, the
/// edge beside the text or the details.
std::string drawDialog(const AlertQuestion& question, AlertPlace selected, std::size_t columns);

}  // namespace palisade
