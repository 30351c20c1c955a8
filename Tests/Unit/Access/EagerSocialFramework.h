#pragma once

/// A social framework whose answers have been dealt with, on a thread of their own, before `performRequestWithHandler` returns:
/// whoever waits for one afterwards comes too late to see it arrive.
///
/// Threads: used by one thread at a time. Ownership: borrows the platform.

#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "Testing/FakePlatform.h"

namespace palisade {

template <typename Request>
class EagerRequest final : public Request {
 public:
  EagerRequest(std::shared_ptr<Request> request, Deliveries& deliveries)
      : _request(std::move(request)),
        _deliveries(deliveries) {}

  void setAccessToken(std::optional<std::string> token) override { _request->setAccessToken(std::move(token)); }

  void performRequestWithHandler(FacebookRequestHandler handler) override {
    _request->performRequestWithHandler(std::move(handler));
    _deliveries.deliverNext();
  }

 private:
  std::shared_ptr<Request> _request;
  Deliveries& _deliveries;
};

class EagerSocialFramework final : public SocialFramework {
 public:
  explicit EagerSocialFramework(FakePlatform& platform) : _platform(platform) {}

  std::shared_ptr<FacebookSession> makeFacebookSession() override { return _platform.social.makeFacebookSession(); }

  std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(
      const std::string& appID, const std::string& bundleID, PermissionSetRef permissions,
      const std::optional<std::string>& audience) override {
    return std::make_shared<EagerRequest<FacebookAuthorizationRequest>>(
        _platform.social.makeFacebookAuthorizationRequest(appID, bundleID, std::move(permissions), audience),
        _platform.deliveries);
  }

  std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef permissions, const std::optional<std::string>& audience) override {
    return std::make_shared<EagerRequest<FacebookPermissionDescriptionRequest>>(
        _platform.social.makeFacebookPermissionDescriptionRequest(std::move(permissions), audience), _platform.deliveries);
  }

 private:
  FakePlatform& _platform;
};

}  // namespace palisade
