#pragma once

/// What clients asked of the sandbox's server, without a value that they sent.
///
/// Threads: every operation may be called from any thread. Ownership: keeps the latest ten thousand. Errors: none.

#include <deque>
#include <mutex>
#include <set>
#include <string>

#include "Platform/Value.h"

namespace palisade::sandbox {

struct LoggedRequest {
  std::string method;
  std::string path;
  /// The names of the form's fields.
  std::set<std::string> fields = {};
  /// Whether it carried a token.
  bool isSigned = false;
  /// The client's port, which tells connections apart.
  int port = 0;
  int status = 0;
  /// The names of the members, if it was answered with an object.
  std::set<std::string> members = {};
};

class RequestLog {
 public:
  void add(LoggedRequest request);
  Value requests() const;

 private:
  static constexpr std::size_t most = 10'000;

  mutable std::mutex _mutex;
  std::deque<LoggedRequest> _requests;  // guarded by the mutex
};

}  // namespace palisade::sandbox
