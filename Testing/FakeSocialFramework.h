#pragma once

/// A social framework whose server answers from a script. See `SocialFramework`.
///
/// Threads: safe from every thread. Each kind of request takes the next answer of its own script when it is performed.

#include <atomic>
#include <memory>
#include <optional>
#include <string>

#include "Platform/SocialFramework.h"
#include "Testing/Deliveries.h"
#include "Testing/Instruments.h"
#include "Testing/Script.h"

namespace palisade {

class FakeSocialFramework final : public SocialFramework {
 public:
  FakeSocialFramework(Instruments instruments, Deliveries& deliveries) : _instruments(instruments), _deliveries(deliveries) {}

  /// A script that was never set answers neither data nor an error, on another thread.
  Script<ServerAnswer> authorizationAnswers;
  Script<ServerAnswer> descriptionAnswers;

  std::shared_ptr<FacebookSession> makeFacebookSession() override;
  std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(
      const std::string& appID, const std::string& bundleID, PermissionSetRef permissions,
      const std::optional<std::string>& audience) override;
  std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef permissions, const std::optional<std::string>& audience) override;

 private:
  Instruments _instruments;
  Deliveries& _deliveries;
  std::atomic<int> _sessions = 0;
};

}  // namespace palisade
