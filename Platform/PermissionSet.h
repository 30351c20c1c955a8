#pragma once

/// Sets of permission names.
///
/// A permission is a name such as "user_likes". Names are compared by their bytes: case and blanks count. Order carries no
/// meaning. A set that is shared (by a grant, a prompt, a request to the server) is immutable and held by `PermissionSetRef`;
/// a null reference is "none", which is not the empty set: a refused record holds none, a grant without permissions holds
/// an empty set.

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_set>

namespace palisade {

struct PermissionNameHash {
  using is_transparent = void;
  std::size_t operator()(std::string_view name) const noexcept { return std::hash<std::string_view>{}(name); }
};

using PermissionSet = std::unordered_set<std::string, PermissionNameHash, std::equal_to<>>;
using PermissionSetRef = std::shared_ptr<const PermissionSet>;

}  // namespace palisade
