#include "Host/Bus/BusServer.h"

#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <functional>
#include <map>
#include <mutex>
#include <utility>
#include <vector>

#include "DBus/Accounts1Adaptor.h"
#include "Host/Bus/BusLoop.h"
#include "Host/Bus/BusNotifications.h"
#include "Host/Bus/CallerApplications.h"
#include "Host/Bus/CallerDescriptions.h"
#include "Host/Bus/RequestBounds.h"
#include "Host/Bus/RequestObjects.h"
#include "Host/Bus/SignalSender.h"
#include "Host/Bus/TokenPipe.h"
#include "Host/Bus/WaitingCalls.h"
#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

constexpr const char* busName = "com.veltran.Accounts1";
constexpr const char* objectPath = "/com/veltran/Accounts1";

using BusRows = std::vector<BusDictionary>;

BusRows rowsToBus(const Rows& rows) {
  BusRows converted;
  converted.reserve(rows.size());
  for (const Dictionary& row : rows) converted.push_back(dictionaryToBus(shortenedRow(row)));
  return converted;
}

void refuseUnknownOptions(const Dictionary& options, std::initializer_list<std::string_view> known) {
  for (const auto& [key, value] : options) {
    if (std::find(known.begin(), known.end(), key) == known.end()) {
      throw BusFailure(BusFailureKind::invalidArguments, "There is no option '" + shortened(key, 64) + "'.");
    }
  }
}

std::optional<std::string> textOption(const Dictionary& options, std::string_view key) {
  const Value* option = options.find(key);
  if (option == nullptr) return std::nullopt;
  if (option->string() == nullptr) {
    throw BusFailure(BusFailureKind::invalidArguments, "The option '" + std::string(key) + "' must be a string.");
  }
  return *option->string();
}

std::optional<std::uint32_t> numberOption(const Dictionary& options, std::string_view key) {
  const Value* option = options.find(key);
  if (option == nullptr) return std::nullopt;
  if (option->integer() == nullptr || !std::in_range<std::uint32_t>(*option->integer())) {
    throw BusFailure(BusFailureKind::invalidArguments,
                     "The option '" + std::string(key) + "' must be a whole number from 0 to 4294967295.");
  }
  return static_cast<std::uint32_t>(*option->integer());
}

// The library has refused a reply: it is too large, say.
BusFailure unsendable(const sdbus::Error& refusal) {
  return {BusFailureKind::failed, "The answer cannot be sent over the bus: " + refusal.getMessage()};
}

// Carries out `work` and sends what it returns, or the failure that it throws. Says what was told the caller in place of a
// reply that could not be sent.
template <typename Result, typename Work>
std::optional<BusFailure> answer(const Result& result, const Work& work) {
  try {
    if constexpr (std::is_void_v<decltype(work())>) {
      work();
      result.returnResults();
    } else {
      result.returnResults(work());
    }
  } catch (const BusFailure& failure) {
    result.returnError(busError(failure));
  } catch (const sdbus::Error& failure) {
    const BusFailure refusal = unsendable(failure);
    result.returnError(busError(refusal));
    return refusal;
  } catch (const std::exception& failure) {
    result.returnError(busError({BusFailureKind::failed, failure.what()}));
  }
  return std::nullopt;
}

// A base of its own, so that the connection is made before the object that is served on it, and goes away after it.
struct OwnedConnection {
  std::unique_ptr<sdbus::IConnection> _connection = sdbus::createSessionBusConnection();
};

}  // namespace

class BusServer::Implementation final : private OwnedConnection,
                                        public sdbus::AdaptorInterfaces<com::veltran::Accounts1::Manager_adaptor> {
 public:
  Implementation(AccountsService& service, std::function<void(const std::string&)> onTrouble)
      : AdaptorInterfaces(*_connection, objectPath),
        _service(service),
        _onTrouble(std::move(onTrouble)),
        _loop(*_connection, _onTrouble),
        _notifications(*_connection, [this](const std::string& poster, auto post) { ifMayPost(poster, std::move(post)); }),
        _requests(*_connection, [this](std::uint64_t identifier) { _service.close(identifier); }),
        _described(addressOfBus(*_connection)) {
    _connection->addMatch(
        "type='signal',sender='org.freedesktop.DBus',interface='org.freedesktop.DBus',member='NameOwnerChanged',arg2=''",
        [this](sdbus::Message& message) { nameVanished(message); }, sdbus::floating_slot);
    _connection->addMatch(
        "type='signal',sender='org.freedesktop.DBus',interface='org.freedesktop.DBus',member='NameOwnerChanged',arg1=''",
        [this](sdbus::Message& message) { nameAppeared(message); }, sdbus::floating_slot);
    // Whatever is not announced from now on was there before.
    _described.begin();
    registerAdaptor();
    ownName();
  }

  ~Implementation() { unregisterAdaptor(); }

  /// Sent when the call that brought it has been answered: whoever asked waits for that, and nobody for a signal.
  void sendAfterAnswer(std::function<void()> send) {
    const std::lock_guard lock(_mutex);
    _waitingSignals.push_back(std::move(send));
  }

  BusLoop& loop() { return _loop; }
  BusNotifications& notifications() { return _notifications; }

  void start(const std::string& name) {
    constexpr std::uint32_t noFlags = 0;
    try {
      sdbus::createProxy(*_connection, "org.freedesktop.DBus", "/org/freedesktop/DBus")
          ->callMethod("StartServiceByName")
          .onInterface("org.freedesktop.DBus")
          .withArguments(name, noFlags)
          .dontExpectReply();
      _loop.wake();
    } catch (const sdbus::Error&) {
      // Whoever can start it otherwise will; what it is to do waits in a file.
    }
  }

 private:
  using Refuse = CallerApplications::Refuse;

  void RequestAccess(AccessResult&& result, std::string accountType, Dictionary accessOptions, Dictionary options) override {
    checked([&] {
      requireName("account_type", accountType);
      requireBoundedAccessOptions(accessOptions);
    });
    startRequest(std::move(result), options,
                 [this, accountType = std::move(accountType),
                  accessOptions = std::make_shared<const Dictionary>(std::move(accessOptions))](const BusCaller& caller,
                                                                                                PendingRequest& request) {
                   return _service.requestAccess(caller, accountType, accessOptions, request);
                 });
  }

  void Authorize(AccessResult&& result, std::string accountType, std::string client, Dictionary options) override {
    requireGrant(accountType, client);
    startRequest(std::move(result), options, [this, accountType, client](const BusCaller& caller, PendingRequest& request) {
      return _service.authorize(caller, accountType, client, request);
    });
  }

  void GetCredentialDescriptor(sdbus::Result<sdbus::UnixFd>&& result, std::string accountType, Dictionary options) override {
    requireArgument("account_type", accountType);
    start(std::move(result), options, {},
          [this, accountType](const BusCaller& caller) { return pipeHolding(_service.credential(caller, accountType)); });
  }

  void ListAccounts(sdbus::Result<BusRows>&& result, std::string accountType, Dictionary options) override {
    requireArgument("account_type", accountType);
    start(std::move(result), options, {},
          [this, accountType](const BusCaller& caller) { return rowsToBus(_service.listAccounts(caller, accountType)); });
  }

  void AddAccount(sdbus::Result<std::string>&& result, std::string accountType, std::string username, sdbus::UnixFd token,
                  Dictionary options) override {
    requireArgument("account_type", accountType);
    requireArgument("username", username);
    // A call that waits keeps its descriptor, so those that are too many are refused before any of them waits.
    std::shared_ptr<const void> admission;
    checked([&] { admission = _service.admitToken(*callerOfThisMessage()); });
    // A copy of the descriptor would be another one.
    const auto pipe = std::make_shared<const sdbus::UnixFd>(std::move(token));
    startOnReader(std::move(result), options, [this, accountType, username, pipe, admission](const BusCaller& caller) {
      return _service.addAccount(caller, accountType, username, [&pipe] { return readToEnd(*pipe); });
    });
  }

  void RemoveAccount(sdbus::Result<>&& result, std::string id, Dictionary options) override {
    requireArgument("id", id);
    start(std::move(result), options, {}, [this, id](const BusCaller& caller) { _service.removeAccount(caller, id); });
  }

  void ListGrants(sdbus::Result<BusRows>&& result, std::string accountType, Dictionary options) override {
    requireArgument("account_type", accountType);
    start(std::move(result), options, {},
          [this, accountType](const BusCaller& caller) { return rowsToBus(_service.listGrants(caller, accountType)); });
  }

  void Revoke(sdbus::Result<>&& result, std::string accountType, std::string client, Dictionary options) override {
    requireGrant(accountType, client);
    start(std::move(result), options, {},
          [this, accountType, client](const BusCaller& caller) { _service.revoke(caller, accountType, client); });
  }

  void RevokeAll(sdbus::Result<>&& result, std::string accountType, Dictionary options) override {
    requireArgument("account_type", accountType);
    start(std::move(result), options, {},
          [this, accountType](const BusCaller& caller) { _service.revokeAll(caller, accountType); });
  }

  void History(sdbus::Result<BusRows>&& result, Dictionary options) override {
    checked([&] { requireClientID("client", textOption(options, "client").value_or("")); });
    start(std::move(result), options, {"limit", "client"}, [this, options](const BusCaller& caller) {
      return rowsToBus(_service.history(caller, numberOption(options, "limit").value_or(100), textOption(options, "client")));
    });
  }

  void ListRevocations(sdbus::Result<BusRows>&& result, Dictionary options) override {
    start(std::move(result), options, {},
          [this](const BusCaller& caller) { return rowsToBus(_service.listRevocations(caller)); });
  }

  void ListClients(sdbus::Result<BusRows>&& result, Dictionary options) override {
    start(std::move(result), options, {}, [this](const BusCaller& caller) { return rowsToBus(_service.listClients(caller)); });
  }

  void GetPreference(sdbus::Result<BusDictionary>&& result, std::string domain, std::string key, Dictionary options) override {
    requirePreference(domain, key);
    start(std::move(result), options, {}, [this, domain, key](const BusCaller& caller) {
      const auto value = _service.preference(caller, domain, key);
      return value ? dictionaryToBus({{"value", *value}}) : BusDictionary();
    });
  }

  void SetPreference(sdbus::Result<>&& result, std::string domain, std::string key, Dictionary options) override {
    requirePreference(domain, key);
    start(std::move(result), options, {"value"}, [this, domain, key, options](const BusCaller& caller) {
      const Value* value = options.find("value");
      _service.setPreference(caller, domain, key, value == nullptr ? std::nullopt : std::optional(*value));
    });
  }

  void GetStatus(sdbus::Result<BusDictionary>&& result, Dictionary options) override {
    start(std::move(result), options, {},
          [this](const BusCaller& caller) { return dictionaryToBus(shortenedRow(_service.status(caller))); });
  }

  std::uint32_t version() override { return 1; }

  void ownName() {
    try {
      _connection->requestName(busName);
    } catch (const sdbus::Error& error) {
      const bool isOwned = error.getName().find("EXIST") != std::string::npos || error.getName().ends_with("FileExists");
      if (isOwned) throw std::runtime_error("Another account daemon serves this session already.");
      throw std::runtime_error(std::string("The bus name ") + busName + " cannot be owned: " + error.getMessage() + ".");
    }
  }

  // Calls are carried out when their message handler has returned: the library holds its lock while one runs. A handler answers
  // only what is wrong with the message itself.
  //
  // What this begins may wait, so it stands in the line that its application has for this method.
  template <typename Result, typename Work>
  void start(Result&& result, const Dictionary& options, std::initializer_list<std::string_view> known, Work work) {
    const std::string method = getObject().getCurrentlyProcessedMessage()->getMemberName();
    startWhenKnown(std::forward<Result>(result), options, known, std::move(work),
                   [this, method](const std::string& application, const Refuse& refuse, const std::function<void()>& call) {
                     inLine(application + " " + method, refuse, call);
                   });
  }

  // What this begins does not wait, or hands the lead over first.
  template <typename Result, typename Work>
  void startOnReader(Result&& result, const Dictionary& options, Work work) {
    startWhenKnown(std::forward<Result>(result), options, {}, std::move(work),
                   [](const std::string&, const Refuse&, const std::function<void()>& call) { call(); });
  }

  template <typename Result, typename Work, typename Begin>
  void startWhenKnown(Result&& result, const Dictionary& options, std::initializer_list<std::string_view> known, Work work,
                      Begin begin) {
    checked([&] {
      refuseUnknownOptions(options, known);
      const auto reply = std::make_shared<Result>(std::forward<Result>(result));
      const auto caller = callerOfThisMessage();
      const Refuse refuse = [reply](const BusFailure& failure) { reply->returnError(busError(failure)); };
      const auto call = [this, reply, caller, work = std::move(work)] {
        if (const auto refusal = answer(*reply, [&] { return work(*caller); })) _onTrouble(refusal->what());
        sendSignals();
      };
      BusLoop::defer([this, caller, refuse, begin = std::move(begin), call] {
        _applications.whenKnown(
            caller, [refuse, begin, call](const std::string& application) { begin(application, refuse, call); }, refuse);
      });
    });
  }

  template <typename Work>
  void startRequest(AccessResult&& result, const Dictionary& options, Work work) {
    checked([&] {
      refuseUnknownOptions(options, {"handle_token"});
      const auto caller = callerOfThisMessage();
      const auto request =
          std::make_shared<BusRequest>(_requests, caller->uniqueName, textOption(options, "handle_token"), std::move(result));
      BusLoop::defer([this, request, caller, work = std::move(work)] {
        _applications.whenKnown(
            caller,
            [this, request, caller, work](const std::string&) {
              carryOut(*request, [&] { return work(*caller, *request); });
              sendSignals();
            },
            [request](const BusFailure& failure) { request->fail(failure); });
      });
    });
  }

  // Has `call` run in the line, or refused.
  void inLine(const std::string& line, const Refuse& refuse, const std::function<void()>& call) {
    try {
      _calls.run(line, [this, call] {
        try {
          call();
        } catch (const std::exception& failure) {
          _onTrouble(std::string("What a call asked for was cut short: ") + failure.what());
        }
      });
    } catch (const BusFailure& failure) {
      refuse(failure);
    }
  }

  bool isHere(const std::string& uniqueName) {
    const std::lock_guard lock(_mutex);
    return _callers.contains(uniqueName);
  }

  void sendSignals() {
    std::vector<std::function<void()>> waiting;
    {
      const std::lock_guard lock(_mutex);
      waiting.swap(_waitingSignals);
    }
    for (const auto& send : waiting) {
      try {
        send();
      } catch (const sdbus::Error& failure) {
        _onTrouble("A signal could not be sent: " + failure.getMessage());
      }
    }
  }

  static void requireArgument(std::string_view name, std::string_view text) {
    checked([&] { requireName(name, text); });
  }

  static void requireGrant(std::string_view accountType, std::string_view client) {
    requireArgument("account_type", accountType);
    checked([&] { requireClientID("client", client); });
  }

  static void requirePreference(std::string_view domain, std::string_view key) {
    requireArgument("domain", domain);
    requireArgument("key", key);
  }

  template <typename Body>
  static void checked(const Body& body) {
    try {
      body();
    } catch (const BusFailure& failure) {
      throw busError(failure);
    } catch (const std::exception& failure) {
      throw busError({BusFailureKind::failed, failure.what()});
    }
  }

  template <typename Work>
  void carryOut(BusRequest& request, const Work& work) {
    try {
      request.finish(work());
    } catch (const BusFailure& failure) {
      request.fail(failure);
    } catch (const sdbus::Error& failure) {
      const BusFailure refusal = unsendable(failure);
      _onTrouble(refusal.what());
      request.fail(refusal);
    } catch (const std::exception& failure) {
      request.fail({BusFailureKind::failed, failure.what()});
    }
  }

  // Who sent the message that is being handled; the bus is asked more about it when somebody wants to know.
  std::shared_ptr<const BusCaller> callerOfThisMessage() {
    return callerNamed(getObject().getCurrentlyProcessedMessage()->getSender());
  }

  std::shared_ptr<const BusCaller> callerNamed(const std::string& uniqueName) {
    const std::lock_guard lock(_mutex);
    auto& caller = _callers[uniqueName];
    if (caller == nullptr) {
      caller = std::make_shared<const BusCaller>(
          BusCaller{.uniqueName = uniqueName, .describe = [this, uniqueName] { return _described.describe(uniqueName); }});
    }
    return caller;
  }

  void ifMayPost(const std::string& uniqueName, const std::function<void()>& post) {
    const auto caller = callerNamed(uniqueName);
    _applications.whenKnown(
        caller,
        [this, caller, post](const std::string&) {
          if (_service.mayPost(*caller)) post();
        },
        [](const BusFailure&) {});
  }

  void nameVanished(sdbus::Message& message) {
    if (!isFromBus(message)) return;
    std::string name;
    message >> name;
    _described.vanished(name);
    {
      const std::lock_guard lock(_mutex);
      if (_callers.erase(name) == 0) return;
    }
    _service.callerLeft(name);
  }

  void nameAppeared(sdbus::Message& message) {
    if (!isFromBus(message)) return;
    std::string name;
    message >> name;
    _described.appeared(name);
  }

  // Of one application's calls of one method.
  static constexpr std::size_t mostCallsAtOnce = 2;
  static constexpr std::size_t mostCallsInLine = 1000;

  AccountsService& _service;
  const std::function<void(const std::string&)> _onTrouble;
  WaitingCalls _calls{mostCallsAtOnce, mostCallsInLine};
  BusLoop _loop;
  BusNotifications _notifications;
  RequestObjects _requests;
  CallerDescriptions _described;
  CallerApplications _applications{{.service = _service,
                                    .loop = _loop,
                                    .processOf = [this](const std::string& name) { return _described.processOf(name); },
                                    .isHere = [this](const std::string& name) { return isHere(name); }}};
  std::mutex _mutex;
  std::map<std::string, std::shared_ptr<const BusCaller>> _callers;
  std::vector<std::function<void()>> _waitingSignals;
};

BusServer::BusServer(AccountsService& service, std::function<void(const std::string&)> onTrouble)
    : _implementation(std::make_unique<Implementation>(service, std::move(onTrouble))) {}

BusServer::~BusServer() = default;

void BusServer::run() { _implementation->loop().run(); }
void BusServer::stop() { _implementation->loop().stop(); }

NotificationBus& BusServer::notifications() { return _implementation->notifications(); }

void BusServer::start(const std::string& name) { _implementation->start(name); }

void BusServer::emitAccountsChanged(const std::string& accountType) {
  _implementation->sendAfterAnswer([this, type = validText(accountType)] { _implementation->emitAccountsChanged(type); });
}

void BusServer::emitGrantsChanged(const std::string& accountType, const std::string& client) {
  _implementation->sendAfterAnswer(
      [this, type = validText(accountType), name = validText(client)] { _implementation->emitGrantsChanged(type, name); });
}

}  // namespace palisade
