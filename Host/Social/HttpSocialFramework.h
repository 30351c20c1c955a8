#pragma once

/// The social framework of a real host: requests go to the Facebook server over HTTPS, invalidations into the social daemon's
/// outbox.
///
/// Threads: see `SocialFramework`; handlers run on the HTTP client's handler threads. Ownership: borrows the client and the
/// outbox, which outlive every object that is made here; a performed request needs nobody to hold it. Whoever watches exchanges
/// may cancel one; its handler is then told so.
/// Errors: the transport's errors (`HttpErrorDomain`) reach the handler; so does, with `HttpErrorStatus`, an answer of the
/// server that it could not do what was asked. An answer that refuses and says why in JSON is passed on as a body without an
/// error. An invalidation that cannot be written down throws.

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "Host/Social/FacebookServer.h"
#include "Platform/SocialFramework.h"

namespace palisade {

class HttpClient;
class Outbox;

/// What a watch is told of an exchange with the server.
struct Exchange {
  /// The app that a token is asked for; none when words for permissions are.
  std::optional<std::string> appID;
  /// From any thread, and at any time.
  std::function<void()> cancel;
};

/// Called on the thread that performs a request, before anything is sent. The result is kept until the handler has been called.
/// What it throws reaches whoever performs the request, and nothing is sent.
using ExchangeWatch = std::function<std::shared_ptr<const void>(Exchange exchange)>;

class HttpSocialFramework final : public SocialFramework {
 public:
  /// The ID of the account whose token signs invalidations, the first Facebook account; none when there is no account.
  using AccountLookup = std::function<std::optional<std::string>()>;

  HttpSocialFramework(HttpClient& http, Outbox& outbox, FacebookServer server, AccountLookup account,
                      ExchangeWatch watch = nullptr);

  std::shared_ptr<FacebookSession> makeFacebookSession() override;
  std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(
      const std::string& appID, const std::string& bundleID, PermissionSetRef permissions,
      const std::optional<std::string>& audience) override;
  std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef permissions, const std::optional<std::string>& audience) override;

 private:
  HttpClient& _http;
  Outbox& _outbox;
  const FacebookServer _server;
  const AccountLookup _account;
  const ExchangeWatch _watch;
};

}  // namespace palisade
