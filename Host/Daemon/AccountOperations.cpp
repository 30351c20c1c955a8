#include "Host/Daemon/AccountOperations.h"

#include <algorithm>
#include <future>

#include "Host/Bus/BusLoop.h"
#include "Host/Daemon/AtEnd.h"
#include "Host/Daemon/OperationStore.h"
#include "Host/Daemon/StoreCall.h"
#include "Host/Identity/ConnectionOwner.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"

namespace palisade {
namespace {

std::optional<std::string> textUnder(const Dictionary& options, std::string_view key) {
  const Value* value = options.find(key);
  return value == nullptr || value->string() == nullptr ? std::nullopt : std::optional(*value->string());
}

}  // namespace

AccessOutcome AccountOperations::requestAccess(const BusCaller& caller, const std::string& accountType,
                                               const std::shared_ptr<const Dictionary>& accessOptions,
                                               PendingRequest& request) {
  const auto client = clientOf(caller);
  return carryOut(caller, client, accountType, textUnder(*accessOptions, FacebookAppIdKey), request,
                  [&](auto& plugin, const auto& type, const auto& store, auto completion) {
                    plugin.handleAccessRequestToAccountsOfType(type, client, accessOptions, store, true, std::move(completion));
                  });
}

AccessOutcome AccountOperations::authorize(const BusCaller& caller, const std::string& accountType, const std::string& clientID,
                                           PendingRequest& request) {
  refuseUnlessManager(caller);
  const auto client = registeredClient(clientID);
  return carryOut(caller, client, accountType, std::nullopt, request,
                  [&](auto& plugin, const auto& type, const auto& store, auto completion) {
                    // The person who manages grants has decided; what is stored is their answer.
                    Operation::current()->userHasAnswered();
                    _parts.coolDown.note(client->id(), AlertEnding::allowed);
                    Operation::current()->aboutToWait();
                    plugin.authorizeAccessToAccountsOfType(type, client, store, std::move(completion));
                  });
}

AccessOutcome AccountOperations::carryOut(const BusCaller& caller, const std::shared_ptr<const RegisteredClient>& client,
                                          const std::string& accountType, const std::optional<std::string>& appID,
                                          PendingRequest& request, const PluginCall& call) {
  const auto plugin = pluginFor(accountType);
  const auto operation = std::make_shared<Operation>(
      [&request] { request.becomePending(); },
      Intent{.kind = Intent::Kind::grant, .accountTypeIdentifier = accountType, .clientID = client->id(), .appID = appID},
      client);
  {
    const std::lock_guard lock(_mutex);
    _running.emplace(
        operation.get(),
        Running{.operation = operation, .caller = caller.uniqueName, .client = client->id(), .request = request.identifier()});
  }
  const AtEnd forget([&] {
    const std::lock_guard lock(_mutex);
    _running.erase(operation.get());
  });

  try {
    auto turn = _lanes.enter(client->id(), [&] { operation->aboutToWait(); });
    if (const auto failure = operation->failure()) throw BusFailure(*failure);
    if (operation->isWithdrawn()) return {.response = AccessResponse::withdrawn};
    const auto noteTurn = [&](bool hasTurn) {
      const std::lock_guard lock(_mutex);
      _running.at(operation.get()).hasTurn = hasTurn;
    };
    noteTurn(true);

    const OperationScope scope(*operation);
    const auto outcome = std::make_shared<std::promise<AccessOutcome>>();
    auto answer = outcome->get_future();
    call(*plugin, std::make_shared<const AccountType>(accountType), std::make_shared<OperationStore>(_parts.store, operation),
         [&, outcome](bool granted, const std::optional<Error>& error) {
           const AccessOutcome result{.response = granted ? AccessResponse::granted : AccessResponse::refused, .error = error};
           // After a grant nothing is left to do: its application need not wait for another thread to wake up, neither for the
           // answer nor for its next turn.
           if (granted && !operation->failure()) {
             noteTurn(false);
             turn.end();
             request.answerAtOnce(result);
           }
           outcome->set_value(result);
         });
    if (answer.wait_for(std::chrono::seconds(0)) != std::future_status::ready) {
      try {
        operation->aboutToWait();
        // The user has agreed and the server is at work: a token that it issues from here on is taken back if this daemon dies.
        if (operation->isAnsweredByUser())
          operation->noteGrant([&](const Intent& grant) { return _parts.store.noteIntent(grant); });
        if (operation->wasUserAsked()) _parts.history.flush();
      } catch (const BusFailure& failure) {
        // The plug-in is at work and its answer has to be waited for; nothing may come of it.
        operation->fail(failure);
        operation->revoke();
      }
    }
    AccessOutcome result = answer.get();

    if (operation->wasUserAsked()) _parts.history.flush();
    if (operation->hasNotedGrant() && result.response != AccessResponse::granted) {
      // Whoever revoked it has taken the note over.
      operation->unlessRevoked([&] { return _parts.store.forgetIntent(AccountType(accountType), client->id()); });
    }
    // The user of an entitled application is never asked about it, so its failures are none of the user's.
    const bool mayComeToAnAlert = !client->hasEntitlement(FacebookDefaultAccessEntitlement);
    if (mayComeToAnAlert && operation->hasKeptServicesBusy() && !operation->wasUserAsked() && !operation->isRevoked()) {
      _parts.alerts.noteUnshown(*operation);
    }
    if (!operation->isAnsweredByUser() && result.response != AccessResponse::granted) {
      if (operation->hasStoredRefusalByNobody()) _parts.store.removeAnswersByNobodyForClient(*client);
      if (operation->isLeftUnanswered()) result.response = AccessResponse::withdrawn;
    }
    if (const auto failure = operation->failure()) throw BusFailure(*failure);
    return result;
  } catch (const LaneIsFull& failure) {
    throw BusFailure(BusFailureKind::tooManyRequests, failure.what());
  }
}

std::string AccountOperations::credential(const BusCaller& caller, const std::string& accountType) {
  const auto client = clientOf(caller);
  pluginFor(accountType);
  const auto record = storeCall([&] { return _parts.store.authorizationForClient(client, AccountType(accountType)); });
  if (record == nullptr || !record->isGranted()) {
    throw BusFailure(BusFailureKind::notGranted,
                     client->description() + " was not granted access. Ask with RequestAccess first.");
  }
  const auto accounts = _parts.store.accountsWithAccountTypeIdentifier(accountType);
  if (accounts.empty())
    throw BusFailure(BusFailureKind::noSuchAccount, "There is no account of the type '" + accountType + "'.");
  try {
    const auto credential = _parts.keychain.credentialForAccount(accounts.front(), client->bundleID());
    // The keychain may take its time, and the access may have been taken back meanwhile.
    const auto present = storeCall([&] { return _parts.store.authorizationForClient(client, AccountType(accountType)); });
    const bool isStillGranted = present != nullptr && present->isGranted();
    if (isStillGranted && client->bundleID() && credential != nullptr && credential->oauthToken())
      return *credential->oauthToken();
  } catch (const std::exception& failure) {
    throw BusFailure(BusFailureKind::keychainUnavailable, failure.what());
  }
  throw BusFailure(BusFailureKind::notGranted, "The grant of " + client->description() + " carries no token. Ask again.");
}

bool AccountOperations::mayPost(const BusCaller& caller) {
  try {
    return !clientOf(caller)->isInSandbox();
  } catch (const BusFailure&) {
    return false;
  }
}

void AccountOperations::close(std::uint64_t requestIdentifier) {
  withdraw([&](const Running& running) { return running.request == requestIdentifier; });
}

void AccountOperations::callerLeft(const std::string& uniqueName) {
  {
    const std::lock_guard lock(_mutex);
    _clientsByConnection.erase(uniqueName);
    _strangers.erase(uniqueName);
  }
  withdraw([&](const Running& running) { return running.caller == uniqueName; });
}

std::shared_ptr<Operation> AccountOperations::operationOf(const std::string& clientID) {
  const std::lock_guard lock(_mutex);
  const auto found = std::ranges::find_if(
      _running, [&](const auto& entry) { return entry.second.hasTurn && entry.second.client == clientID; });
  return found == _running.end() ? nullptr : found->second.operation;
}

void AccountOperations::withdrawAll() {
  withdraw([](const Running&) { return true; });
}

std::vector<std::shared_ptr<Operation>> AccountOperations::operationsThat(const Withdrawable& areMeant) {
  std::vector<std::shared_ptr<Operation>> meant;
  const std::lock_guard lock(_mutex);
  for (const auto& [operation, running] : _running) {
    if (areMeant(running)) meant.push_back(running.operation);
  }
  return meant;
}

void AccountOperations::withdraw(const Withdrawable& isMeant) {
  for (const auto& operation : operationsThat(isMeant)) operation->withdraw();
}

std::optional<std::string> AccountOperations::knownApplication(const BusCaller& caller) {
  const std::lock_guard lock(_mutex);
  const auto known = _clientsByConnection.find(caller.uniqueName);
  return known == _clientsByConnection.end() ? std::nullopt : std::optional(known->second->id());
}

std::shared_ptr<const RegisteredClient> AccountOperations::clientOf(const BusCaller& caller) {
  {
    const std::lock_guard lock(_mutex);
    const auto known = _clientsByConnection.find(caller.uniqueName);
    if (known != _clientsByConnection.end()) return known->second;
    const auto stranger = _strangers.find(caller.uniqueName);
    if (stranger != _strangers.end()) throw BusFailure(BusFailureKind::unknownCaller, stranger->second);
  }
  // Whose program it is stands on a disk, and which one is the caller's choice.
  BusLoop::handOver();
  try {
    const auto client = _parts.clients.identify(caller.describe());
    const std::lock_guard lock(_mutex);
    return _clientsByConnection.emplace(caller.uniqueName, client).first->second;
  } catch (const NotItsConnection& failure) {
    const std::lock_guard lock(_mutex);
    _strangers.emplace(caller.uniqueName, failure.what());
    throw BusFailure(BusFailureKind::unknownCaller, failure.what());
  } catch (const std::exception& failure) {
    throw BusFailure(BusFailureKind::unknownCaller, failure.what());
  }
}

void AccountOperations::refuseUnlessManager(const BusCaller& caller) {
  if (clientOf(caller)->isInSandbox()) {
    throw BusFailure(BusFailureKind::notPermitted, "A sandboxed application may not manage accounts and grants.");
  }
}

std::shared_ptr<const RegisteredClient> AccountOperations::registeredClient(const std::string& id) const {
  auto client = _parts.clients.clientWithID(id);
  if (client == nullptr) {
    throw BusFailure(BusFailureKind::noSuchClient, "There is no client '" + id + "'. `palisade clients` shows them.");
  }
  return client;
}

std::shared_ptr<AccountAccessPlugin> AccountOperations::pluginFor(const std::string& accountType) const {
  auto plugin = _parts.pluginFor(accountType);
  if (plugin == nullptr) {
    throw BusFailure(BusFailureKind::invalidArguments, "No plug-in serves the account type '" + accountType + "'.");
  }
  return plugin;
}

}  // namespace palisade
