#include "Testing/FakeSocialFramework.h"

#include <utility>

#include "Testing/TraceValue.h"

namespace palisade {
namespace {

class FakeFacebookSession final : public FacebookSession {
 public:
  FakeFacebookSession(Instruments instruments, int number) : _instruments(instruments), _number(number) {}

  void revokeAccessTokenForAppWithID(const std::string& appID) override {
    _instruments.faults.enter("FacebookSession.revokeAccessTokenForAppWithID");
    _instruments.trace.record("FacebookSession.revokeAccessTokenForAppWithID", {{"session", _number}, {"appID", appID}});
  }

 private:
  Instruments _instruments;
  int _number;
};

template <typename Request>
class FakeFacebookRequest final : public Request, public std::enable_shared_from_this<FakeFacebookRequest<Request>> {
 public:
  FakeFacebookRequest(Instruments instruments, Deliveries& deliveries, Script<ServerAnswer>& answers, std::string name)
      : _instruments(instruments),
        _deliveries(deliveries),
        _answers(answers),
        _name(std::move(name)) {}

  void setAccessToken(std::optional<std::string> token) override {
    _instruments.faults.enter(_name + ".setAccessToken");
    _instruments.trace.record(_name + ".setAccessToken", {{"token", traceText(token)}});
  }

  void performRequestWithHandler(FacebookRequestHandler handler) override {
    _instruments.faults.enter(_name + ".performRequestWithHandler");
    _instruments.trace.record(_name + ".performRequestWithHandler");
    _deliveries.accept(_answers.next(), std::move(handler), this->shared_from_this());
  }

 private:
  Instruments _instruments;
  Deliveries& _deliveries;
  Script<ServerAnswer>& _answers;
  std::string _name;
};

}  // namespace

std::shared_ptr<FacebookSession> FakeSocialFramework::makeFacebookSession() {
  _instruments.faults.enter("FacebookSession.create");
  const int number = ++_sessions;
  _instruments.trace.record("FacebookSession.create", {{"session", number}});
  return std::make_shared<FakeFacebookSession>(_instruments, number);
}

std::shared_ptr<FacebookAuthorizationRequest> FakeSocialFramework::makeFacebookAuthorizationRequest(
    const std::string& appID, const std::string& bundleID, PermissionSetRef permissions,
    const std::optional<std::string>& audience) {
  _instruments.faults.enter("FacebookAuthorizationRequest.init");
  _instruments.trace.record(
      "FacebookAuthorizationRequest.init",
      {{"appID", appID}, {"bundleID", bundleID}, {"permissions", traceSet(permissions)}, {"audience", traceText(audience)}});
  return std::make_shared<FakeFacebookRequest<FacebookAuthorizationRequest>>(_instruments, _deliveries, authorizationAnswers,
                                                                             "FacebookAuthorizationRequest");
}

std::shared_ptr<FacebookPermissionDescriptionRequest> FakeSocialFramework::makeFacebookPermissionDescriptionRequest(
    PermissionSetRef permissions, const std::optional<std::string>& audience) {
  _instruments.faults.enter("FacebookPermissionDescriptionRequest.init");
  _instruments.trace.record("FacebookPermissionDescriptionRequest.init",
                            {{"permissions", traceSet(permissions)}, {"audience", traceText(audience)}});
  return std::make_shared<FakeFacebookRequest<FacebookPermissionDescriptionRequest>>(
      _instruments, _deliveries, descriptionAnswers, "FacebookPermissionDescriptionRequest");
}

}  // namespace palisade
