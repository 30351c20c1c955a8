#include "Host/Social/HttpSocialFramework.h"

#include <mutex>
#include <stdexcept>
#include <utility>

#include "Host/Http/HttpClient.h"
#include "Host/Vantad/Outbox.h"

namespace palisade {
namespace {

using RequestMaker = std::function<HttpRequest(const std::optional<std::string>& token)>;

bool isJson(const std::string& mediaType) { return mediaType == "application/json" || mediaType.ends_with("+json"); }

// What the server means by a refusal (4xx) stands in its JSON; every other answer but success says nothing that could be used.
bool carriesBody(const HttpAnswer& answer) {
  const int kind = answer.statusCode / 100;
  return kind == 2 || (kind == 4 && isJson(answer.mediaType));
}

void tell(const FacebookRequestHandler& handler, HttpResult result, const std::string& serverName) {
  if (const Error* error = std::get_if<Error>(&result)) {
    handler(std::nullopt, std::nullopt, *error);
    return;
  }
  auto& answer = std::get<HttpAnswer>(result);
  const HttpResponse response = {.statusCode = answer.statusCode};
  if (carriesBody(answer)) {
    handler(std::move(answer.body), response, std::nullopt);
  } else {
    handler(std::nullopt, response,
            httpError(HttpErrorStatus,
                      "The server at " + serverName + " answered with status " + std::to_string(answer.statusCode) + "."));
  }
}

// A request under way, for whoever may cancel it.
class Cancellation {
 public:
  /// Takes the transfer that `cancel` ends. It may have ended already.
  void applyTo(std::unique_ptr<HttpTransfer> transfer) {
    const std::lock_guard lock(_mutex);
    if (_isOver) transfer->letGo();
    if (!_isCancelled && !_isOver) _transfer = std::move(transfer);
  }

  void cancel() {
    const std::lock_guard lock(_mutex);
    _isCancelled = true;
    _transfer = nullptr;
  }

  /// There is nothing left to cancel.
  void end() {
    const std::lock_guard lock(_mutex);
    _isOver = true;
    if (const auto transfer = std::exchange(_transfer, nullptr)) transfer->letGo();
  }

 private:
  std::mutex _mutex;
  std::unique_ptr<HttpTransfer> _transfer;
  bool _isCancelled = false;
  bool _isOver = false;
};

template <typename Interface>
class HttpFacebookRequest final : public Interface {
 public:
  HttpFacebookRequest(HttpClient& http, std::string serverName, RequestMaker make, const ExchangeWatch& watch,
                      std::optional<std::string> appID = std::nullopt)
      : _http(http),
        _serverName(std::move(serverName)),
        _make(std::move(make)),
        _watch(watch),
        _appID(std::move(appID)) {}

  void setAccessToken(std::optional<std::string> token) override { _token = std::move(token); }

  void performRequestWithHandler(FacebookRequestHandler handler) override {
    const auto cancellation = std::make_shared<Cancellation>();
    auto watched = _watch ? _watch({.appID = _appID, .cancel = [cancellation] { cancellation->cancel(); }}) : nullptr;
    cancellation->applyTo(_http.send(_make(_token), [cancellation, watched = std::move(watched), handler = std::move(handler),
                                                     serverName = _serverName](HttpResult result) {
      cancellation->end();
      tell(handler, std::move(result), serverName);
    }));
  }

 private:
  HttpClient& _http;
  const std::string _serverName;
  const RequestMaker _make;
  const ExchangeWatch _watch;
  const std::optional<std::string> _appID;
  std::optional<std::string> _token;
};

class OutboxSession final : public FacebookSession {
 public:
  OutboxSession(Outbox& outbox, const HttpSocialFramework::AccountLookup& account) : _outbox(outbox), _account(account) {}

  void revokeAccessTokenForAppWithID(const std::string& appID) override {
    const std::optional<std::string> account = _account();
    if (!account)
      throw std::runtime_error("There is no Facebook account that could ask for the token of app " + appID + " back.");
    _outbox.add(*account, appID);
  }

 private:
  Outbox& _outbox;
  const HttpSocialFramework::AccountLookup _account;
};

}  // namespace

HttpSocialFramework::HttpSocialFramework(HttpClient& http, Outbox& outbox, FacebookServer server, AccountLookup account,
                                         ExchangeWatch watch)
    : _http(http),
      _outbox(outbox),
      _server(std::move(server)),
      _account(std::move(account)),
      _watch(std::move(watch)) {}

std::shared_ptr<FacebookSession> HttpSocialFramework::makeFacebookSession() {
  return std::make_shared<OutboxSession>(_outbox, _account);
}

std::shared_ptr<FacebookAuthorizationRequest> HttpSocialFramework::makeFacebookAuthorizationRequest(
    const std::string& appID, const std::string& bundleID, PermissionSetRef permissions,
    const std::optional<std::string>& audience) {
  return std::make_shared<HttpFacebookRequest<FacebookAuthorizationRequest>>(
      _http, _server.name(),
      [server = _server, appID, bundleID, permissions = std::move(permissions),
       audience](const std::optional<std::string>& token) {
        return server.authorization(appID, bundleID, permissions, audience, token);
      },
      _watch, appID);
}

std::shared_ptr<FacebookPermissionDescriptionRequest> HttpSocialFramework::makeFacebookPermissionDescriptionRequest(
    PermissionSetRef permissions, const std::optional<std::string>& audience) {
  return std::make_shared<HttpFacebookRequest<FacebookPermissionDescriptionRequest>>(
      _http, _server.name(),
      [server = _server, permissions = std::move(permissions), audience](const std::optional<std::string>& token) {
        return server.description(permissions, audience, token);
      },
      _watch);
}

}  // namespace palisade
