#pragma once

/// The options of a request by the names that applications give them, as strings to build dictionaries with.

#include <string>

#include "Platform/AccountConstants.h"

namespace palisade {

inline const std::string appIDKey(FacebookAppIdKey);
inline const std::string permissionsKey(FacebookPermissionsKey);
inline const std::string audienceKey(FacebookAudienceKey);

}  // namespace palisade
