#pragma once

/// One scenario: what the scripted platform holds and answers, and what is asked of the plug-in. A plain value; constants stand
/// in it with their values, not with their names.

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Platform/AccountConstants.h"
#include "Platform/Error.h"
#include "Platform/PermissionSet.h"
#include "Platform/Value.h"
#include "Testing/Deliveries.h"
#include "Testing/FakeAccount.h"
#include "Testing/FakeClient.h"
#include "Testing/FakeSystemAlert.h"

namespace palisade {

struct ScenarioCredential {
  std::string accountID;
  std::optional<std::string> clientID;
  std::optional<std::string> oauthToken;
};

struct ScenarioRecord {
  std::string clientID;
  bool granted = false;
  std::shared_ptr<const Dictionary> options;
  PermissionSetRef permissions;
};

enum class OperationName {
  supportsAccountType,
  handleAccessRequest,
  authorizeAccess,
  revokeAccess,
  revokeAllAccess,
  environmentChange,
  newPlugin
};

struct ScenarioOperation {
  OperationName name = OperationName::newPlugin;
  /// Of `supportsAccountType`.
  std::string identifier = {};
  /// Of the operations that concern one client.
  std::string clientID = {};
  /// Of `handleAccessRequest`.
  std::shared_ptr<const Dictionary> options = nullptr;
  bool allowUserInteraction = true;
};

struct Scenario {
  std::map<std::string, FakeClientData> clients;
  std::string accountType{AccountTypeIdentifierFacebook};
  std::vector<FakeAccountData> accounts;
  std::vector<ScenarioCredential> keychain;
  std::vector<ScenarioRecord> records;
  std::vector<std::optional<Error>> storeErrors;
  std::optional<Value> preference;
  std::vector<AlertAnswer> alertAnswers;
  std::vector<ServerAnswer> authorizationAnswers;
  std::vector<ServerAnswer> descriptionAnswers;
  std::map<std::string, std::optional<std::string>> strings;
  std::vector<ScenarioOperation> operations;
};

/// As it is written in a scenario and in a trace.
std::string_view nameOf(OperationName name);
std::optional<OperationName> operationNamed(std::string_view name);

}  // namespace palisade
