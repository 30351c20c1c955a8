#include "Testing/FakePreferencesStore.h"

#include "Testing/FakeSerialQueue.h"
#include "Testing/TraceValue.h"

namespace palisade {

void FakePreferencesStore::set(std::string_view key, std::string_view domain, std::optional<Value> value) {
  const std::lock_guard lock(_mutex);
  Key place{key, domain};
  if (value) {
    _values.insert_or_assign(std::move(place), *std::move(value));
  } else {
    _values.erase(place);
  }
}

std::optional<Value> FakePreferencesStore::copyValue(std::string_view key, std::string_view domain, PreferencesUser user,
                                                     PreferencesHost host) {
  _instruments.faults.enter("Preferences.copyValue");
  _instruments.trace.record("Preferences.copyValue", {{"queue", traceText(FakeSerialQueue::labelOfCurrent())},
                                                      {"key", key},
                                                      {"domain", domain},
                                                      {"user", user == PreferencesUser::current ? "current" : "another"},
                                                      {"host", host == PreferencesHost::any ? "any" : "another"}});
  const std::lock_guard lock(_mutex);
  const auto found = _values.find({std::string(key), std::string(domain)});
  return found == _values.end() ? std::nullopt : std::optional(found->second);
}

void FakePreferencesStore::synchronize(std::string_view domain) {
  _instruments.faults.enter("Preferences.synchronize");
  _instruments.trace.record("Preferences.synchronize",
                            {{"queue", traceText(FakeSerialQueue::labelOfCurrent())}, {"domain", domain}});
}

}  // namespace palisade
