#include "Host/Daemon/AccountDaemon.h"

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <thread>

#include "Host/Accounts/AccessHistory.h"
#include "Host/Accounts/ClientDirectory.h"
#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Alert/SessionAlert.h"
#include "Host/Bus/BusAccessDialog.h"
#include "Host/Bus/BusLoop.h"
#include "Host/Bus/BusPresence.h"
#include "Host/Bus/BusServer.h"
#include "Host/Bus/SessionLock.h"
#include "Host/Daemon/AccountOperations.h"
#include "Host/Daemon/AlertScheduler.h"
#include "Host/Daemon/AlertSubjects.h"
#include "Host/Daemon/CrashRepair.h"
#include "Host/Daemon/HealthChecks.h"
#include "Host/Daemon/Operation.h"
#include "Host/Daemon/OperationExchange.h"
#include "Host/Daemon/OperationKeychain.h"
#include "Host/Daemon/OperationLog.h"
#include "Host/Daemon/Paths.h"
#include "Host/Daemon/PluginHost.h"
#include "Host/Daemon/StateLock.h"
#include "Host/Http/HttpClient.h"
#include "Host/Identity/ClientRegistry.h"
#include "Host/Json/Json.h"
#include "Host/Keychain/VaultKeychain.h"
#include "Host/Log/JournalLog.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Preferences/TomlPreferencesStore.h"
#include "Host/Queue/ThreadSerialQueue.h"
#include "Host/Secrets/Wipe.h"
#include "Host/Social/HttpSocialFramework.h"
#include "Host/Strings/LanguagePreference.h"
#include "Host/Vantad/Outbox.h"
#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

constexpr const char* startOperation = "start";
constexpr std::size_t listedRevocations = 1000;
constexpr std::chrono::seconds patienceWithAnother{5};

Date now() { return std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now()); }

std::optional<std::filesystem::path> credentialsFolder() {
  const char* folder = std::getenv("CREDENTIALS_DIRECTORY");
  return folder == nullptr ? std::nullopt : std::optional<std::filesystem::path>(folder);
}

ServerConfiguration serverConfiguration() {
  const auto file = configurationFile("server.toml");
  const auto table = readConfiguration(file);
  if (!table) return {};
  try {
    return ServerConfiguration(*table);
  } catch (const ServerConfigurationError& error) {
    throw std::runtime_error(file.string() + ": " + error.what());
  }
}

// The program that shows alerts on a desktop is installed beside this one.
std::filesystem::path alertHelper() { return std::filesystem::read_symlink("/proc/self/exe").parent_path() / "palisade-alert"; }

std::string alertLanguages() {
  std::string languages;
  for (const std::string& language : preferredCatalogues(environmentLanguages()))
    languages += (languages.empty() ? "" : ":") + language;
  return languages;
}

// Whatever comes now may wait, and the thread that reads the bus never does.
void letAnotherRead() { BusLoop::handOver(); }

/// Tells grants' clients apart for the store.
class Directory final : public ClientDirectory {
 public:
  explicit Directory(const ClientRegistry& clients) : _clients(clients) {}

  std::string idOfClient(const Client& client) const override {
    const auto* registered = dynamic_cast<const RegisteredClient*>(&client);
    return registered == nullptr ? client.description() : registered->id();
  }

  std::shared_ptr<const Client> clientWithID(const std::string& id) const override { return _clients.clientWithID(id); }

 private:
  const ClientRegistry& _clients;
};

}  // namespace

// In the order of construction: each part may use what stands above it.
struct AccountDaemon::Parts {
  Parts(const DaemonConfiguration& configuration, SystemAlert* otherAlert)
      : clients(clientRecordFolders(), systemClientRecordFolders()),
        directory(clients),
        store({.path = stateFolder() / "accounts.sqlite",
               .onChange = [this](const StoreChange& change) { announce(change); },
               .beforeDisk = letAnotherRead},
              directory),
        log(configuration.logLevel, [this](const AccessRequestRecord& record) { history.append(record, now()); }),
        history(store, [this](const Error& error) { tell(error.description.value_or("The history cannot be written.")); }),
        keychain({.choice = configuration.keychain,
                  .path = stateFolder() / "vault.sqlite",
                  .keyFile = stateFolder() / "vault.key",
                  .credentialsFolder = credentialsFolder()}),
        outbox({.path = stateFolder() / "outbox.sqlite", .onAdd = [this] { bus.start(socialDaemonBusName); }}),
        server(serverConfiguration()),
        http(server.httpOptions()),
        social(
            http, outbox, FacebookServer(server), [this] { return firstFacebookAccount(); }, watchExchange),
        preferences(configurationFolder() / "preferences"),
        queues(letAnotherRead),
        frontEnd({.choice = configuration.alert,
                  .terminal = configuration.terminal,
                  .desktop = {.helper = alertHelper(),
                              .subject = [this] { return subject(); },
                              .languages = alertLanguages,
                              .networkDisplay = configuration.display.value_or("")},
                  .portal = {.isReachable = isOnSessionBus,
                             .open = openAccessDialog,
                             .subject = [this] { return subject(); },
                             .languages = alertLanguages},
                  .hasUsableDisplay = [display = configuration.display] { return hasUsableDisplay(display); },
                  .watchLock = [](auto onLock) { return std::make_shared<const SessionLock>(std::move(onLock)); }}),
        coolDown(configuration.coolDown),
        alert(otherAlert != nullptr ? *otherAlert : frontEnd,
              otherAlert != nullptr ? [](const std::shared_ptr<AlertHandle>&) {} : SessionAlert::takeDown, coolDown, log),
        service({.store = store,
                 .history = history,
                 .keychain = keychain,
                 .outbox = outbox,
                 .clients = clients,
                 .coolDown = coolDown,
                 .alerts = alert,
                 .preferences = preferences,
                 .pluginFor = [this](std::string_view accountType) { return plugins->pluginFor(accountType); },
                 .revocations = [this] { return revocations(); },
                 .status = [this] { return status(); }}),
        pluginLog(log),
        pluginKeychain(keychain, store, coolDown,
                       [this](const std::string& clientID) { return service.operationOf(clientID); }),
        bus(service, [this](const std::string& sentence) { tell(sentence); }) {
    lock.emplace(stateFolder(), "accountd", patienceWithAnother);
    // Only the one daemon of these stores may repair: another could be in the middle of a grant.
    for (const std::string& sentence : repairAfterCrash(store, keychain, outbox)) tell(sentence);
    if (!outbox.pending().empty()) bus.start(socialDaemonBusName);
    plugins.emplace(configuration.plugins, PlatformServices{.log = &pluginLog,
                                                            .keychain = &pluginKeychain,
                                                            .social = &social,
                                                            .alert = &alert,
                                                            .preferences = &preferences,
                                                            .notifications = &bus.notifications(),
                                                            .queues = &queues,
                                                            .json = &json});
    for (const std::string& trouble : plugins->troubles()) tell(trouble);
    for (const std::string& trouble : clients.troubles()) tell(trouble);
    // It waits for the Secret Service, and nobody waits for it.
    tidying = std::jthread([this] {
      for (const std::string& sentence : keychain.tidy()) tell(sentence);
      wipeDeadStack();
    });
  }

  void tell(const std::string& sentence) { log.record(startOperation, LogLevel::error, "%@", "sentence", sentence); }

  void announce(const StoreChange& change) {
    if (!isServing) return;
    if (change.kind == StoreChange::Kind::accounts) {
      bus.emitAccountsChanged(change.accountTypeIdentifier);
    } else {
      bus.emitGrantsChanged(change.accountTypeIdentifier, change.clientID.value_or(""));
    }
  }

  std::optional<std::string> firstFacebookAccount() {
    for (const AccountRecord& account : store.accounts()) {
      if (account.accountTypeIdentifier == AccountTypeIdentifierFacebook) return account.id;
    }
    return std::nullopt;
  }

  /// Who asks through the calling thread, as an alert shows it.
  std::optional<AlertSubject> subject() {
    const Operation* operation = Operation::current();
    if (operation == nullptr || !operation->grant() || operation->client() == nullptr) return std::nullopt;
    const Intent& grant = *operation->grant();
    AlertSubject subject = subjectOf(*operation->client());
    for (const AccountRecord& account : store.accounts()) {
      if (account.accountTypeIdentifier == grant.accountTypeIdentifier && subject.account.empty()) {
        subject.account = account.username;
      }
    }
    return subject;
  }

  Rows revocations() {
    Rows rows;
    for (const Invalidation& entry : outbox.latest(listedRevocations)) {
      Dictionary row{{"account", entry.accountID},
                     {"app_id", entry.appID},
                     {"state", nameOf(entry.state)},
                     {"attempts", entry.attempts},
                     {"requested", entry.requested.date.time_since_epoch().count()}};
      if (entry.nextAttemptAt) row.set("next_attempt", entry.nextAttemptAt->time_since_epoch().count());
      if (entry.lastError) row.set("last_error", *entry.lastError);
      rows.push_back(std::move(row));
    }
    return rows;
  }

  Dictionary status() {
    Array modules;
    for (const std::string& module : plugins->modules()) modules.emplace_back(module);
    Dictionary report{{"plugins", modules},
                      {"keychain", keychain.description()},
                      {"alert", frontEnd.description()},
                      {"server", server.address},
                      {"store", (stateFolder() / "accounts.sqlite").string()},
                      {"log", log.destination()},
                      {"clients", static_cast<std::int64_t>(clients.clients().size())}};
    if (!plugins->troubles().empty()) report.set("plugins_trouble", plugins->troubles().front());
    if (modules.empty()) report.set("plugins_trouble", "No plug-in was loaded.");
    if (!clients.troubles().empty()) report.set("clients_trouble", clients.troubles().front());
    if (const auto trouble = frontEnd.trouble()) report.set("alert_trouble", *trouble);
    if (const auto trouble = keychain.trouble()) report.set("keychain_trouble", *trouble);
    if (server.address.empty()) {
      report.set("server_trouble", "No server is configured. Write address = \"https://…\" into " +
                                       (configurationFolder() / "server.toml").string() + ".");
    } else if (const auto trouble = troubleWithServer(server)) {
      report.set("server_trouble", *trouble);
    }
    return report;
  }

  std::optional<StateLock> lock;
  ClientRegistry clients;
  Directory directory;
  SqliteAccountStore store;
  JournalLog log;
  AccessHistory history;
  VaultKeychain keychain;
  Outbox outbox;
  ServerConfiguration server;
  HttpClient http;
  HttpSocialFramework social;
  TomlPreferencesStore preferences;
  ThreadSerialQueueFactory queues;
  NlohmannJsonParser json;
  SessionAlert frontEnd;
  AlertCoolDown coolDown;
  AlertScheduler alert;
  AccountOperations service;
  OperationLog pluginLog;
  OperationKeychain pluginKeychain;
  BusServer bus;
  std::optional<PluginHost> plugins;
  std::atomic<bool> isServing = false;
  std::jthread tidying;
};

AccountDaemon::AccountDaemon(const DaemonConfiguration& configuration, SystemAlert* alert)
    : _parts(std::make_unique<Parts>(configuration, alert)) {}
AccountDaemon::~AccountDaemon() = default;

void AccountDaemon::run() {
  _parts->isServing = true;
  _parts->bus.run();
}

void AccountDaemon::stop() {
  _parts->service.withdrawAll();
  _parts->bus.stop();
}

}  // namespace palisade
