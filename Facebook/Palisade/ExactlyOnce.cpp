#include "Facebook/Palisade/ExactlyOnce.h"

#include <atomic>
#include <memory>
#include <stdexcept>
#include <string>

#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

std::string messageOf(const std::exception_ptr& failure) {
  try {
    std::rethrow_exception(failure);
  } catch (const std::exception& exception) {
    return exception.what();
  } catch (...) {
    return "an exception of an unknown type";
  }
}

// Made once and never destroyed: other threads may need it while the process ends.
const std::optional<Error>& preparedError() {
  static const auto& error =
      *new const std::optional<Error>(Error{.domain = std::string(AccountsErrorDomain),
                                            .code = AccountsErrorUnexpectedFailure,
                                            .description = "The access decision failed unexpectedly: out of memory"});
  return error;
}

class Answer {
 public:
  Answer(AccessCompletion completion, Log& log, LogPlace operation) noexcept
      : _completion(std::move(completion)),
        _log(log),
        _operation(operation) {}

  Answer(const Answer&) = delete;
  Answer& operator=(const Answer&) = delete;

  ~Answer() {
    if (!_isGiven.load(std::memory_order_acquire)) fail(droppedCallback());
  }

  void give(bool granted, const std::optional<Error>& error) noexcept {
    if (_isGiven.exchange(true, std::memory_order_acq_rel)) return;
    try {
      std::exchange(_completion, nullptr)(granted, error);
    } catch (...) {
      logUnexpectedFailure(_log, _operation, std::current_exception());
    }
  }

  void fail(const std::exception_ptr& failure) noexcept {
    logUnexpectedFailure(_log, _operation, failure);
    give(false, UnexpectedFailure(failure).error());
  }

 private:
  std::atomic<bool> _isGiven = false;
  AccessCompletion _completion;
  Log& _log;
  LogPlace _operation;
};

struct FirstAnswer {
  std::atomic<bool> isTaken = false;
  FacebookRequestHandler handle;
  std::function<void(const std::exception_ptr&)> fail;
};

}  // namespace

void prepareForFailures() { preparedError(); }

UnexpectedFailure::UnexpectedFailure(const std::exception_ptr& failure) noexcept {
  try {
    _own = Error{.domain = std::string(AccountsErrorDomain),
                 .code = AccountsErrorUnexpectedFailure,
                 .description = "The access decision failed unexpectedly: " + messageOf(failure)};
  } catch (...) {
    // The prepared error serves.
  }
}

const std::optional<Error>& UnexpectedFailure::error() const noexcept { return _own ? _own : preparedError(); }

std::exception_ptr droppedCallback() noexcept {
  try {
    throw std::runtime_error("a service dropped its callback without calling it");
  } catch (...) {
    return std::current_exception();
  }
}

void logUnexpectedFailure(Log& log, LogPlace operation, const std::exception_ptr& failure) noexcept {
  try {
    log.record(operation, LogLevel::error, "The access decision failed unexpectedly: %@", "failure", messageOf(failure));
  } catch (...) {
    // The answer matters more than the record of what went wrong.
  }
}

void answerExactlyOnce(AccessCompletion completion, Log& log, LogPlace operation, const AnsweredOperation& body) noexcept {
  std::shared_ptr<Answer> answer;
  try {
    answer = std::make_shared<Answer>(std::move(completion), log, operation);
  } catch (...) {
    // Without memory for the answer the completion has not been moved.
    Answer(std::move(completion), log, operation).fail(std::current_exception());
    return;
  }
  try {
    body([answer](bool granted, const std::optional<Error>& error) { answer->give(granted, error); });
  } catch (...) {
    answer->fail(std::current_exception());
  }
}

FacebookRequestHandler takeFirstAnswer(FacebookRequestHandler handle, std::function<void(const std::exception_ptr&)> fail,
                                       Log& log, LogPlace operation) {
  auto first = std::make_shared<FirstAnswer>();
  first->handle = std::move(handle);
  first->fail = std::move(fail);
  return [first = std::move(first), &log, operation](
             std::optional<std::string> data, const std::optional<HttpResponse>& response, const std::optional<Error>& error) {
    if (first->isTaken.exchange(true, std::memory_order_acq_rel)) return;
    // Both are dropped when the answer has been dealt with, even if the framework keeps its handler.
    const auto handleAnswer = std::exchange(first->handle, nullptr);
    const auto failWith = std::exchange(first->fail, nullptr);
    try {
      handleAnswer(std::move(data), response, error);
    } catch (...) {
      const auto failure = std::current_exception();
      logUnexpectedFailure(log, operation, failure);
      try {
        failWith(failure);
      } catch (...) {
        logUnexpectedFailure(log, operation, std::current_exception());
      }
    }
  };
}

}  // namespace palisade
