#pragma once

/// The platform's constants by name: scenarios and traces are written with the names, a plug-in sees the values.
///
/// Threads: all functions are pure. Errors: none; a text that is no constant is left as it is.

#include <string>
#include <string_view>

namespace palisade {

/// The value of the constant of that name: `AccountTypeIdentifierFacebook` becomes the identifier itself.
std::string constantValue(std::string_view name);

/// The name of the constant of that value.
std::string constantName(std::string_view value);

}  // namespace palisade
