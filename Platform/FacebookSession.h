#pragma once

/// A session with the platform's social daemon, which invalidates tokens at the Facebook server.
///
/// Threads: used by one thread at a time. Ownership: the caller's, for as long as it needs it.
/// Errors: invalidation is a request, not an answer: the social daemon carries it out, retries it, and keeps its outcome.

#include <string>

namespace palisade {

class FacebookSession {
 public:
  virtual ~FacebookSession() = default;

  /// Requests that the token held by the app is made invalid. Returns as soon as the request is safe with the social daemon.
  virtual void revokeAccessTokenForAppWithID(const std::string& appID) = 0;
};

}  // namespace palisade
