#pragma once

/// Asks the Facebook server for an access token for a client's app. The answer is a JSON object with "access_token",
/// "permissions" and "error_msg", all optional. Threads, ownership and errors: see `FacebookRequest`.

#include "Platform/FacebookRequest.h"

namespace palisade {

class FacebookAuthorizationRequest : public FacebookRequest {};

}  // namespace palisade
