#pragma once

/// Work that is due when a scope ends, however it ends.
///
/// Threads: one. Ownership: owns the work. Errors: the work must not throw.

#include <utility>

namespace palisade {

template <typename Work>
class AtEnd {
 public:
  explicit AtEnd(Work work) : _work(std::move(work)) {}
  AtEnd(const AtEnd&) = delete;
  AtEnd& operator=(const AtEnd&) = delete;
  ~AtEnd() { _work(); }

 private:
  Work _work;
};

}  // namespace palisade
