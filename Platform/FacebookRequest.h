#pragma once

/// What the social framework's requests to the Facebook server have in common.
///
/// A request is made, given the token that signs it, and performed once. The framework keeps a performed request alive until
/// its handler has run; the caller may let go of it at once. Threads: made and performed on one thread. The handler runs once,
/// on a thread of the framework's own: never inside `performRequestWithHandler`, whose caller may wait for the answer. Handlers
/// are written so that they bear being called from inside all the same. Errors: the transport's errors reach the handler. A
/// request that cannot even be sent may throw; its handler is then dropped.

#include <functional>
#include <optional>
#include <string>

#include "Platform/Error.h"

namespace palisade {

struct HttpResponse {
  int statusCode = 0;
};

/// The body or none, the HTTP response or none, the transport's error or none. An error may come with a body.
using FacebookRequestHandler = std::function<void(std::optional<std::string> data, const std::optional<HttpResponse>& response,
                                                  const std::optional<Error>& error)>;

class FacebookRequest {
 public:
  virtual ~FacebookRequest() = default;

  /// The token that signs the request. A request with a missing or empty token is sent all the same; the server refuses it.
  virtual void setAccessToken(std::optional<std::string> token) = 0;

  virtual void performRequestWithHandler(FacebookRequestHandler handler) = 0;
};

}  // namespace palisade
