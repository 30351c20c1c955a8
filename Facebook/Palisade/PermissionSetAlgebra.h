#pragma once

/// Making, comparing and combining permission sets. Each operation costs one look-up an element of its first operand.

#include <algorithm>
#include <span>
#include <string_view>

#include "Platform/PermissionSet.h"
#include "Platform/Value.h"

namespace palisade {

inline bool intersects(const PermissionSet& set, const PermissionSet& other) {
  return std::ranges::any_of(set, [&](const std::string& name) { return other.contains(name); });
}

inline bool isSubset(const PermissionSet& set, const PermissionSet& other) {
  return std::ranges::all_of(set, [&](const std::string& name) { return other.contains(name); });
}

inline PermissionSet intersection(const PermissionSet& set, const PermissionSet& other) {
  PermissionSet common;
  for (const std::string& name : set) {
    if (other.contains(name)) common.insert(name);
  }
  return common;
}

inline void subtract(PermissionSet& set, const PermissionSet& other) {
  std::erase_if(set, [&](const std::string& name) { return other.contains(name); });
}

inline PermissionSet permissionSetOfNames(std::span<const std::string_view> names) {
  PermissionSet permissions;
  permissions.reserve(names.size());
  for (const std::string_view name : names) permissions.emplace(name);
  return permissions;
}

/// The array's strings. Elements of another type are no permissions and are dropped.
inline PermissionSet permissionSetFromArray(const Array& array) {
  PermissionSet permissions;
  permissions.reserve(array.size());
  forEachString(array, [&](const std::string& name) { permissions.insert(name); });
  return permissions;
}

}  // namespace palisade
