#include "Host/Social/ServerConfiguration.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using namespace palisade;
using namespace std::chrono_literals;
using testing::HasSubstr;

namespace {

TEST(AnEmptyConfiguration, NamesNoServerAndLeavesTheRestAsTheContractHasIt) {
  const ServerConfiguration configuration{Dictionary()};
  EXPECT_EQ(configuration.address, "");
  EXPECT_EQ(configuration.paths.authorization, "/oauth/authorization");
  EXPECT_EQ(configuration.parameters.permissions, "permissions");
  const HttpClientOptions options = configuration.httpOptions();
  EXPECT_EQ(options.certificateAuthorities, std::nullopt);
  EXPECT_EQ(options.proxy, std::nullopt);
  EXPECT_EQ(options.connectLimit, 30s);
  EXPECT_EQ(options.stallLimit, 60s);
  EXPECT_EQ(options.totalLimit, 300s);
  EXPECT_EQ(options.bodyLimit, 65536U);
}

TEST(AConfiguration, SetsWhatItNames) {
  const ServerConfiguration configuration(Dictionary{
      {"address", "https://[::1]:8443/"},
      {"certificate_authorities", "/etc/ssl/own.pem"},
      {"proxy", "http://proxy.example:3128"},
      {"paths", Dictionary{{"authorization", "/a"}, {"description", "/d"}, {"invalidation", "/i"}}},
      {"parameters", Dictionary{{"app_id", "1"}, {"bundle_id", "2"}, {"permissions", "3"}, {"audience", "4"}, {"age", "5"}}},
      {"limits", Dictionary{{"connect_seconds", 1}, {"stall_seconds", 2}, {"total_seconds", 3}, {"body_bytes", 4}}},
  });
  EXPECT_EQ(configuration.address, "https://[::1]:8443");
  EXPECT_EQ(configuration.paths.authorization + configuration.paths.description + configuration.paths.invalidation, "/a/d/i");
  const ServerConfiguration::Parameters& names = configuration.parameters;
  EXPECT_EQ(names.appID + names.bundleID + names.permissions + names.audience + names.age, "12345");
  const HttpClientOptions options = configuration.httpOptions();
  EXPECT_EQ(options.certificateAuthorities, "/etc/ssl/own.pem");
  EXPECT_EQ(options.proxy, "http://proxy.example:3128");
  EXPECT_EQ(options.connectLimit, 1s);
  EXPECT_EQ(options.stallLimit, 2s);
  EXPECT_EQ(options.totalLimit, 3s);
  EXPECT_EQ(options.bodyLimit, 4U);
}

struct BadCase {
  std::string name;
  Dictionary table;
  std::string setting;
  std::string advice;
};
void PrintTo(const BadCase& bad, std::ostream* stream) { *stream << bad.name; }

class ABadConfiguration : public testing::TestWithParam<BadCase> {};

TEST_P(ABadConfiguration, IsAnErrorThatNamesTheSettingAndWhatBelongsThere) {
  try {
    const ServerConfiguration configuration(GetParam().table);
    FAIL() << "it was accepted";
  } catch (const ServerConfigurationError& error) {
    EXPECT_THAT(error.what(), HasSubstr("\"" + GetParam().setting + "\""));
    EXPECT_THAT(error.what(), HasSubstr(GetParam().advice));
  }
}

BadCase badAddress(const std::string& name, Value address) {
  return {name, {{"address", std::move(address)}}, "address", "https://graph.example.com"};
}

INSTANTIATE_TEST_SUITE_P(
    Table, ABadConfiguration,
    testing::Values(
        BadCase{"unknownSetting", {{"adress", "https://a"}}, "adress", "Known are: address"},
        BadCase{"unknownPath", {{"paths", Dictionary{{"me", "/me"}}}}, "paths.me", "authorization, description, invalidation"},
        BadCase{"unknownLimit", {{"limits", Dictionary{{"connect", 1}}}}, "limits.connect", "connect_seconds"},
        BadCase{"sectionOfTheWrongType", {{"limits", 30}}, "limits", "a table"}, badAddress("plainHttp", "http://a"),
        badAddress("noHost", "https://"), badAddress("aPath", "https://a/b"), badAddress("aUser", "https://u:p@a"),
        badAddress("aQuery", "https://a?b"), badAddress("aBlank", "https://a b"), badAddress("aLineEnd", "https://a\n"),
        badAddress("noText", 443), badAddress("empty", ""), badAddress("null", nullptr),
        BadCase{"relativeFile", {{"certificate_authorities", "own.pem"}}, "certificate_authorities", "absolute path"},
        BadCase{"proxyWithoutScheme", {{"proxy", "proxy.example"}}, "proxy", "http://proxy.example.com:3128"},
        BadCase{"relativePath", {{"paths", Dictionary{{"invalidation", "i"}}}}, "paths.invalidation", "begins with \"/\""},
        BadCase{"pathWithAQuery", {{"paths", Dictionary{{"invalidation", "/i?a=b"}}}}, "paths.invalidation", "no query"},
        BadCase{"emptyParameter", {{"parameters", Dictionary{{"age", ""}}}}, "parameters.age", "name of a form field"},
        BadCase{"limitAsText", {{"limits", Dictionary{{"total_seconds", "3"}}}}, "limits.total_seconds", "from 1 to 86400"},
        BadCase{"limitWithAFraction", {{"limits", Dictionary{{"total_seconds", 3.5}}}}, "limits.total_seconds", "whole number"},
        BadCase{"noLimit", {{"limits", Dictionary{{"connect_seconds", 0}}}}, "limits.connect_seconds", "from 1"},
        BadCase{"negativeLimit", {{"limits", Dictionary{{"stall_seconds", -1}}}}, "limits.stall_seconds", "from 1"},
        BadCase{"hugeBody", {{"limits", Dictionary{{"body_bytes", 1'000'000'000}}}}, "limits.body_bytes", "16777216"}),
    [](const auto& test) { return test.param.name; });

}  // namespace
