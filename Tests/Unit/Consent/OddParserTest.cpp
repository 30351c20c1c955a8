// A JSON parser that does not keep to its word: a value beside an error, or neither.
//
// An error counts, whatever comes with it, and nothing is made of nothing.

#include <memory>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::IsEmpty;

class OddParser final : public JsonParser {
 public:
  explicit OddParser(JsonParseResult result) : _result(std::move(result)) {}

  JsonParseResult parse(std::string_view, JsonFragments) const override { return _result; }

 private:
  JsonParseResult _result;
};

const Error notSure{.domain = "org.example.json", .code = 4, .description = "not sure", .furtherInfo = {{"line", 7}}};

std::unique_ptr<Scene> sceneWith(JsonParseResult result) {
  auto scene = std::make_unique<Scene>(photosClient(), FakePlatform::create(std::make_shared<OddParser>(std::move(result))));
  scene->addAccount();
  scene->platform.alert.answers = {userAllows()};
  scene->platform.social.authorizationAnswers = {{.data = "whatever"}};
  scene->platform.social.descriptionAnswers = {{.data = "whatever"}};
  return scene;
}

TEST(AParsersErrorBesideAToken, RefusesTheRequestWithThatError) {
  const auto scene = sceneWith({.value = Dictionary{{"access_token", "T"}}, .error = notSure});
  EXPECT_THAT(scene->requestAccess(optionsAskingFor({"email"})), isRefusalWith(notSure));
  EXPECT_EQ(scene->record(), std::nullopt);
  EXPECT_THAT(scene->platform.trace.named("KeychainManager.setCredentialForAccount"), IsEmpty());
}

TEST(AParsersErrorBesideADescription, TakesTheSentenceAway) {
  const auto scene = sceneWith({.value = "see the future", .error = notSure});
  EXPECT_THAT(scene->requestAccess(optionsAskingFor({"future"})), isRefusalWith(accountsError(7)));
  EXPECT_THAT(scene->platform.trace.named("SystemAlert.createAlert"), IsEmpty());
}

TEST(AParserThatSaysNothing, RefusesTheRequestWithoutAnError) {
  const auto scene = sceneWith({});
  EXPECT_THAT(scene->requestAccess(optionsAskingFor({"email"})), isRefusalWithoutError());
  EXPECT_EQ(scene->record(), std::nullopt);
}

TEST(AParserThatSaysNothing, DescribesNothing) {
  const auto scene = sceneWith({});
  EXPECT_THAT(scene->requestAccess(optionsAskingFor({"future"})), isRefusalWith(accountsError(7)));
  EXPECT_THAT(scene->platform.trace.named("SystemAlert.createAlert"), IsEmpty());
}

}  // namespace
}  // namespace palisade
