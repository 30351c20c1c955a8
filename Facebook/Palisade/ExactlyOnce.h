#pragma once

/// Keeps two promises whatever fails: the daemon's completion is called exactly once, and no exception crosses the border to
/// the daemon or to the social framework. They hold also when memory runs out.
///
/// Threads: what these functions return may be called from any thread, several at a time; the first call wins.
/// Ownership: each result holds what it was given until it has run.

#include <exception>
#include <functional>

#include "Platform/AccountAccessPlugin.h"
#include "Platform/FacebookRequest.h"
#include "Platform/Log.h"

namespace palisade {

/// Makes the error that serves when there is no memory for another one. Called before anything else of this file; once is
/// enough for a process. Throws `std::bad_alloc`.
void prepareForFailures();

/// The error that a completion receives when the plug-in or a service threw. Making one does not fail: without memory for the
/// failure's own words it is the prepared one.
class UnexpectedFailure {
 public:
  explicit UnexpectedFailure(const std::exception_ptr& failure) noexcept;

  /// Never none.
  const std::optional<Error>& error() const noexcept;

 private:
  std::optional<Error> _own;
};

/// The failure of a service that let go of a callback without calling it; without memory it is `std::bad_alloc`.
std::exception_ptr droppedCallback() noexcept;

/// Logs `failure` as an error of `operation`; a log that throws is past help and is left alone.
void logUnexpectedFailure(Log& log, LogPlace operation, const std::exception_ptr& failure) noexcept;

/// An operation of the daemon's interface: answers through the completion that it is handed, at once or later.
using AnsweredOperation = std::function<void(const AccessCompletion& answer)>;

/// Carries out `body` with a completion that passes its first call on to `completion` and drops later ones. When `body` throws,
/// or when the last copy goes away uncalled because a service let go of its callback, the answer is a refusal. Exceptions of
/// `completion` itself are logged.
/// A lambda that captures more than two references is handed over by `std::ref`: as a copy it would need memory here, outside
/// of what can be answered.
void answerExactlyOnce(AccessCompletion completion, Log& log, LogPlace operation, const AnsweredOperation& body) noexcept;

/// A handler that passes its first answer on to `handle` and drops later ones. When `handle` throws, the failure is logged and
/// given to `fail`.
FacebookRequestHandler takeFirstAnswer(FacebookRequestHandler handle, std::function<void(const std::exception_ptr&)> fail,
                                       Log& log, LogPlace operation);

}  // namespace palisade
