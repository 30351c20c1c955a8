#include "Host/Social/HttpSocialFramework.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <optional>
#include <stdexcept>
#include <thread>
#include <utility>
#include <vector>

#include "Host/Json/Json.h"
#include "Host/Vantad/Outbox.h"
#include "Tests/Host/Social/Sandbox.h"

using namespace palisade;
using namespace std::chrono_literals;
using testing::AllOf;
using testing::ElementsAre;
using testing::Field;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

// What a handler is told.
struct Told {
  std::optional<std::string> data;
  std::optional<HttpResponse> response;
  std::optional<Error> error;
  std::thread::id thread;

  int status() const { return response ? response->statusCode : 0; }
  int code() const { return error ? error->code : 0; }
};

class TheSocialFramework : public testing::Test {
 protected:
  ServerConfiguration configuration() const {
    ServerConfiguration made;
    made.address = sandbox.address();
    return made;
  }

  void use(const ServerConfiguration& changed) {
    framework.emplace(*http, outbox, FacebookServer(changed), [this] { return account; });
  }

  static PermissionSetRef permissions(PermissionSet names) { return std::make_shared<const PermissionSet>(std::move(names)); }

  // Lets go of the request at once, as callers do.
  static std::future<Told> perform(const std::shared_ptr<FacebookRequest>& request, std::optional<std::string> token) {
    auto promise = std::make_shared<std::promise<Told>>();
    request->setAccessToken(std::move(token));
    request->performRequestWithHandler([promise](std::optional<std::string> data, const auto& response, const auto& error) {
      promise->set_value({std::move(data), response, error, std::this_thread::get_id()});
    });
    return promise->get_future();
  }

  Told authorize(PermissionSetRef names, const std::optional<std::string>& audience = std::nullopt) {
    return perform(framework->makeFacebookAuthorizationRequest("app", "org.example.App", std::move(names), audience),
                   sandbox.masterToken())
        .get();
  }

  Told describe(PermissionSetRef names) {
    return perform(framework->makeFacebookPermissionDescriptionRequest(std::move(names), "EVERYONE"), sandbox.masterToken())
        .get();
  }

  static Value parsed(const Told& told) {
    return NlohmannJsonParser().parse(told.data.value_or(""), JsonFragments::allowed).value.value_or(Value());
  }

  Sandbox sandbox;
  TemporaryFolder folder;
  Outbox outbox{{.path = folder.path() / "outbox.sqlite"}};
  std::optional<HttpClient> http{std::in_place, sandbox.trusted()};
  std::optional<std::string> account = "the-account";
  std::optional<HttpSocialFramework> framework{std::in_place, *http, outbox, FacebookServer(configuration()),
                                               [this] { return account; }};
};

TEST_F(TheSocialFramework, GetsATokenForWhatWasAsked) {
  const Told told = authorize(permissions({"user_likes", "email"}), "ALL_FRIENDS");
  EXPECT_EQ(told.status(), 200);
  EXPECT_EQ(told.error, std::nullopt);
  EXPECT_NE(told.thread, std::this_thread::get_id());
  const Value answer = parsed(told);
  EXPECT_EQ(*answer.dictionary()->find("permissions"), Value(Array{"email", "user_likes"}));

  const Dictionary issued = *sandbox.tokens().front().dictionary();
  EXPECT_EQ(*issued.find("access_token"), *answer.dictionary()->find("access_token"));
  EXPECT_EQ(*issued.find("app_id"), Value("app"));
  EXPECT_EQ(*issued.find("bundle_id"), Value("org.example.App"));
  EXPECT_EQ(*issued.find("audience"), Value("ALL_FRIENDS"));
}

TEST_F(TheSocialFramework, LeavesOutWhatIsNone) {
  authorize(nullptr);
  const Value request = sandbox.requests().front();
  EXPECT_EQ(*request.dictionary()->find("fields"), Value(Array{"app_id", "bundle_id"}));
}

TEST_F(TheSocialFramework, SendsAPermissionAsOneWhateverItsName) {
  for (const char* name : {"email,publish_stream", "email&permissions=publish_stream", "email publish_stream"}) {
    const Told told = authorize(permissions({name}));
    EXPECT_EQ(told.status(), 400);
    EXPECT_THAT(told.data.value_or(""), HasSubstr("\"" + std::string(name)));
  }
  EXPECT_THAT(sandbox.tokens(), IsEmpty());
}

TEST_F(TheSocialFramework, PassesOnWhyTheServerRefuses) {
  const Told told = authorize(permissions({"nonsense"}));
  EXPECT_EQ(told.error, std::nullopt);
  EXPECT_THAT(told.data.value_or(""), HasSubstr("error_msg"));
}

TEST_F(TheSocialFramework, SendsARequestWithoutATokenUnsigned) {
  for (const auto& token : {std::optional<std::string>(), std::optional<std::string>("")}) {
    const Told told =
        perform(framework->makeFacebookAuthorizationRequest("app", "org.example.App", nullptr, std::nullopt), token).get();
    EXPECT_EQ(told.status(), 401);
    EXPECT_THAT(told.data.value_or(""), HasSubstr("invalid_token"));
  }
  for (const Value& request : sandbox.requests()) EXPECT_EQ(*request.dictionary()->find("signed"), Value(false));
}

TEST_F(TheSocialFramework, GetsWordsForPermissions) {
  EXPECT_EQ(parsed(describe(permissions({"user_runs", "user_playlists"}))),
            Value("your playlists, the runs that you recorded"));
  EXPECT_EQ(parsed(describe(permissions({"nonsense"}))), Value("API_EC_PARAM"));
  const Value request = sandbox.requests().front();
  EXPECT_EQ(*request.dictionary()->find("fields"), Value(Array{"audience", "permissions"}));
}

TEST_F(TheSocialFramework, TellsAnErrorWhenTheServerFails) {
  for (const char* status : {"500", "503", "599"}) {
    sandbox.arm({{"kind", "status"}, {"status", status}});
    const Told told = authorize(nullptr);
    EXPECT_EQ(told.code(), HttpErrorStatus);
    EXPECT_EQ(std::to_string(told.status()), status);
    EXPECT_EQ(told.data, std::nullopt);
  }
}

TEST_F(TheSocialFramework, TellsAnErrorWhenARefusalIsNoJson) {
  ServerConfiguration changed = configuration();
  changed.paths.authorization = "/nowhere";
  use(changed);
  const Told told = authorize(nullptr);
  EXPECT_EQ(told.code(), HttpErrorStatus);
  EXPECT_EQ(told.status(), 404);
}

TEST_F(TheSocialFramework, TellsTheTransportsErrors) {
  sandbox.arm({{"kind", "redirect"}});
  const Told redirected = authorize(nullptr);
  EXPECT_EQ(redirected.code(), HttpErrorRedirect);
  EXPECT_EQ(redirected.response.has_value(), false);
  EXPECT_EQ(redirected.data, std::nullopt);
  sandbox.stop();
  EXPECT_EQ(authorize(nullptr).code(), HttpErrorUnreachable);
}

TEST_F(TheSocialFramework, SaysThatNoServerIsConfigured) {
  use(ServerConfiguration());
  const Told told = authorize(nullptr);
  EXPECT_EQ(told.code(), HttpErrorUnavailable);
  EXPECT_THAT(told.error->description.value_or(""), HasSubstr("No server is configured"));
}

TEST_F(TheSocialFramework, TellsEveryHandlerWhenTheDaemonEnds) {
  sandbox.arm({{"kind", "silent"}});
  std::future<Told> told =
      perform(framework->makeFacebookAuthorizationRequest("app", "org.example.App", nullptr, std::nullopt), "a token");
  http.reset();
  EXPECT_EQ(told.get().code(), HttpErrorCancelled);
}

// Whoever watches the exchanges of a framework.
class AWatchedExchange : public TheSocialFramework {
 protected:
  AWatchedExchange() {
    framework.emplace(
        *http, outbox, FacebookServer(configuration()), [this] { return account; },
        [this](Exchange exchange) { return watch(std::move(exchange)); });
  }

  std::shared_ptr<const void> watch(Exchange exchange) {
    if (!mayBegin) throw std::runtime_error("It may not begin.");
    exchanges.push_back(std::move(exchange));
    if (isCancelledAtOnce) exchanges.back().cancel();
    return std::shared_ptr<const void>(nullptr, [released = released](const void*) { released->set_value(); });
  }

  std::future<Told> askForToken() {
    return perform(framework->makeFacebookAuthorizationRequest("app", "org.example.App", nullptr, std::nullopt),
                   sandbox.masterToken());
  }

  bool mayBegin = true;
  bool isCancelledAtOnce = false;
  std::vector<Exchange> exchanges;
  std::shared_ptr<std::promise<void>> released = std::make_shared<std::promise<void>>();
};

TEST_F(AWatchedExchange, IsToldWithTheAppThatATokenIsAskedFor) {
  askForToken().get();
  EXPECT_EQ(exchanges.back().appID, "app");
}

TEST_F(AWatchedExchange, IsToldWithoutAnAppWhenWordsAreAskedFor) {
  describe(permissions({"user_runs"}));
  EXPECT_EQ(exchanges.back().appID, std::nullopt);
}

TEST_F(AWatchedExchange, IsKeptUntilItsHandlerHasBeenCalled) {
  askForToken().get();
  released->get_future().get();
  exchanges.back().cancel();  // There is nothing left to cancel.
}

TEST_F(AWatchedExchange, EndsWhenItIsCancelled) {
  sandbox.arm({{"kind", "silent"}});
  std::future<Told> told = askForToken();
  exchanges.back().cancel();
  EXPECT_EQ(told.get().code(), HttpErrorCancelled);
  exchanges.back().cancel();
}

TEST_F(AWatchedExchange, EndsWhenItIsCancelledBeforeItBegins) {
  isCancelledAtOnce = true;
  sandbox.arm({{"kind", "silent"}});
  EXPECT_EQ(askForToken().get().code(), HttpErrorCancelled);
}

TEST_F(AWatchedExchange, DoesNotBeginWhenTheWatchRefusesIt) {
  mayBegin = false;
  EXPECT_THROW(askForToken(), std::runtime_error);
  EXPECT_THAT(sandbox.requests(), IsEmpty());
}

// Attack 15: what such a body means is for the daemon's parser to say, and it says no.
struct BodyCase {
  const char* fault;
  int code;
};
class AHostileBody : public TheSocialFramework, public testing::WithParamInterface<BodyCase> {};

TEST_P(AHostileBody, IsRefusedByTheParser) {
  sandbox.arm({{"kind", GetParam().fault}});
  const Told told = authorize(nullptr);
  ASSERT_TRUE(told.data.has_value());
  const JsonParseResult result = NlohmannJsonParser().parse(*told.data, JsonFragments::allowed);
  EXPECT_FALSE(result.value.has_value());
  EXPECT_EQ(result.error ? result.error->code : 0, GetParam().code);
}

INSTANTIATE_TEST_SUITE_P(Table, AHostileBody,
                         testing::Values(BodyCase{"deep", JsonErrorTooDeep}, BodyCase{"duplicate", JsonErrorDuplicateName},
                                         BodyCase{"text", JsonErrorNotUtf8}, BodyCase{"page", JsonErrorMalformed}),
                         [](const auto& test) { return std::string(test.param.fault); });

TEST_F(TheSocialFramework, PassesOnMembersOfTheWrongTypes) {
  sandbox.arm({{"kind", "types"}});
  EXPECT_EQ(*parsed(authorize(nullptr)).dictionary()->find("access_token"), Value(7));
}

TEST_F(TheSocialFramework, WritesAnInvalidationDownForTheAccountOfThatMoment) {
  const auto session = framework->makeFacebookSession();
  session->revokeAccessTokenForAppWithID("first");
  account = "another-account";
  session->revokeAccessTokenForAppWithID("second");
  EXPECT_THAT(outbox.pending(),
              ElementsAre(AllOf(Field(&Invalidation::accountID, "the-account"), Field(&Invalidation::appID, "first")),
                          AllOf(Field(&Invalidation::accountID, "another-account"), Field(&Invalidation::appID, "second"))));
  EXPECT_THAT(sandbox.requests(), IsEmpty());
}

TEST_F(TheSocialFramework, RefusesAnInvalidationThatNobodyCouldSign) {
  account = std::nullopt;
  EXPECT_THROW(framework->makeFacebookSession()->revokeAccessTokenForAppWithID("app"), std::runtime_error);
  EXPECT_THAT(outbox.pending(), IsEmpty());
}

}  // namespace
