#pragma once

/// The plug-in object's members: the category names and the catalogue's four sets, filled on first use.
///
/// Threads: several threads may fill a set at once. Each builds the same names; the first to publish wins, the others drop
/// their copy, and a published set never changes. Ownership: released with the object.

#include <atomic>
#include <memory>
#include <span>
#include <string_view>

#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Platform/PermissionSet.h"

namespace palisade {

class LazilyFilledSet {
 public:
  LazilyFilledSet() = default;
  LazilyFilledSet(const LazilyFilledSet&) = delete;
  LazilyFilledSet& operator=(const LazilyFilledSet&) = delete;
  ~LazilyFilledSet() { delete _published.load(std::memory_order_acquire); }

  /// The set, filled with `names` by the first call.
  const PermissionSet& filledWith(std::span<const std::string_view> names) {
    if (const PermissionSet* set = _published.load(std::memory_order_acquire)) return *set;
    auto filled = std::make_unique<const PermissionSet>(permissionSetOfNames(names));
    const PermissionSet* earlier = nullptr;
    if (!_published.compare_exchange_strong(earlier, filled.get(), std::memory_order_acq_rel)) return *earlier;
    return *filled.release();
  }

 private:
  std::atomic<const PermissionSet*> _published = nullptr;
};

struct PermissionCatalogueSets {
  PermissionSetRef _permissionCategories;
  LazilyFilledSet _basicReadPermissions;
  LazilyFilledSet _extendedReadPermissions;
  LazilyFilledSet _writePermissions;
  LazilyFilledSet _managePermissions;
};

}  // namespace palisade
