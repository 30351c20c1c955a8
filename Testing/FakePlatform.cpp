#include "Testing/FakePlatform.h"

#include <list>
#include <utility>

#include "Testing/Settling.h"
#include "Testing/TraceValue.h"

namespace palisade {

FakePlatform& FakePlatform::create(std::shared_ptr<const JsonParser> parser, std::shared_ptr<const StringTable> strings) {
  static std::mutex mutex;
  static auto& platforms = *new std::list<std::unique_ptr<FakePlatform>>;
  const std::lock_guard lock(mutex);
  return *platforms.emplace_back(new FakePlatform(std::move(parser), std::move(strings)));
}

FakePlatform::FakePlatform(std::shared_ptr<const JsonParser> parser, std::shared_ptr<const StringTable> below)
    : log(instruments()),
      keychain(instruments()),
      social(instruments(), deliveries),
      alert(instruments()),
      preferences(instruments()),
      notifications(instruments()),
      queues(instruments()),
      json(instruments(), std::move(parser)),
      strings(instruments(), std::move(below)),
      authorizations(instruments()),
      store(std::make_shared<FakeAccountStore>(instruments(), authorizations)) {}

PlatformServices FakePlatform::services() {
  return {.log = &log,
          .keychain = &keychain,
          .social = &social,
          .alert = &alert,
          .preferences = &preferences,
          .notifications = &notifications,
          .queues = &queues,
          .json = &json,
          .strings = &strings};
}

std::shared_ptr<const FakeClient> FakePlatform::makeClient(FakeClientData data) {
  return std::make_shared<const FakeClient>(instruments(), std::move(data));
}

AccessCompletion FakePlatform::completion(std::size_t operation) {
  return [this, operation](bool granted, const std::optional<Error>& error) {
    trace.record("completion", {{"operation", std::uint64_t{operation}}, {"granted", granted}, {"error", traceError(error)}});
    const std::lock_guard lock(_completionsMutex);
    _completions.push_back({.granted = granted, .error = error});
  };
}

std::vector<CompletionCall> FakePlatform::completions() const {
  const std::lock_guard lock(_completionsMutex);
  return _completions;
}

OperationEnd FakePlatform::run(std::function<void()> operation) {
  static std::mutex oneAtATime;
  const std::lock_guard lock(oneAtATime);
  const auto daemon = runUntilAtRest(ThreadLabel::daemon, std::move(operation));
  while (auto answer = deliveries.takeNext()) runUntilAtRest(ThreadLabel::request, *std::move(answer));
  if (daemon->hasFinished()) return OperationEnd::returned;
  return alert.keepsWaiting(daemon->id()) ? OperationEnd::waitsForAlert : OperationEnd::waitsForSemaphore;
}

}  // namespace palisade
