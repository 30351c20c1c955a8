#include "Cli/AccountsClient.h"

#include <fcntl.h>
#include <sdbus-c++/sdbus-c++.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <map>
#include <mutex>
#include <random>

#include "DBus/Accounts1Proxy.h"
#include "DBus/BusValue.h"

namespace palisade {
namespace {

constexpr const char* busName = "com.veltran.Accounts1";
constexpr const char* objectPath = "/com/veltran/Accounts1";
constexpr const char* requestInterface = "com.veltran.Accounts1.Request";

// What to do about the errors of the daemon whose own sentence does not say.
constexpr std::pair<std::string_view, std::string_view> nextSteps[] = {
    {"NotGranted", " `palisade request --help` says how an application asks."},
    {"NotPermitted", " Run it outside the sandbox."},
    {"TooManyRequests", " Wait for the earlier ones to be answered."},
    {"UnknownCaller", " `palisade clients` shows the applications that are known."},
    {"KeychainUnavailable", " `palisade doctor` examines the keychain."},
    {"StoreUnavailable", " `palisade doctor` examines the store."},
};

std::string_view nextStepAfter(std::string_view errorName) {
  const auto* const step = std::ranges::find(nextSteps, errorName, &std::pair<std::string_view, std::string_view>::first);
  return step == std::end(nextSteps) ? "" : step->second;
}

// A sentence for the errors that the bus itself makes; the daemon's own errors bring theirs.
CallFailed failureOf(const sdbus::Error& error) {
  const std::string name = error.getName().substr(error.getName().rfind('.') + 1);
  if (name == "ServiceUnknown" || name == "NameHasNoOwner") {
    return {name, "The account daemon does not run and could not be started. `palisade doctor` says what is missing."};
  }
  if (error.getName().find(".Spawn.") != std::string::npos || error.getName().find("systemd1") != std::string::npos) {
    return {name, "The account daemon ended when it was started. `journalctl --user -u accountd` says why."};
  }
  if (name == "NoReply" || name == "Timeout" || name == "TimedOut")
    return {name, "The account daemon did not answer in time. `palisade doctor` says what it waits for."};
  return {name, (error.getMessage().empty() ? error.getName() : error.getMessage()) + std::string(nextStepAfter(name))};
}

template <typename Call>
auto checked(const Call& call) {
  try {
    return call();
  } catch (const sdbus::Error& error) {
    throw failureOf(error);
  }
}

// The daemon hands a token over in a pipe that it has filled and closed, so reading does not wait.
std::string contentOf(const sdbus::UnixFd& pipe) {
  std::string content;
  char buffer[4096];
  ssize_t length = 0;
  while ((length = read(pipe.get(), buffer, sizeof buffer)) > 0) content.append(buffer, static_cast<std::size_t>(length));
  if (length < 0) throw CallFailed("Failed", "The token could not be read from the pipe that the account daemon handed over.");
  return content;
}

std::string randomToken() {
  std::random_device random;
  return "palisade" + std::to_string(random()) + "_" + std::to_string(random());
}

std::string pathElement(std::string uniqueName) {
  std::erase(uniqueName, ':');
  for (char& character : uniqueName) {
    if (character == '.') character = '_';
  }
  return uniqueName;
}

class Manager final : public sdbus::ProxyInterfaces<com::veltran::Accounts1::Manager_proxy> {
 public:
  explicit Manager(sdbus::IConnection& connection) : ProxyInterfaces(connection, busName, objectPath) { registerProxy(); }
  ~Manager() { unregisterProxy(); }

 private:
  void onAccountsChanged(const std::string&) override {}
  void onGrantsChanged(const std::string&, const std::string&) override {}
};

}  // namespace

class AccountsClient::Bus {
 public:
  Bus() : _connection(sdbus::createSessionBusConnection()), _manager(*_connection) { _connection->enterEventLoopAsync(); }
  ~Bus() { _connection->leaveEventLoop(); }

  Manager& manager() { return _manager; }

  bool hasOwner(const std::string& name) {
    bool isOwned = false;
    bus()->callMethod("NameHasOwner").onInterface("org.freedesktop.DBus").withArguments(name).storeResultsTo(isOwned);
    return isOwned;
  }

  std::vector<std::string> startableNames() {
    std::vector<std::string> names;
    bus()->callMethod("ListActivatableNames").onInterface("org.freedesktop.DBus").storeResultsTo(names);
    return names;
  }
  sdbus::IConnection& connection() { return *_connection; }

  // Calls with a handle token, and waits for the Response signal if the request has to wait for somebody. The subscription
  // stands before the call, so an answer that comes at once is not missed.
  template <typename Call>
  AccessAnswer ask(const Call& call, const std::function<void()>& whenPending) {
    const std::string token = randomToken();
    const std::string path = std::string(objectPath) + "/request/" + pathElement(_connection->getUniqueName()) + "/" + token;
    std::mutex mutex;
    std::condition_variable hasAnswer;
    std::optional<AccessAnswer> answer;

    const auto request = sdbus::createProxy(*_connection, busName, path);
    request->uponSignal("Response").onInterface(requestInterface).call([&](std::uint32_t response, const Dictionary& results) {
      const std::lock_guard lock(mutex);
      answer = AccessAnswer{static_cast<AccessAnswer::Response>(response), results};
      hasAnswer.notify_one();
    });
    request->finishRegistration();

    const auto [requestPath, response, results] = call(BusDictionary{{"handle_token", token}});
    const auto first = static_cast<AccessAnswer::Response>(response);
    if (first != AccessAnswer::Response::pending) return {first, results};
    whenPending();
    std::unique_lock lock(mutex);
    while (!hasAnswer.wait_for(lock, std::chrono::seconds(1), [&] { return answer.has_value(); })) {
      // Without the daemon the signal will never come. The bus is asked without the lock, for which the signal may be waiting.
      lock.unlock();
      if (!hasOwner(busName)) {
        throw CallFailed("NoReply", "The account daemon ended before the request was answered. Nothing was granted.");
      }
      lock.lock();
    }
    return *answer;
  }

 private:
  std::unique_ptr<sdbus::IProxy> bus() {
    return sdbus::createProxy(*_connection, "org.freedesktop.DBus", "/org/freedesktop/DBus");
  }

  std::unique_ptr<sdbus::IConnection> _connection;
  Manager _manager;
};

AccountsClient::AccountsClient() {
  try {
    _bus = std::make_unique<Bus>();
  } catch (const sdbus::Error&) {
    throw CallFailed("NoSessionBus", "There is no session bus. Log in to a session, or try `dbus-run-session -- sh`.");
  }
}

AccountsClient::~AccountsClient() = default;

AccessAnswer AccountsClient::requestAccess(const std::string& accountType, const Dictionary& accessOptions,
                                           const std::function<void()>& whenPending) {
  return checked([&] {
    return _bus->ask(
        [&](const BusDictionary& options) {
          return _bus->manager().RequestAccess(accountType, dictionaryToBus(accessOptions), options);
        },
        whenPending);
  });
}

AccessAnswer AccountsClient::authorize(const std::string& accountType, const std::string& client,
                                       const std::function<void()>& whenPending) {
  return checked([&] {
    return _bus->ask([&](const BusDictionary& options) { return _bus->manager().Authorize(accountType, client, options); },
                     whenPending);
  });
}

std::string AccountsClient::credential(const std::string& accountType) {
  return contentOf(checked([&] { return _bus->manager().GetCredentialDescriptor(accountType, {}); }));
}

Rows AccountsClient::listAccounts(const std::string& accountType) {
  return checked([&] { return _bus->manager().ListAccounts(accountType, {}); });
}

std::string AccountsClient::addAccount(const std::string& accountType, const std::string& username, const std::string& token) {
  constexpr std::size_t pipeCapacity = 64 * 1024;
  if (token.size() > pipeCapacity) throw CallFailed("InvalidArguments", "The token is longer than 64 KiB.");
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) throw CallFailed("Failed", "No pipe could be made for the token.");
  const sdbus::UnixFd reader(ends[0], sdbus::adopt_fd);
  {
    const sdbus::UnixFd writer(ends[1], sdbus::adopt_fd);
    if (write(writer.get(), token.data(), token.size()) != static_cast<ssize_t>(token.size())) {
      throw CallFailed("Failed", "The token could not be handed over.");
    }
  }
  return checked([&] { return _bus->manager().AddAccount(accountType, username, reader, {}); });
}

void AccountsClient::removeAccount(const std::string& id) {
  checked([&] { _bus->manager().RemoveAccount(id, {}); });
}

Rows AccountsClient::listGrants(const std::string& accountType) {
  return checked([&] { return _bus->manager().ListGrants(accountType, {}); });
}

void AccountsClient::revoke(const std::string& accountType, const std::string& client) {
  checked([&] { _bus->manager().Revoke(accountType, client, {}); });
}

void AccountsClient::revokeAll(const std::string& accountType) {
  checked([&] { _bus->manager().RevokeAll(accountType, {}); });
}

Rows AccountsClient::history(std::uint32_t limit, const std::optional<std::string>& client) {
  BusDictionary options{{"limit", limit}};
  if (client) options.emplace("client", *client);
  return checked([&] { return _bus->manager().History(options); });
}

Rows AccountsClient::listRevocations() {
  return checked([&] { return _bus->manager().ListRevocations({}); });
}

Rows AccountsClient::listClients() {
  return checked([&] { return _bus->manager().ListClients({}); });
}

std::optional<Value> AccountsClient::preference(const std::string& domain, const std::string& key) {
  const Dictionary found = checked([&] { return _bus->manager().GetPreference(domain, key, {}); });
  const Value* value = found.find("value");
  return value == nullptr ? std::nullopt : std::optional(*value);
}

void AccountsClient::setPreference(const std::string& domain, const std::string& key, const std::optional<Value>& value) {
  checked([&] { _bus->manager().SetPreference(domain, key, value ? dictionaryToBus({{"value", *value}}) : BusDictionary()); });
}

Dictionary AccountsClient::status() {
  return checked([&] { return _bus->manager().GetStatus({}); });
}

ServiceState AccountsClient::serviceState(const std::string& name) {
  return checked([&] {
    if (_bus->hasOwner(name)) return ServiceState::runs;
    const auto names = _bus->startableNames();
    return std::ranges::find(names, name) == names.end() ? ServiceState::unknown : ServiceState::canBeStarted;
  });
}

void AccountsClient::notify(const std::string& name) {
  checked([&] {
    const auto object = sdbus::createObject(_bus->connection(), "/com/veltran/Notify1");
    auto signal = object->createSignal("com.veltran.Notify1", "Posted");
    signal << name;
    object->emitSignal(signal);
    // The daemon asks the bus who has posted, which has to be there still. It answers in order, so that it knows by this
    // answer.
    if (_bus->hasOwner(busName)) _bus->manager().ListGrants("nothing", {});
  });
}

}  // namespace palisade
