#pragma once

/// A user out of a script. See `SystemAlert`.
///
/// Threads: safe from every thread; every alert takes the next answer of the script when it is created. Errors: an alert that
/// cannot be created is an answer without a handle.

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <thread>
#include <variant>

#include "Platform/SystemAlert.h"
#include "Testing/Instruments.h"
#include "Testing/Script.h"

namespace palisade {

/// `receiveResponse` does not come back.
struct NeverAnswered {};

struct AlertAnswer {
  /// Whether `createAlert` answers a handle.
  bool handle = true;
  /// What `receiveResponse` returns.
  int status = 0;
  /// What `receiveResponse` writes; nothing leaves the caller's variable alone.
  std::variant<std::monostate, AlertResponse, NeverAnswered> word = {};
};

inline AlertAnswer userAllows() { return {.word = AlertResponseDefaultButton}; }
inline AlertAnswer userRefuses() { return {.word = AlertResponse{1}}; }
inline AlertAnswer userNeverAnswers() { return {.word = NeverAnswered{}}; }
inline AlertAnswer alertCannotBeCreated() { return {.handle = false}; }

class FakeSystemAlert final : public SystemAlert {
 public:
  explicit FakeSystemAlert(Instruments instruments) : _instruments(instruments) {}

  /// One answer an alert. A script that was never set answers nothing: with a handle, and with no word.
  Script<AlertAnswer> answers;

  /// Called while an alert stands, on the thread that waits for the answer: what happens meanwhile, at no test's risk of a
  /// race.
  std::function<void()> whileShown;

  /// Whether that thread waits for an answer that never comes.
  bool keepsWaiting(std::thread::id thread) const;

  /// Alerts that were created and not released.
  std::size_t standingAlerts() const;

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

 private:
  struct Handle;

  AlertAnswer answerFor(const std::shared_ptr<AlertHandle>& handle);
  [[noreturn]] void waitForEver();

  Instruments _instruments;
  mutable std::mutex _mutex;
  std::map<std::thread::id, AlertAnswer> _answersWithoutHandle;
  std::set<std::thread::id> _waiting;
  std::size_t _standing = 0;
};

}  // namespace palisade
