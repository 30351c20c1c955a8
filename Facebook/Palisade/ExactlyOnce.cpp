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

class Answer {
 public:
  Answer(AccessCompletion completion, Log& log, LogPlace operation)
      : _completion(std::move(completion)),
        _log(log),
        _operation(operation) {}

  Answer(const Answer&) = delete;
  Answer& operator=(const Answer&) = delete;

  ~Answer() {
    if (_isGiven.load(std::memory_order_acquire)) return;
    const auto dropped = std::make_exception_ptr(std::runtime_error("a service dropped its callback without calling it"));
    logUnexpectedFailure(_log, _operation, dropped);
    give(false, unexpectedFailure(dropped));
  }

  void give(bool granted, const std::optional<Error>& error) noexcept {
    if (_isGiven.exchange(true, std::memory_order_acq_rel)) return;
    try {
      std::exchange(_completion, nullptr)(granted, error);
    } catch (...) {
      logUnexpectedFailure(_log, _operation, std::current_exception());
    }
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

Error unexpectedFailure(const std::exception_ptr& failure) {
  return {.domain = std::string(AccountsErrorDomain),
          .code = AccountsErrorUnexpectedFailure,
          .description = "The access decision failed unexpectedly: " + messageOf(failure)};
}

bool isUnexpectedFailure(const std::optional<Error>& error) {
  return error && error->domain == AccountsErrorDomain && error->code == AccountsErrorUnexpectedFailure;
}

void logUnexpectedFailure(Log& log, LogPlace operation, const std::exception_ptr& failure) noexcept {
  try {
    log.record(operation, LogLevel::error, "The access decision failed unexpectedly: %@", "failure", messageOf(failure));
  } catch (...) {
    // The answer matters more than the record of what went wrong.
  }
}

AccessCompletion answerExactlyOnce(AccessCompletion completion, Log& log, LogPlace operation) {
  auto answer = std::make_shared<Answer>(std::move(completion), log, operation);
  return [answer = std::move(answer)](bool granted, const std::optional<Error>& error) { answer->give(granted, error); };
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
