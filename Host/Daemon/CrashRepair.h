#pragma once

/// Mends, before the daemon serves anybody, what a crash may have left between the keychain and the grants.
///
/// A grant is made in this order: intent, token into the keychain, record. One that was cut off is undone: its token is removed
/// from the keychain and the invalidation at the server queued. An account's removal that was begun is finished. A revocation
/// goes the same way: intent, invalidation, token, record; one that was cut off is finished. Tokens that no grant answers for,
/// for whatever reason, are removed too, and so are refusals that no user gave. Threads: once, at start. Errors: the stores'
/// exceptions; a keychain that cannot be read is left for the next start, and told.

#include <string>
#include <vector>

namespace palisade {

class Keychain;
class Outbox;
class SqliteAccountStore;

/// What was mended or could not be, a sentence each.
std::vector<std::string> repairAfterCrash(SqliteAccountStore& store, Keychain& keychain, Outbox& outbox);

}  // namespace palisade
