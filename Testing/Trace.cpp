#include "Testing/Trace.h"

#include <algorithm>
#include <ostream>
#include <utility>

#include "Platform/Format.h"

namespace palisade {
namespace {

thread_local ThreadLabel threadLabel = ThreadLabel::daemon;

}  // namespace

std::string_view nameOf(ThreadLabel label) {
  switch (label) {
    case ThreadLabel::request: return "request";
    case ThreadLabel::preferences: return "preferences";
    case ThreadLabel::daemon: break;
  }
  return "daemon";
}

ThreadLabel currentThreadLabel() { return threadLabel; }

ThreadLabelScope::ThreadLabelScope(ThreadLabel label) : _previous(std::exchange(threadLabel, label)) {}
ThreadLabelScope::~ThreadLabelScope() { threadLabel = _previous; }

const Value& Event::operator[](std::string_view member) const {
  static const Value absent;
  const Value* value = members.find(member);
  return value == nullptr ? absent : *value;
}

std::ostream& operator<<(std::ostream& stream, const Event& event) {
  return stream << event.name << ' ' << compactJson(Value(event.members)) << " on the " << event.thread << " thread";
}

void Trace::record(std::string_view event, Dictionary members) {
  const std::lock_guard lock(_mutex);
  _events.push_back({.name = std::string(event), .thread = std::string(nameOf(threadLabel)), .members = std::move(members)});
}

std::vector<Event> Trace::events() const {
  const std::lock_guard lock(_mutex);
  return _events;
}

std::vector<std::string> Trace::names() const {
  const std::lock_guard lock(_mutex);
  std::vector<std::string> names;
  names.reserve(_events.size());
  std::ranges::transform(_events, std::back_inserter(names), &Event::name);
  return names;
}

std::vector<Event> Trace::named(std::string_view event) const {
  const std::lock_guard lock(_mutex);
  std::vector<Event> found;
  std::ranges::copy_if(_events, std::back_inserter(found), [&](const Event& each) { return each.name == event; });
  return found;
}

void Trace::clear() {
  const std::lock_guard lock(_mutex);
  _events.clear();
}

}  // namespace palisade
