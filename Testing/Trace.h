#pragma once

/// The record of what a plug-in asked of its platform, in the order in which it happened.
///
/// Purpose: unit tests assert on it, and the scenario runner prints it; both see the same names and members. Every fake writes
/// here; look-ups that change nothing (a client's name, a localised text) are left out.
/// Threads: safe from every thread; each event carries the label of the thread that it happened on.
/// Ownership: events are plain values. Errors: none.

#include <cstddef>
#include <iosfwd>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "Platform/Value.h"

namespace palisade {

/// Which kind of thread runs: one that carries an operation, one that brings a server's answer, one of a serial queue.
enum class ThreadLabel { daemon, request, preferences };

std::string_view nameOf(ThreadLabel label);

/// The label of the calling thread; `daemon` unless somebody said otherwise.
ThreadLabel currentThreadLabel();

/// Labels the calling thread for as long as the object lives.
class ThreadLabelScope {
 public:
  explicit ThreadLabelScope(ThreadLabel label);
  ~ThreadLabelScope();

  ThreadLabelScope(const ThreadLabelScope&) = delete;
  ThreadLabelScope& operator=(const ThreadLabelScope&) = delete;

 private:
  ThreadLabel _previous;
};

struct Event {
  /// Such as "KeychainManager.credentialForAccount".
  std::string name;
  std::string thread;
  Dictionary members;

  /// The member, or a null value when the event has none of that name.
  const Value& operator[](std::string_view member) const;

  friend bool operator==(const Event&, const Event&) = default;
};

/// One line, for failing tests.
std::ostream& operator<<(std::ostream& stream, const Event& event);

class Trace {
 public:
  void record(std::string_view event, Dictionary members = {});

  std::vector<Event> events() const;

  /// The events' names alone, in order.
  std::vector<std::string> names() const;

  /// The events of one name, in order.
  std::vector<Event> named(std::string_view event) const;

  void clear();

 private:
  mutable std::mutex _mutex;
  std::vector<Event> _events;
};

}  // namespace palisade
