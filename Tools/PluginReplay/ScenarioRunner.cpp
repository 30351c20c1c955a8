// Sets the scripted platform up as the scenario says and hands the operations to the plug-in, one after the other. It decides
// nothing about a plug-in's behaviour: what it prints is what the fakes saw.

#include "Tools/PluginReplay/ScenarioRunner.h"

#include <algorithm>
#include <map>
#include <stdexcept>
#include <string>
#include <utility>

#include "Host/Json/Json.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

class ScenarioRun : public std::enable_shared_from_this<ScenarioRun> {
 public:
  ScenarioRun(const Scenario& scenario, const AccountAccessPluginModule& module, std::shared_ptr<const StringTable> strings)
      : _module(module),
        _platform(FakePlatform::create(std::make_shared<NlohmannJsonParser>(), std::move(strings))),
        _accountType(std::make_shared<const AccountType>(scenario.accountType)) {
    setUp(scenario);
  }

  void makePlugin() {
    _plugin = nullptr;
    _platform.run([self = shared_from_this()] { self->_plugin = self->_module.create(self->_platform.services()); });
    requirePlugin("");
  }

  // The operation's thread may never end, so it shares in everything that it uses.
  void carryOut(const ScenarioOperation& operation, std::size_t index) {
    const OperationEnd end = _platform.run([self = shared_from_this(), operation, index] {
      const Dictionary members{{"operation", std::uint64_t{index}}, {"name", nameOf(operation.name)}};
      self->_platform.trace.record("call", members);
      Dictionary outcome = self->perform(operation, index);
      Dictionary returnMembers = members;
      for (const auto& [name, value] : outcome) returnMembers.set(name, value);
      self->_platform.trace.record("return", std::move(returnMembers));
    });
    if (end != OperationEnd::returned && !hasCompleted(index)) {
      const char* const waiting = end == OperationEnd::waitsForAlert ? "alert" : "semaphore";
      _platform.trace.record("blocked-forever", {{"operation", std::uint64_t{index}}, {"waiting", waiting}});
    }
    requirePlugin("operations[" + std::to_string(index) + "]: ");
  }

  std::vector<Event> events() const { return _platform.trace.events(); }

 private:
  void setUp(const Scenario& scenario) {
    for (const auto& [id, client] : scenario.clients) _clients.emplace(id, _platform.makeClient(client));
    for (const FakeAccountData& account : scenario.accounts) _platform.store->addAccount(account);
    for (const ScenarioCredential& entry : scenario.keychain) {
      _platform.keychain.addCredential(entry.accountID, entry.clientID, entry.oauthToken);
    }
    for (const ScenarioRecord& entry : scenario.records) {
      ClientAuthorization record(_clients.at(entry.clientID));
      record.setIsGranted(entry.granted);
      record.setOptions(entry.options);
      record.setGrantedPermissions(entry.permissions);
      _platform.authorizations.addRecord(record, scenario.accountType);
    }
    _platform.authorizations.answerWrites(scenario.storeErrors);
    _platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, scenario.preference);
    _platform.alert.answers.set(scenario.alertAnswers);
    _platform.social.authorizationAnswers.set(scenario.authorizationAnswers);
    _platform.social.descriptionAnswers.set(scenario.descriptionAnswers);
    for (const auto& [key, text] : scenario.strings) _platform.strings.set(key, text);
  }

  // Answers what the operation returns beside its completion.
  Dictionary perform(const ScenarioOperation& operation, std::size_t index) {
    const auto client = [&] { return _clients.at(operation.clientID); };
    const auto completion = [&] { return _platform.completion(index); };
    // A plug-in object that is replaced lives on as long as it carries an operation.
    const std::shared_ptr<AccountAccessPlugin> plugin = _plugin;
    switch (operation.name) {
      case OperationName::supportsAccountType:
        return {{"result", _module.supportsAccountTypeWithIdentifier(operation.identifier)}};
      case OperationName::handleAccessRequest:
        plugin->handleAccessRequestToAccountsOfType(_accountType, client(), operation.options, _platform.store,
                                                    operation.allowUserInteraction, completion());
        break;
      case OperationName::authorizeAccess:
        plugin->authorizeAccessToAccountsOfType(_accountType, client(), _platform.store, completion());
        break;
      case OperationName::revokeAccess:
        plugin->revokeAccessToAccountsOfType(_accountType, client(), _platform.store, completion());
        break;
      case OperationName::revokeAllAccess:
        plugin->revokeAllAccessToAccountsOfType(_accountType, _platform.store, completion());
        break;
      case OperationName::environmentChange:
        _platform.notifications.post(FacebookEnvironmentDidChangeNotification);
        _platform.queues.drain();
        break;
      case OperationName::newPlugin: _plugin = _module.create(_platform.services()); break;
    }
    return {};
  }

  bool hasCompleted(std::size_t index) const {
    return std::ranges::any_of(_platform.trace.named("completion"),
                               [&](const Event& event) { return event["operation"] == Value(std::uint64_t{index}); });
  }

  void requirePlugin(const std::string& place) const {
    if (_plugin == nullptr) throw std::runtime_error(place + "the module made no plug-in object");
  }

  const AccountAccessPluginModule& _module;
  FakePlatform& _platform;
  std::shared_ptr<const AccountType> _accountType;
  std::map<std::string, std::shared_ptr<const Client>> _clients;
  std::shared_ptr<AccountAccessPlugin> _plugin;
};

}  // namespace

std::vector<Event> runScenario(const Scenario& scenario, const AccountAccessPluginModule& module,
                               std::shared_ptr<const StringTable> strings) {
  const auto run = std::make_shared<ScenarioRun>(scenario, module, std::move(strings));
  run->makePlugin();
  for (std::size_t index = 0; index < scenario.operations.size(); ++index) run->carryOut(scenario.operations[index], index);
  return run->events();
}

}  // namespace palisade
