#pragma once

/// Mends, before the daemon serves anybody, what a crash may have left between the keychain and the grants.
///
/// A grant is made in this order: token into the keychain, then the record. So a client's token without a granted record is
/// what a crash leaves: it is removed from the keychain, and its invalidation at the server is queued where the app is known.
/// Refusals that no user gave are removed too. Threads: once, at start. Errors: the stores' exceptions; a keychain that cannot
/// be read is left for the next start, and told.

#include <string>
#include <vector>

namespace palisade {

class Keychain;
class Outbox;
class SqliteAccountStore;

/// What was mended or could not be, a sentence each.
std::vector<std::string> repairAfterCrash(SqliteAccountStore& store, Keychain& keychain, Outbox& outbox);

}  // namespace palisade
