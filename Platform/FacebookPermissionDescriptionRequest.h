#pragma once

/// Asks the Facebook server to describe permissions in words. The answer is a bare JSON string; "API_EC_PARAM" says that the
/// server cannot describe them. Threads, ownership and errors: see `FacebookRequest`.

#include "Platform/FacebookRequest.h"

namespace palisade {

class FacebookPermissionDescriptionRequest : public FacebookRequest {};

}  // namespace palisade
