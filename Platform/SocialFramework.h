#pragma once

/// Makes the social framework's Facebook objects.
///
/// Threads: every operation may be called from any thread. Ownership: the caller shares what it made. Errors: an object that
/// cannot be made is an exception; none is ever null.

#include <memory>
#include <optional>
#include <string>

#include "Platform/FacebookAuthorizationRequest.h"
#include "Platform/FacebookPermissionDescriptionRequest.h"
#include "Platform/FacebookSession.h"
#include "Platform/PermissionSet.h"

namespace palisade {

class SocialFramework {
 public:
  virtual ~SocialFramework() = default;

  virtual std::shared_ptr<FacebookSession> makeFacebookSession() = 0;

  /// `permissions` and `audience` (the server's word: "EVERYONE", "ALL_FRIENDS", "SELF") may be none and are then left out of
  /// the request.
  virtual std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(
      const std::string& appID, const std::string& bundleID, PermissionSetRef permissions,
      const std::optional<std::string>& audience) = 0;

  virtual std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef permissions, const std::optional<std::string>& audience) = 0;
};

}  // namespace palisade
