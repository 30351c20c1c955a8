#pragma once

/// Names as people see them. Whoever publishes an application chooses its name, and the name stands in a sentence that asks for
/// consent, so it must not be able to change how that sentence reads.
///
/// Threads: pure functions. Errors: none.

#include <string>
#include <string_view>

namespace palisade {

/// The name on one line: line breaks and runs of spaces become one space, what is no UTF-8, controls and marks that turn the
/// direction of writing are left out, and a long name is cut off at 128 characters. Empty when nothing is left.
std::string displayName(std::string_view name);

/// Whether the text is UTF-8 without controls and marks of direction, so that it can be shown and logged as it is.
bool isShownAsItIs(std::string_view text);

}  // namespace palisade
