#pragma once

/// What `palisade` can do, one function a command.
///
/// Each prints its result and answers the exit status: 0 yes, 1 no. Errors are `CallFailed` and `std::runtime_error`: status 2.

#include <optional>
#include <string>
#include <vector>

#include "Cli/AccountsClient.h"
#include "Cli/Output.h"

namespace palisade {

struct AccessRequestArguments {
  std::string appID;
  std::vector<std::string> permissions;
  std::string audience;
};

int listAccounts(AccountsClient& client, const Output& output, const std::string& accountType);
/// The token comes from standard input, or from a prompt without echo on a terminal.
int addAccount(AccountsClient& client, const Output& output, const std::string& accountType, const std::string& username);
int removeAccount(AccountsClient& client, const Output& output, const std::string& id);

int requestAccess(AccountsClient& client, const Output& output, const std::string& accountType,
                  const AccessRequestArguments& arguments);
int printToken(AccountsClient& client, const Output& output, const std::string& accountType);

int listGrants(AccountsClient& client, const Output& output, const std::string& accountType);
int revoke(AccountsClient& client, const Output& output, const std::string& accountType, const std::optional<std::string>& who);
int authorize(AccountsClient& client, const Output& output, const std::string& accountType, const std::string& who);

int showHistory(AccountsClient& client, const Output& output, unsigned limit, const std::optional<std::string>& who);
int showRevocations(AccountsClient& client, const Output& output);
int listClients(AccountsClient& client, const Output& output);

int getPreference(AccountsClient& client, const Output& output, const std::string& domain, const std::string& key);
int setPreference(AccountsClient& client, const Output& output, const std::string& domain, const std::string& key,
                  const std::optional<std::string>& value);
int notify(AccountsClient& client, const Output& output, const std::string& name);

}  // namespace palisade
