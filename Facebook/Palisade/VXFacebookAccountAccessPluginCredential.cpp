// A client's token in the keychain, beside the account's own credential and under the client's bundle ID.
//
// The server issues tokens without an end, so the entry never expires. A keychain that refuses the entry is the daemon's care;
// the grant stands all the same.

#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/Account.h"
#include "Platform/Client.h"
#include "Platform/KeychainManager.h"

namespace palisade {

void VXFacebookAccountAccessPlugin::_saveCredentialForClient(const std::shared_ptr<const Client>& client,
                                                             const std::shared_ptr<Account>& onAccount,
                                                             const std::optional<std::string>& usingAccessToken) const {
  if (!usingAccessToken) return;
  onAccount->setCredential(std::make_shared<const AccountCredential>(usingAccessToken, "", distantFuture));
  keychain().setCredentialForAccount(onAccount, client->bundleID());
}

}  // namespace palisade
