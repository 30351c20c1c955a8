#pragma once

/// How an alert looks on a terminal: a frame with a title, the message and two buttons.
///
/// Threads: a pure function. The texts are data: controls in them show as blanks.

#include <string>

#include "Platform/SystemAlert.h"

namespace palisade {

enum class DialogButton { alternate, defaultButton };

/// The dialog as lines that end with "\r\n", at most `columns` wide. The selected button stands in reverse video.
std::string drawDialog(const AlertDescription& description, DialogButton selected, std::size_t columns);

}  // namespace palisade
