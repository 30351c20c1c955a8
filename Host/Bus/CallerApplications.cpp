#include "Host/Bus/CallerApplications.h"

#include <utility>

#include "Host/Bus/BusLoop.h"

namespace palisade {

void CallerApplications::whenKnown(const CallerRef& caller, const GoOn& goOn, const Refuse& refuse) {
  if (const auto application = _parts.service.knownApplication(*caller)) return goOn(*application);
  try {
    if (!isFirstToWait(*caller, {.goOn = goOn, .refuse = refuse})) return;
  } catch (const BusFailure& failure) {
    return refuse(failure);
  }
  inLine(_newcomers, "", caller, &CallerApplications::findProcess);
}

void CallerApplications::inLine(WaitingCalls& lines, const std::string& name, const CallerRef& caller, Step step) {
  try {
    lines.run(name, [this, caller, step] { (this->*step)(caller); });
  } catch (const BusFailure& failure) {
    tell(caller, failure);
  }
}

bool CallerApplications::isFirstToWait(const BusCaller& caller, Call call) {
  const std::lock_guard lock(_mutex);
  std::vector<Call>& waiting = _waiting[caller.uniqueName];
  if (waiting.size() >= mostWaiting) {
    throw BusFailure(BusFailureKind::tooManyRequests,
                     "This connection has too many unanswered calls already. Wait for an answer.");
  }
  waiting.push_back(std::move(call));
  return waiting.size() == 1;
}

void CallerApplications::findProcess(const CallerRef& caller) {
  try {
    const std::string process = std::to_string(_parts.processOf(caller->uniqueName));
    _parts.loop.post([this, caller, process] { inLine(_identifications, process, caller, &CallerApplications::identify); });
  } catch (const BusFailure& failure) {
    tell(caller, failure);
  } catch (const std::exception& failure) {
    tell(caller, BusFailure(BusFailureKind::unknownCaller, failure.what()));
  }
}

void CallerApplications::identify(const CallerRef& caller) {
  try {
    tell(caller, _parts.service.identify(*caller));
  } catch (const BusFailure& failure) {
    tell(caller, failure);
  } catch (const std::exception& failure) {
    tell(caller, BusFailure(BusFailureKind::unknownCaller, failure.what()));
  }
}

// Each call on its own: one that hands the lead over to wait must not keep the next.
void CallerApplications::tell(const CallerRef& caller, const Finding& finding) {
  std::vector<Call> calls;
  {
    const std::lock_guard lock(_mutex);
    calls = std::move(_waiting.extract(caller->uniqueName).mapped());
  }
  for (Call& call : calls) {
    _parts.loop.post([this, caller, finding, call = std::move(call)] {
      // Nobody would withdraw what a caller that has left asks for.
      if (!_parts.isHere(caller->uniqueName)) return _parts.service.callerLeft(caller->uniqueName);
      if (const auto* application = std::get_if<std::string>(&finding)) return call.goOn(*application);
      call.refuse(std::get<BusFailure>(finding));
    });
  }
}

}  // namespace palisade
