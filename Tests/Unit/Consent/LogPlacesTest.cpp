// Every log record says which source file and line it comes from.

#include <gmock/gmock.h>

#include <filesystem>

#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::AllOf;
using ::testing::Each;
using ::testing::Field;
using ::testing::Gt;
using ::testing::SizeIs;
using ::testing::StartsWith;

struct Place {
  std::string operation;
  std::string file;
  unsigned line;
};

class PlaceKeepingLog final : public Log {
 public:
  bool isEnabled(LogLevel) const override { return true; }
  void write(const LogRecord& record) override {
    places.push_back({.operation = std::string(record.place.operationName),
                      .file = record.place.where.file_name(),
                      .line = record.place.where.line()});
  }
  void logAccessRequest(const AccessRequestRecord&) override {}

  std::vector<Place> places;
};

TEST(ALogRecord, NamesTheFileOfItsOperationAndALineOfItsOwn) {
  PlaceKeepingLog log;
  ConsentScene scene;
  PlatformServices services = scene.platform.services();
  services.log = &log;
  const auto plugin = std::make_shared<PluginUnderTest>(services);
  scene.platform.social.descriptionAnswers = {{.data = R"("API_EC_PARAM")", .delivery = Delivery::inLine}};
  scene.platform.social.authorizationAnswers = {{.data = "{}", .delivery = Delivery::inLine}};

  plugin->_constructUserMessageForPermissions({"new_thing"}, std::nullopt, "Photos", scene.account);
  plugin->_getServerAuthorizationForClient(scene.client, photosAppID, permissionSet({"email"}), std::nullopt, scene.account,
                                           [](bool, const std::optional<Array>&, const std::optional<Error>&) {});

  ASSERT_THAT(log.places, SizeIs(5));
  EXPECT_THAT(log.places, Each(AllOf(Field(&Place::file, StartsWith("Facebook/Palisade/")), Field(&Place::line, Gt(0u)))));
  const std::pair<const char*, const char*> fileOf[] = {
      {"_constructUserMessageForPermissions:", "VXFacebookAccountAccessPluginConsentMessage.cpp"},
      {"_fetchDescriptionForUnknownPermissions:", "VXFacebookAccountAccessPluginUnknownPermissions.cpp"},
      {"_getServerAuthorizationForClient:", "VXFacebookAccountAccessPluginServerAuthorization.cpp"},
  };
  std::set<std::pair<std::string, unsigned>> lines;
  for (const auto& [operation, file, line] : log.places) {
    const auto expected = std::ranges::find_if(fileOf, [&](const auto& each) { return operation.starts_with(each.first); });
    ASSERT_NE(expected, std::end(fileOf)) << operation;
    EXPECT_EQ(std::filesystem::path(file).filename(), expected->second);
    lines.emplace(file, line);
  }
  EXPECT_THAT(lines, SizeIs(5)) << "One line stands for one record.";
}

}  // namespace
}  // namespace palisade
