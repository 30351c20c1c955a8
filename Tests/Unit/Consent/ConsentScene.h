#pragma once

/// A scene (see `Scene`) whose texts show their keys, with short ways to the operations behind the consent message and the
/// server's token. Operations that wait for the server run as the daemon runs them.

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "Tests/Unit/Consent/ShownTexts.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {

/// One call of a `ServerAuthorizationCompletion`.
struct ServerAuthorization {
  bool granted = false;
  std::optional<Array> permissions;
  std::optional<Error> error;
  std::string thread;
};

inline void PrintTo(const ServerAuthorization& answer, std::ostream* stream) {
  *stream << (answer.granted ? "granted " : "refused ")
          << (answer.permissions ? compactJson(Value(*answer.permissions)) : "no permissions") << ", "
          << (answer.error ? describe(*answer.error) : "no error") << " on the " << answer.thread << " thread";
}

inline auto isServerGrant(std::optional<Array> permissions) {
  return ::testing::FieldsAre(true, std::move(permissions), ::testing::Eq(std::nullopt), ::testing::_);
}
inline auto isServerRefusal(std::optional<Error> error) {
  return ::testing::FieldsAre(false, ::testing::Eq(std::nullopt), std::move(error), ::testing::_);
}

class ConsentScene : public Scene {
 public:
  explicit ConsentScene(FakeClientData clientData = photosClient(),
                        std::shared_ptr<const StringTable> texts = std::make_shared<const ShownTexts>())
      : Scene(std::move(clientData), FakePlatform::create(std::make_shared<const NlohmannJsonParser>(), std::move(texts))),
        account(makeAccount()) {}

  const std::shared_ptr<Account> account;

  /// What the server says when it is asked to describe permissions, from now on.
  void serverDescribes(std::string json) { platform.social.descriptionAnswers = {{.data = std::move(json)}}; }

  /// The server's answers to requests for a token, from now on.
  void serverAnswers(ServerAnswer answer) { platform.social.authorizationAnswers = {std::move(answer)}; }

  std::optional<std::string> message(const PermissionSet& permissions,
                                     const std::optional<std::string>& audience = std::nullopt,
                                     const std::string& appName = "Photos") {
    return waited([&] { return plugin->_constructUserMessageForPermissions(permissions, audience, appName, account); });
  }

  std::optional<std::string> fetchDescription(PermissionSetRef permissions,
                                              const std::optional<std::string>& audience = std::nullopt) {
    return waited([&] { return plugin->_fetchDescriptionForUnknownPermissions(permissions, audience, account); });
  }

  std::optional<std::string> appendDescription(const std::optional<std::string>& toMessage,
                                               const std::string& appName = "Photos") {
    return waited([&] {
      return plugin->_appendDescriptionOfUnknownPermissions(permissionSet({"new_thing"}), toMessage, appName, std::nullopt,
                                                            account);
    });
  }

  /// Asks the server for a token; answers every call of the completion.
  std::vector<ServerAuthorization> askServer(PermissionSetRef permissions = permissionSet({"email"}),
                                             std::optional<std::string> audience = std::nullopt) {
    const auto calls = std::make_shared<std::vector<ServerAuthorization>>();
    const OperationEnd end = platform.run([&, calls] {
      plugin->_getServerAuthorizationForClient(client, photosAppID, permissions, audience, account, remembering(calls));
    });
    EXPECT_EQ(end, OperationEnd::returned);
    return *calls;
  }

  /// A completion that keeps its calls and shows in the trace as `answered`.
  ServerAuthorizationCompletion remembering(std::shared_ptr<std::vector<ServerAuthorization>> calls) {
    return [this, calls = std::move(calls)](bool granted, const std::optional<Array>& permissions,
                                            const std::optional<Error>& error) {
      platform.trace.record("answered");
      calls->push_back({.granted = granted,
                        .permissions = permissions,
                        .error = error,
                        .thread = std::string(nameOf(currentThreadLabel()))});
    };
  }

 private:
  template <typename Operation>
  std::optional<std::string> waited(const Operation& operation) {
    std::optional<std::string> result;
    EXPECT_EQ(platform.run([&] { result = operation(); }), OperationEnd::returned);
    return result;
  }
};

/// What the server says when it issues a token.
inline ServerAnswer serverIssues(std::string token, std::string permissions) {
  return {.data = R"({"access_token": ")" + token + R"(", "permissions": )" + permissions + "}"};
}

/// The members of every event of one name, or their one member.
inline std::vector<Value> members(const Trace& trace, std::string_view event, std::string_view member) {
  std::vector<Value> values;
  for (const Event& each : trace.named(event)) values.push_back(each[member]);
  return values;
}

}  // namespace palisade
