#pragma once

/// Removes the tokens of accounts that have been removed, each when no invalidation needs it any more.
///
/// An invalidation is signed with the account's own token, so the token outlives the account until the server has answered for
/// everything that was granted on it. Both daemons do this: whichever comes first.
/// Threads: any. Errors: those of the outbox; a token that the keychain does not give up stays noted for the next time.

#include "Host/Vantad/Outbox.h"
#include "Platform/KeychainManager.h"

namespace palisade {

void removeTokensOfDepartedAccounts(Outbox& outbox, KeychainManager& keychain);

}  // namespace palisade
