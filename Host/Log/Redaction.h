#pragma once

/// Takes secrets out of what is about to be logged.
///
/// Two nets: members of parsed answers that carry tokens, by their name; and, in every text, each run of 32 or more letters,
/// digits and "-_~+=" (what RFC 6750 writes tokens in, without the dots and slashes of bundle IDs and files). Runs of words
/// joined by underscores are permission names and stay. Threads: pure functions. Errors: none; in doubt a text is masked.

#include <string>
#include <string_view>

#include "Platform/Log.h"

namespace palisade {

/// What stands in a secret's place.
inline constexpr std::string_view masked = "[masked]";

std::string redactedText(std::string_view text);
Value redactedValue(const Value& value);

/// The record's message, rendered with every argument redacted.
std::string redactedMessage(const LogRecord& record);

}  // namespace palisade
