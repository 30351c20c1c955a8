#include "Testing/FakeSystemAlert.h"

#include <cerrno>
#include <cstdlib>
#include <future>
#include <utility>

#include "Testing/TraceValue.h"

namespace palisade {

struct FakeSystemAlert::Handle : AlertHandle {
  explicit Handle(AlertAnswer scripted) : answer(scripted) {}

  AlertAnswer answer;
};

namespace {

Value traceHandle(const std::shared_ptr<AlertHandle>& handle) { return handle == nullptr ? Value() : Value("alert"); }

}  // namespace

bool FakeSystemAlert::keepsWaiting(std::thread::id thread) const {
  const std::lock_guard lock(_mutex);
  return _waiting.contains(thread);
}

std::size_t FakeSystemAlert::standingAlerts() const {
  const std::lock_guard lock(_mutex);
  return _standing;
}

std::shared_ptr<AlertHandle> FakeSystemAlert::createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags,
                                                          int* errorPlace, const AlertDescription& description) {
  _instruments.faults.enter("SystemAlert.createAlert");
  _instruments.trace.record("SystemAlert.createAlert",
                            {{"allocator", allocator == AlertAllocator::defaultAllocator ? "default" : "another"},
                             {"timeout", timeoutSeconds},
                             {"flags", std::int64_t{flags}},
                             {"errorPlace", errorPlace == nullptr ? Value() : Value("given")},
                             {"description", Dictionary{{"header", description.header},
                                                        {"message", description.message},
                                                        {"alternateButtonTitle", description.alternateButtonTitle},
                                                        {"defaultButtonTitle", description.defaultButtonTitle},
                                                        {"topMost", description.topMost},
                                                        {"dismissOnLock", description.dismissOnLock},
                                                        {"doNotDismissOnUnlock", description.doNotDismissOnUnlock}}}});
  const AlertAnswer answer = answers.next();
  const std::lock_guard lock(_mutex);
  if (!answer.handle) {
    _answersWithoutHandle[std::this_thread::get_id()] = answer;
    if (errorPlace != nullptr) *errorPlace = EIO;
    return nullptr;
  }
  ++_standing;
  return std::make_shared<Handle>(answer);
}

int FakeSystemAlert::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds,
                                     AlertResponse& response) {
  _instruments.faults.enter("SystemAlert.receiveResponse");
  _instruments.trace.record("SystemAlert.receiveResponse", {{"handle", traceHandle(handle)}, {"timeout", timeoutSeconds}});
  if (whileShown) whileShown();
  const AlertAnswer answer = answerFor(handle);
  if (std::holds_alternative<NeverAnswered>(answer.word)) waitForEver();
  if (const AlertResponse* word = std::get_if<AlertResponse>(&answer.word)) response = *word;
  return answer.status;
}

void FakeSystemAlert::releaseAlert(std::shared_ptr<AlertHandle> handle) {
  _instruments.faults.enter("SystemAlert.releaseAlert");
  _instruments.trace.record("SystemAlert.releaseAlert", {{"handle", traceHandle(handle)}});
  if (handle == nullptr) return;
  const std::lock_guard lock(_mutex);
  --_standing;
}

AlertAnswer FakeSystemAlert::answerFor(const std::shared_ptr<AlertHandle>& handle) {
  if (const auto* made = dynamic_cast<const Handle*>(handle.get())) return made->answer;
  const std::lock_guard lock(_mutex);
  return _answersWithoutHandle[std::this_thread::get_id()];
}

void FakeSystemAlert::waitForEver() {
  {
    const std::lock_guard lock(_mutex);
    _waiting.insert(std::this_thread::get_id());
  }
  std::promise<void>().get_future().wait();
  std::abort();
}

}  // namespace palisade
