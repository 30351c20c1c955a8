#pragma once

/// The requests that give consent messages of every shape: kinds of permissions, audiences, and lists of one, two and many
/// names on either side.

#include <optional>
#include <string>
#include <vector>

#include "Platform/PermissionSet.h"

namespace palisade {

/// In no category of the plug-in's catalogue.
inline constexpr const char* permissionThatOnlyTheServerKnows = "games_activity";

struct ConsentRequest {
  /// What is asked for, for people who read the messages.
  std::string title;
  PermissionSet permissions;
  std::optional<std::string> audience = std::nullopt;
};

/// Each permission alone, in alphabetical order.
std::vector<ConsentRequest> requestsForEachOf(const PermissionSet& permissions);

/// Every combination of reading, posting, managing and unknown permissions. All give different messages.
std::vector<ConsentRequest> requestsOfEveryShape();

/// Those of them that a person has to look at to have seen each kind of sentence with each kind of phrase.
std::vector<ConsentRequest> requestsForReview();

}  // namespace palisade
