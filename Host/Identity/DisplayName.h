#pragma once

/// Names as people see them. Whoever publishes an application chooses its name, and the name stands in a sentence that asks for
/// consent, so it must not be able to change how that sentence reads.
///
/// Threads: pure functions. Errors: none.

#include <string>
#include <string_view>

namespace palisade {

/// The name on one line, fit to stand between quotation marks (see `quotable`): line breaks and runs of blanks become one
/// space, what is no UTF-8, controls and marks that turn the direction of writing are left out, and a name of more than 40
/// columns is cut off. Empty when nothing is left. A name that was made so stays as it is.
std::string displayName(std::string_view name);

/// The same for a program that is called by its path: a long one loses its middle.
std::string displayNameOfProgram(std::string_view path);

/// An identifier, or a path, that stands alone: as it is but for what is not shown, and without its middle beyond 120 columns.
std::string displayIdentifier(std::string_view identifier);

/// Whether the text is UTF-8 without controls and marks of direction, so that it can be shown and logged as it is.
bool isShownAsItIs(std::string_view text);

}  // namespace palisade
