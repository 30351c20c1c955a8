#include "Sandbox/Faults.h"

#include <algorithm>
#include <utility>

namespace palisade::sandbox {
namespace {

constexpr FaultKindName faultNames[] = {
    {FaultKind::silent, "silent", "reads the request and never answers"},
    {FaultKind::slow, "slow", "answers one byte every --milliseconds (100)"},
    {FaultKind::stall, "stall", "stops after --bytes of the answer (0) and keeps the connection"},
    {FaultKind::close, "close", "ends the connection after --bytes of the answer (0)"},
    {FaultKind::reset, "reset", "resets the connection after --bytes of the answer (0)"},
    {FaultKind::twice, "twice", "answers twice, beginning with a packet of --bytes (0)"},
    {FaultKind::redirect, "redirect", "answers --status (302) with --location"},
    {FaultKind::unavailable, "unavailable", "answers --status (503), with --retry-after if that is given"},
    {FaultKind::status, "status", "answers --status (500)"},
    {FaultKind::huge, "huge", "answers 100 MB in chunks"},
    {FaultKind::bomb, "bomb", "answers 10 MB, compressed to a thousandth, as Content-Encoding"},
    {FaultKind::transferBomb, "transfer-bomb", "the same as Transfer-Encoding"},
    {FaultKind::head, "head", "answers 100 MB of header lines"},
    {FaultKind::deep, "deep", "answers 30,000 arrays in each other"},
    {FaultKind::types, "types", "answers an object whose members have the wrong types"},
    {FaultKind::duplicate, "duplicate", "answers an object in which names occur twice"},
    {FaultKind::text, "text", "answers a string that is not UTF-8"},
    {FaultKind::message, "message", "refuses in a message that no terminal should see as it is"},
    {FaultKind::page, "page", "answers a page for browsers"},
    {FaultKind::garbage, "garbage", "answers something that is not HTTP"},
};

constexpr long most = 1'000'000'000;

int usualStatus(FaultKind kind) {
  if (kind == FaultKind::redirect) return 302;
  return kind == FaultKind::unavailable ? 503 : 500;
}

std::string_view nameOf(FaultKind kind) {
  return std::find_if(std::begin(faultNames), std::end(faultNames), [kind](const auto& entry) { return entry.kind == kind; })
      ->name;
}

}  // namespace

std::span<const FaultKindName> faultKinds() { return faultNames; }

std::optional<Fault> faultFromForm(const Form& form) {
  const std::string name = field(form, "kind");
  const auto kind =
      std::find_if(std::begin(faultNames), std::end(faultNames), [&name](const auto& entry) { return entry.name == name; });
  if (kind == std::end(faultNames)) return std::nullopt;
  return Fault{.kind = kind->kind,
               .path = field(form, "path"),
               .times = number(form, "times", 1, most),
               .bytes = static_cast<std::size_t>(number(form, "bytes", 0, most)),
               .interval = std::chrono::milliseconds(number(form, "milliseconds", 100, most)),
               .status = static_cast<int>(number(form, "status", usualStatus(kind->kind), 599)),
               .location = field(form, "location"),
               .retryAfter = field(form, "retry_after")};
}

void Faults::arm(Fault fault) {
  const std::lock_guard lock(_mutex);
  _armed.push_back(std::move(fault));
}

void Faults::calm() {
  const std::lock_guard lock(_mutex);
  _armed.clear();
}

std::optional<Fault> Faults::take(std::string_view path) {
  const std::lock_guard lock(_mutex);
  const auto met = std::find_if(_armed.begin(), _armed.end(),
                                [path](const Fault& fault) { return fault.path.empty() || fault.path == path; });
  if (met == _armed.end()) return std::nullopt;
  Fault fault = *met;
  if (met->times == 1) {
    _armed.erase(met);
  } else if (met->times > 1) {
    --met->times;
  }
  return fault;
}

Value Faults::armed() const {
  const std::lock_guard lock(_mutex);
  Array faults;
  for (const Fault& fault : _armed) {
    faults.push_back(
        Dictionary{{"kind", nameOf(fault.kind)}, {"path", fault.path}, {"times", static_cast<std::int64_t>(fault.times)}});
  }
  return faults;
}

}  // namespace palisade::sandbox
