#pragma once

/// The ways in which the sandbox's server can be told to fail, and those that it has been told.
///
/// Threads: every operation of `Faults` may be called from any thread. Ownership: values. Errors: `faultFromForm` answers none
/// for a fault that does not exist.

#include <chrono>
#include <cstddef>
#include <deque>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "Platform/Value.h"
#include "Sandbox/Form.h"

namespace palisade::sandbox {

enum class FaultKind {
  silent,
  slow,
  stall,
  close,
  reset,
  twice,
  redirect,
  unavailable,
  status,
  huge,
  bomb,
  transferBomb,
  head,
  deep,
  types,
  duplicate,
  text,
  message,
  page,
  garbage
};

struct FaultKindName {
  FaultKind kind;
  std::string_view name;
  std::string_view explanation;
};

std::span<const FaultKindName> faultKinds();

struct Fault {
  FaultKind kind = FaultKind::silent;
  /// Which requests fail; empty stands for all.
  std::string path = {};
  /// How many of them; 0 stands for all that come.
  long times = 1;
  std::size_t bytes = 0;
  std::chrono::milliseconds interval = std::chrono::milliseconds(100);
  int status = 500;
  std::string location = {};
  std::string retryAfter = {};
};

/// The fields are named like the command line's options, with "_" for "-".
std::optional<Fault> faultFromForm(const Form& form);

class Faults {
 public:
  void arm(Fault fault);
  void calm();

  /// The fault that this request meets, the one that was armed first, if any; it is used up accordingly.
  std::optional<Fault> take(std::string_view path);

  Value armed() const;

 private:
  mutable std::mutex _mutex;
  std::deque<Fault> _armed;  // guarded by the mutex
};

}  // namespace palisade::sandbox
