#pragma once

/// Keeps two promises whatever fails: the daemon's completion is called exactly once, and no exception crosses the border to
/// the daemon or to the social framework.
///
/// Threads: what these functions return may be called from any thread, several at a time; the first call wins.
/// Ownership: each result holds what it was given until it has run.

#include <exception>
#include <functional>

#include "Platform/AccountAccessPlugin.h"
#include "Platform/FacebookRequest.h"
#include "Platform/Log.h"

namespace palisade {

/// The error that a completion receives when the plug-in or a service threw.
Error unexpectedFailure(const std::exception_ptr& failure);

bool isUnexpectedFailure(const std::optional<Error>& error);

/// Logs `failure` as an error of `operation`; a log that throws is past help and is left alone.
void logUnexpectedFailure(Log& log, LogPlace operation, const std::exception_ptr& failure) noexcept;

/// A completion that passes its first call on to `completion` and drops later ones. When the last copy goes away uncalled,
/// because a service let go of its callback, it refuses. Exceptions of `completion` itself are logged.
AccessCompletion answerExactlyOnce(AccessCompletion completion, Log& log, LogPlace operation);

/// A handler that passes its first answer on to `handle` and drops later ones. When `handle` throws, the failure is logged and
/// given to `fail`.
FacebookRequestHandler takeFirstAnswer(FacebookRequestHandler handle, std::function<void(const std::exception_ptr&)> fail,
                                       Log& log, LogPlace operation);

}  // namespace palisade
