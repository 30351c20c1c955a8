#include "Benchmarks/InMemoryServices.h"

#include <algorithm>
#include <unordered_map>
#include <utility>
#include <vector>

#include "Platform/Account.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/JsonParser.h"
#include "Platform/KeychainManager.h"
#include "Platform/Log.h"
#include "Platform/NotificationBus.h"
#include "Platform/PreferencesStore.h"
#include "Platform/SocialFramework.h"
#include "Platform/StringTable.h"

namespace palisade {
namespace {

struct PlainClient final : Client {
  std::optional<std::string> bundleID() const override { return "org.example.photos"; }
  std::string localizedAppName() const override { return "Photos"; }
  bool hasEntitlement(std::string_view) const override { return false; }
  std::string description() const override { return "org.example.photos"; }
};

class PlainAccount final : public Account {
 public:
  std::string description() const override { return "me"; }
  void setAccountType(std::shared_ptr<const AccountType> accountType) override { _accountType = std::move(accountType); }
  std::shared_ptr<const AccountCredential> credential() const override { return _credential; }
  void setCredential(std::shared_ptr<const AccountCredential> credential) override { _credential = std::move(credential); }

 private:
  std::shared_ptr<const AccountType> _accountType;
  std::shared_ptr<const AccountCredential> _credential;
};

class OneRecord final : public AuthorizationManager {
 public:
  explicit OneRecord(std::shared_ptr<const ClientAuthorization> record) : _record(std::move(record)) {}

  std::shared_ptr<ClientAuthorization> authorizationForClient(const std::shared_ptr<const Client>&,
                                                              const AccountType&) override {
    return _record == nullptr ? nullptr : std::make_shared<ClientAuthorization>(*_record);
  }
  std::vector<std::shared_ptr<ClientAuthorization>> allAuthorizationsForAccountType(const AccountType&) override { return {}; }
  std::optional<Error> setAuthorization(const ClientAuthorization&, const std::shared_ptr<const Client>&,
                                        const AccountType&) override {
    return std::nullopt;
  }
  std::optional<Error> removeAllClientAuthorizationsForAccountType(const AccountType&) override { return std::nullopt; }

 private:
  std::shared_ptr<const ClientAuthorization> _record;
};

class OneAccount final : public AccountStore {
 public:
  explicit OneAccount(std::shared_ptr<const ClientAuthorization> record) : _authorizations(std::move(record)) {}

  std::vector<std::shared_ptr<Account>> accountsWithAccountTypeIdentifier(std::string_view) override {
    return {std::make_shared<PlainAccount>()};
  }
  AuthorizationManager& authorizationManager() override { return _authorizations; }

 private:
  OneRecord _authorizations;
};

struct QuietLog final : Log {
  bool isEnabled(LogLevel level) const override { return level != LogLevel::debug; }
  void write(const LogRecord&) override {}
  void logAccessRequest(const AccessRequestRecord&) override {}
};

class OneCredential final : public KeychainManager {
 public:
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

 private:
  std::shared_ptr<const AccountCredential> _masterCredential =
      std::make_shared<const AccountCredential>("master token", "", distantFuture);
};

template <typename Request>
class AnsweredRequest final : public Request {
 public:
  explicit AnsweredRequest(const char* body) : _body(body) {}

  void setAccessToken(std::optional<std::string>) override {}
  void performRequestWithHandler(FacebookRequestHandler handler) override { handler(_body, HttpResponse{200}, std::nullopt); }

 private:
  const char* _body;
};

struct IdleSession final : FacebookSession {
  void revokeAccessTokenForAppWithID(const std::string&) override {}
};

struct AnsweringServer final : SocialFramework {
  std::shared_ptr<FacebookSession> makeFacebookSession() override { return std::make_shared<IdleSession>(); }
  std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(const std::string&, const std::string&,
                                                                                 PermissionSetRef,
                                                                                 const std::optional<std::string>&) override {
    return std::make_shared<AnsweredRequest<FacebookAuthorizationRequest>>("{}");
  }
  std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef, const std::optional<std::string>&) override {
    return std::make_shared<AnsweredRequest<FacebookPermissionDescriptionRequest>>("\"\"");
  }
};

// The server's answers, parsed in advance: an object is a token, a string a description.
class ReadyParser final : public JsonParser {
 public:
  JsonParseResult parse(std::string_view data, JsonFragments) const override {
    return {.value = data.starts_with('{') ? _token : _description, .error = std::nullopt};
  }

 private:
  Value _token = Dictionary{{"access_token", "client token"}, {"permissions", Array{"email", "user_likes"}}};
  Value _description = "Read what you have bookmarked.";
};

class ReadyUser final : public SystemAlert {
 public:
  std::shared_ptr<AlertHandle> createAlert(AlertAllocator, double, unsigned, int*, const AlertDescription&) override {
    return _handle;
  }
  int receiveResponse(const std::shared_ptr<AlertHandle>&, double, AlertResponse& response) override {
    response = answer;
    return 0;
  }
  void releaseAlert(std::shared_ptr<AlertHandle>) override {}

  AlertResponse answer = 1;

 private:
  std::shared_ptr<AlertHandle> _handle = std::make_shared<AlertHandle>();
};

struct NoPreferences final : PreferencesStore {
  std::optional<Value> copyValue(std::string_view, std::string_view, PreferencesUser, PreferencesHost) override {
    return std::nullopt;
  }
  void synchronize(std::string_view) override {}
};

struct SilentBus final : NotificationBus {
  std::shared_ptr<NotificationRegistration> registerHandler(std::string_view, std::shared_ptr<SerialQueue>,
                                                            std::function<void()>) override {
    return std::make_shared<NotificationRegistration>();
  }
};

class InlineQueue final : public SerialQueue {
 public:
  explicit InlineQueue(std::string_view label) : _label(label) {}

  const std::string& label() const override { return _label; }
  void async(std::function<void()> work) override { work(); }
  void sync(const std::function<void()>& work) override { work(); }

 private:
  std::string _label;
};

struct InlineQueues final : SerialQueueFactory {
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label) override { return std::make_shared<InlineQueue>(label); }
};

// Texts of the lengths that English has. A name is as long as its key's last part.
class ReadyTexts final : public StringTable {
 public:
  std::string localizedString(std::string_view key, std::string_view, std::string_view) const override {
    const auto found = _texts.find(key);
    if (found != _texts.end()) return found->second;
    constexpr std::string_view namePrefix = "FACEBOOK_READ_PERMISSION_";
    return std::string(key.substr(std::min(key.size(), namePrefix.size())));
  }

 private:
  std::unordered_map<std::string_view, std::string> _texts{
      {"ACCOUNT_ACCESS_REQUEST_TITLE", "Allow Access to Your Facebook Account?"},
      {"ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE", "Allow"},
      {"ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE", "Don’t Allow"},
      {"ACCOUNT_ACCESS_BASIC_MESSAGE", "“%@” would like to use your Facebook account."},
      {"ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT", "“%@” would like to %@ on Facebook."},
      {"ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", "“%@” would like to use your Facebook account to %@."},
      {"ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT", "“%@” would like to use your Facebook account to %@, and to %@."},
      {"ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT", "“%@” would like to use your Facebook account to %@, to %@, and to %@."},
      {"ACCOUNT_ACCESS_UNKNOWN_FORMAT", "“%@” would like to use your Facebook account for the following: “%@”."},
      {"ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", "The app also asks for the following, in Facebook’s words: “%@”."},
      {"ACCOUNT_ACCESS_EXTENDED_READ", "see %@"},
      {"ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE", "see %@ as well as %@"},
      {"ACCOUNT_ACCESS_EXTENDED_READ_USER", "your %@"},
      {"ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE", "your %@ and %@"},
      {"ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", "your friends’ %@"},
      {"ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS_MULTIPLE", "your friends’ %@ and %@"},
      {"ACCCOUNT_ACCESS_WRITE", "publish posts in your name %@"},
      {"ACCOUNT_ACCESS_MANAGE", "manage your %@"},
      {"ACCOUNT_ACCESS_MANAGE_MULTIPLE", "manage your %@ and %@"},
      {"WORD_LIST_SEPARATOR", ", "},
      {"POST_PUBLICALLY", "so that everyone can see them"},
  };
};

}  // namespace

struct InMemoryServices::Services {
  QuietLog log;
  OneCredential keychain;
  AnsweringServer social;
  ReadyUser alert;
  NoPreferences preferences;
  SilentBus notifications;
  InlineQueues queues;
  ReadyParser json;
  ReadyTexts strings;
};

InMemoryServices::InMemoryServices() : _services(std::make_unique<Services>()) {}
InMemoryServices::~InMemoryServices() = default;

PlatformServices InMemoryServices::services() {
  return {.log = &_services->log,
          .keychain = &_services->keychain,
          .social = &_services->social,
          .alert = &_services->alert,
          .preferences = &_services->preferences,
          .notifications = &_services->notifications,
          .queues = &_services->queues,
          .json = &_services->json,
          .strings = &_services->strings};
}

std::shared_ptr<AccountStore> InMemoryServices::makeStore(std::shared_ptr<const ClientAuthorization> record) const {
  return std::make_shared<OneAccount>(std::move(record));
}

std::shared_ptr<const Client> InMemoryServices::makeClient() const { return std::make_shared<PlainClient>(); }

std::shared_ptr<Account> InMemoryServices::makeAccount() const { return std::make_shared<PlainAccount>(); }

void InMemoryServices::answerAlertsWith(AlertResponse response) { _services->alert.answer = response; }

}  // namespace palisade
