#pragma once

/// The app ID that a stored grant carries.
///
/// It is looked up as it stands: what a damaged record holds in its place is worth a log record, and otherwise counts as none.
/// The empty string is an app ID.

#include "Platform/AccountConstants.h"
#include "Platform/ClientAuthorization.h"

namespace palisade {

/// The value under the app ID's key, of whatever type, or none. Valid as long as the record's options.
inline const Value* storedAppID(const ClientAuthorization& record) {
  return record.options() == nullptr ? nullptr : record.options()->find(FacebookAppIdKey);
}

/// The app ID when it is a string, or none.
inline const std::string* usableAppID(const Value* stored) { return stored == nullptr ? nullptr : stored->string(); }

}  // namespace palisade
