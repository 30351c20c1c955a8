#pragma once

/// A platform whose services hardly allocate, so that nearly all allocations of an operation are the plug-in's own.
///
/// The server answers on a thread of its own, either before `performRequestWithHandler` returns or when `deliverHeldAnswer` is
/// called; its handlers run with `CountedAllocations`, and what leaves one is remembered. Threads: used by one thread at a
/// time. Ownership: lives as long as the process, because the plug-in keeps a queue and a registration.

#include <list>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "Host/Json/Json.h"
#include "Platform/Account.h"
#include "Platform/AccountAccessPlugin.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountCredential.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Client.h"
#include "Platform/KeychainManager.h"
#include "Platform/Log.h"
#include "Platform/NotificationBus.h"
#include "Platform/PreferencesStore.h"
#include "Platform/SerialQueue.h"
#include "Platform/SocialFramework.h"
#include "Platform/StringTable.h"
#include "Platform/SystemAlert.h"
#include "Tests/Unit/Memory/FailingAllocations.h"

namespace palisade {

class FrugalClient final : public Client {
 public:
  bool hasAllAccess = false;
  bool hasDefaultAccess = false;
  bool hasBundleID = true;

  std::optional<std::string> bundleID() const override {
    return hasBundleID ? std::optional<std::string>("org.example.a-long-bundle-id") : std::nullopt;
  }
  std::string localizedAppName() const override { return "An application with a long name"; }
  bool hasEntitlement(std::string_view entitlement) const override {
    return entitlement == AllAccountsAccessEntitlement ? hasAllAccess : hasDefaultAccess;
  }
  std::string description() const override { return "a client with a long description"; }
};

class FrugalAccount final : public Account {
 public:
  std::string description() const override { return "me"; }
  void setAccountType(std::shared_ptr<const AccountType>) override {}
  std::shared_ptr<const AccountCredential> credential() const override { return _credential; }
  void setCredential(std::shared_ptr<const AccountCredential> credential) override { _credential = std::move(credential); }

 private:
  std::shared_ptr<const AccountCredential> _credential;
};

class FrugalStore final : public AccountStore, public AuthorizationManager {
 public:
  std::shared_ptr<Account> account;
  std::optional<ClientAuthorization> record;

  std::vector<std::shared_ptr<Account>> accountsWithAccountTypeIdentifier(std::string_view) override {
    if (account == nullptr) return {};
    return {account};
  }
  AuthorizationManager& authorizationManager() override { return *this; }

  std::shared_ptr<ClientAuthorization> authorizationForClient(const std::shared_ptr<const Client>&,
                                                              const AccountType&) override {
    return record ? std::make_shared<ClientAuthorization>(*record) : nullptr;
  }
  std::vector<std::shared_ptr<ClientAuthorization>> allAuthorizationsForAccountType(const AccountType&) override {
    if (!record) return {};
    return {std::make_shared<ClientAuthorization>(*record)};
  }
  std::optional<Error> setAuthorization(const ClientAuthorization& authorization, const std::shared_ptr<const Client>&,
                                        const AccountType&) override {
    record = authorization;
    return std::nullopt;
  }
  std::optional<Error> removeAllClientAuthorizationsForAccountType(const AccountType&) override {
    record.reset();
    return std::nullopt;
  }
};

class FrugalPlatform final : Log,
                             KeychainManager,
                             SocialFramework,
                             SystemAlert,
                             PreferencesStore,
                             NotificationBus,
                             SerialQueueFactory,
                             StringTable,
                             SerialQueue {
 public:
  static FrugalPlatform& create() {
    static auto& platforms = *new std::list<std::unique_ptr<FrugalPlatform>>;
    return *platforms.emplace_back(new FrugalPlatform);
  }

  AlertResponse userAnswers = AlertResponseDefaultButton;
  std::string authorizationBody = R"({"access_token": "a token of some length", "permissions": ["email", "user_likes"]})";
  std::string descriptionBody = R"("see what is going to happen")";
  bool holdsAnswers = false;

  PlatformServices services() {
    return {.log = this,
            .keychain = this,
            .social = this,
            .alert = this,
            .preferences = this,
            .notifications = this,
            .queues = this,
            .json = &_json,
            .strings = this};
  }

  /// Calls the handler that waits, if there is one, and lets go of it.
  void deliverHeldAnswer() {
    if (!_held) return;
    deliver(std::exchange(_held, nullptr), authorizationBody);
  }

  /// Lets go of the handler that waits without calling it.
  void dropHeldAnswer() {
    const CountedAllocations counted;
    _held = nullptr;
  }

  bool aHandlerThrew() const { return _aHandlerThrew; }

 private:
  template <typename Request>
  class FrugalRequest final : public Request {
   public:
    FrugalRequest(FrugalPlatform& platform, const std::string& body) : _platform(platform), _body(body) {}
    void setAccessToken(std::optional<std::string>) override {}
    void performRequestWithHandler(FacebookRequestHandler handler) override {
      if (_platform.holdsAnswers) {
        _platform._held = std::move(handler);
      } else {
        _platform.deliver(std::move(handler), _body);
      }
    }

   private:
    FrugalPlatform& _platform;
    const std::string& _body;
  };

  struct FrugalSession final : FacebookSession {
    void revokeAccessTokenForAppWithID(const std::string&) override {}
  };

  FrugalPlatform() = default;

  // Whoever waits for a thread waits for its end: it is this one that counts, not the one that made it.
  void deliver(FacebookRequestHandler handler, const std::string& body) {
    const UncountedAllocations uncounted;
    std::thread([this, handler = std::move(handler), data = std::optional(body)]() mutable {
      try {
        const CountedAllocations counted;
        handler(std::move(data), HttpResponse{200}, std::nullopt);
      } catch (...) {
        _aHandlerThrew = true;
      }
    }).join();
  }

  bool isEnabled(LogLevel) const override { return true; }
  void write(const LogRecord&) override {}
  void logAccessRequest(const AccessRequestRecord&) override {}

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>&,
                                                                const std::optional<std::string>&) override {
    return _masterCredential;
  }
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>&, const std::optional<std::string>&) override {
    return std::nullopt;
  }
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>&, const std::optional<std::string>&) override {
    return std::nullopt;
  }

  std::shared_ptr<FacebookSession> makeFacebookSession() override { return std::make_shared<FrugalSession>(); }
  std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(const std::string&, const std::string&,
                                                                                 PermissionSetRef,
                                                                                 const std::optional<std::string>&) override {
    return std::make_shared<FrugalRequest<FacebookAuthorizationRequest>>(*this, authorizationBody);
  }
  std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef, const std::optional<std::string>&) override {
    return std::make_shared<FrugalRequest<FacebookPermissionDescriptionRequest>>(*this, descriptionBody);
  }

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator, double, unsigned, int*, const AlertDescription&) override {
    return std::make_shared<AlertHandle>();
  }
  int receiveResponse(const std::shared_ptr<AlertHandle>&, double, AlertResponse& response) override {
    response = userAnswers;
    return 0;
  }
  void releaseAlert(std::shared_ptr<AlertHandle>) override {}

  std::optional<Value> copyValue(std::string_view, std::string_view, PreferencesUser, PreferencesHost) override {
    return std::nullopt;
  }
  void synchronize(std::string_view) override {}

  std::shared_ptr<NotificationRegistration> registerHandler(std::string_view, std::shared_ptr<SerialQueue>,
                                                            std::function<void()>) override {
    return std::make_shared<NotificationRegistration>();
  }

  // The one queue is the platform itself, which never goes away.
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view) override {
    return {std::shared_ptr<void>(), static_cast<SerialQueue*>(this)};
  }
  const std::string& label() const override { return _label; }
  void async(std::function<void()> work) override { work(); }
  void sync(const std::function<void()>& work) override { work(); }

  std::string localizedString(std::string_view, std::string_view, std::string_view) const override {
    return "a text with places for %@ and %@ and %@";
  }

  NlohmannJsonParser _json;
  const std::string _label = "queue";
  const std::shared_ptr<const AccountCredential> _masterCredential =
      std::make_shared<const AccountCredential>("the account's own token", "", distantFuture);
  FacebookRequestHandler _held;
  bool _aHandlerThrew = false;
};

}  // namespace palisade
