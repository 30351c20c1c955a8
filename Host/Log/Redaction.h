#pragma once

/// Takes secrets out of what is about to be logged.
///
/// Three nets. The secrets that this process has had in its hands are known by their value (`KnownSecrets`), whatever they look
/// like and however a format puts the message together. Members of parsed answers that carry tokens are known by their name,
/// and their values from then on. And in every text each run of 32 or more letters, digits and "-_~+=" (what RFC 6750 writes
/// tokens in, without the dots and slashes of bundle IDs and files) is taken for one; runs of words joined by underscores are
/// permission names and stay. Threads: safe from every thread. Errors: none; in doubt a text is masked.

#include <string>
#include <string_view>

#include "Host/Secrets/KnownSecrets.h"
#include "Platform/Log.h"

namespace palisade {

/// By the text's looks alone.
std::string redactedText(std::string_view text);
Value redactedValue(const Value& value);

/// The record's message as it may be shown.
std::string redactedMessage(const LogRecord& record);

}  // namespace palisade
