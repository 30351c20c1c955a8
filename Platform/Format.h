#pragma once

/// Fills formats and renders values for people and for log records.
///
/// "%@" is the only placeholder of a text; a log format has "%d" too. A format is read once from left to right: an argument is
/// copied verbatim, also when it holds "%@". Surplus arguments are ignored, missing ones leave nothing, every other "%" stands
/// for itself.
/// Threads: all functions are pure. Errors: none.

#include <initializer_list>
#include <string>
#include <string_view>

#include "Platform/Log.h"

namespace palisade {

/// What stands for an absent object.
inline constexpr std::string_view NoneRendering = "(null)";

std::string formatText(std::string_view format, std::initializer_list<std::string_view> arguments);

std::string formatLogMessage(const LogRecord& record);

/// A string as it is; everything else as compact JSON.
std::string describe(const Value& value);

/// The value as compact JSON, a string in quotes.
std::string compactJson(const Value& value);

/// The domain, the code and the description, if any: `AccountsErrorDomain 8`, `org.example 3: No route to host`.
std::string describe(const Error& error);

/// The names in alphabetical order: `{email, user_likes}`.
std::string describe(const PermissionSet& permissions);

std::string describe(const LogArgument& argument);

}  // namespace palisade
