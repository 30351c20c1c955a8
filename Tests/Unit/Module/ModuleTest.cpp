// The module as a daemon meets it: a file, one entry point, five constants, and an object that decides.

#include <dlfcn.h>
#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "Host/Daemon/PluginLoader.h"
#include "Host/Json/Json.h"
#include "Host/Strings/GettextStringTable.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::FieldsAre;
using ::testing::IsNull;
using ::testing::NotNull;
using ::testing::Pointee;
using ::testing::SizeIs;
using ::testing::StrEq;
using ::testing::UnorderedElementsAre;

const std::filesystem::path moduleFile = PALISADE_MODULE_FILE;

FakePlatform& somePlatform(std::shared_ptr<const StringTable> strings = nullptr) {
  return FakePlatform::create(std::make_shared<NlohmannJsonParser>(), std::move(strings));
}

const AccountAccessPluginModule& theModule() { return *loadPlugin(moduleFile).module; }

TEST(TheModule, IsLoadedFromItsFile) { EXPECT_EQ(loadPlugin(moduleFile).path, std::filesystem::canonical(moduleFile)); }

TEST(TheModule, AnswersItsOwnABINumberWhateverTheDaemonsIs) {
  theModule();
  void* const handle = dlopen(moduleFile.c_str(), RTLD_NOW | RTLD_NOLOAD);
  ASSERT_THAT(handle, NotNull());
  const auto entry = reinterpret_cast<AccountAccessPluginModuleEntry>(dlsym(handle, AccountAccessPluginModuleSymbol));
  ASSERT_THAT(entry, NotNull());

  for (const std::uint32_t daemonsNumber : {AccountAccessPluginABINumber, 0u, 7u, 4294967295u}) {
    const AccountAccessPluginModule* const module = entry(daemonsNumber);
    ASSERT_THAT(module, NotNull());
    EXPECT_EQ(module->abiNumber, AccountAccessPluginABINumber);
    EXPECT_EQ(module->size, sizeof(AccountAccessPluginModule));
  }
}

TEST(TheModule, ServesTheFacebookAccountTypeAndNoOther) {
  const auto supports = theModule().supportsAccountTypeWithIdentifier;

  EXPECT_TRUE(supports(AccountTypeIdentifierFacebook));
  for (const std::string_view identifier :
       {"", "facebook", "com.veltran.accounttype.faceboo", "com.veltran.accounttype.facebook ",
        "com.veltran.accounttype.Facebook", "com.veltran.accounttype.calendar", "*"}) {
    EXPECT_FALSE(supports(identifier)) << identifier;
  }
  EXPECT_FALSE(supports(std::string(AccountTypeIdentifierFacebook) + '\0'));
}

TEST(TheModule, CreatesAnObjectOfItsOwnEachTime) {
  const PlatformServices services = somePlatform().services();
  const auto first = theModule().create(services);
  const auto second = theModule().create(services);

  ASSERT_THAT(first, NotNull());
  ASSERT_THAT(second, NotNull());
  EXPECT_NE(first, second);
}

TEST(ADaemonWithoutOneOfItsServices, GetsNoPlugin) {
  const struct {
    const char* name;
    void (*takeAway)(PlatformServices&);
  } cases[] = {
      {"log", [](PlatformServices& services) { services.log = nullptr; }},
      {"keychain", [](PlatformServices& services) { services.keychain = nullptr; }},
      {"social", [](PlatformServices& services) { services.social = nullptr; }},
      {"alert", [](PlatformServices& services) { services.alert = nullptr; }},
      {"preferences", [](PlatformServices& services) { services.preferences = nullptr; }},
      {"notifications", [](PlatformServices& services) { services.notifications = nullptr; }},
      {"queues", [](PlatformServices& services) { services.queues = nullptr; }},
      {"json", [](PlatformServices& services) { services.json = nullptr; }},
      {"strings", [](PlatformServices& services) { services.strings = nullptr; }},
  };
  for (const auto& [name, takeAway] : cases) {
    PlatformServices services = somePlatform().services();
    takeAway(services);
    EXPECT_THAT(theModule().create(services), IsNull()) << name;
  }
}

TEST(ADaemonOfAnotherABINumber, GetsNoPlugin) {
  for (const std::uint32_t number : {0u, AccountAccessPluginABINumber + 1}) {
    PlatformServices services = somePlatform().services();
    services.abiNumber = number;
    EXPECT_THAT(theModule().create(services), IsNull()) << number;
  }
}

TEST(TheModulesConstants, AreTheNamesOfTheCategories) {
  const std::pair<const char*, const char*> constants[] = {
      {"VXFacebookPermissionCategoryUnknown", "unknown"},
      {"VXFacebookPermissionCategoryBasicRead", "basic-read"},
      {"VXFacebookPermissionCategoryExtendedRead", "extended-read"},
      {"VXFacebookPermissionCategoryWrite", "write"},
      {"VXFacebookPermissionCategoryManage", "manage"},
  };
  theModule();
  void* const handle = dlopen(moduleFile.c_str(), RTLD_NOW | RTLD_NOLOAD);
  ASSERT_THAT(handle, NotNull());
  for (const auto& [name, value] : constants) {
    EXPECT_THAT(static_cast<const char* const*>(dlsym(handle, name)), Pointee(StrEq(value))) << name;
  }
}

// A copy of the module in a folder of its own: nobody but this test has loaded it.
class ACopyOfTheModule : public ::testing::Test {
 protected:
  ACopyOfTheModule() {
    std::string folder = ::testing::TempDir() + "palisade-module-XXXXXX";
    if (mkdtemp(folder.data()) == nullptr) throw std::runtime_error("no temporary folder can be made");
    _folder = folder;
    file = _folder / moduleFile.filename();
    std::filesystem::copy_file(moduleFile, file);
  }
  ~ACopyOfTheModule() override { std::filesystem::remove_all(_folder); }

  std::filesystem::path file;

 private:
  std::filesystem::path _folder;
};

TEST_F(ACopyOfTheModule, StaysLoadedAfterItsHandleWasClosed) {
  ASSERT_THAT(dlopen(file.c_str(), RTLD_NOW | RTLD_NOLOAD), IsNull());
  void* const handle = dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL);
  ASSERT_THAT(handle, NotNull()) << dlerror();
  const auto entry = reinterpret_cast<AccountAccessPluginModuleEntry>(dlsym(handle, AccountAccessPluginModuleSymbol));
  ASSERT_THAT(entry, NotNull());

  ASSERT_EQ(dlclose(handle), 0);

  ASSERT_THAT(dlopen(file.c_str(), RTLD_NOW | RTLD_NOLOAD), NotNull());
  EXPECT_TRUE(entry(AccountAccessPluginABINumber)->supportsAccountTypeWithIdentifier(AccountTypeIdentifierFacebook));
}

// From the options to the stored grant, with the texts that ship beside the module.
TEST(ARequestThroughTheModule, AsksTheUserGetsATokenAndRecordsTheGrant) {
  const LoadedPlugin loaded = loadPlugin(moduleFile);
  FakePlatform& platform = somePlatform(std::make_shared<GettextStringTable>(loaded.path.parent_path() / "Resources", "en"));
  platform.store->addAccount({.id = "me", .type = std::string(AccountTypeIdentifierFacebook), .description = "me"});
  platform.keychain.addCredential("me", std::nullopt, "master token");
  platform.alert.answers = {userAllows()};
  platform.social.authorizationAnswers = {{.data = R"({"access_token": "client token", "permissions": ["email"]})"}};
  const auto client = platform.makeClient({.id = "photos", .bundleID = "org.example.photos", .appName = "Photos"});
  const auto type = std::make_shared<const AccountType>(std::string(AccountTypeIdentifierFacebook));
  const auto options = std::make_shared<const Dictionary>(
      Dictionary{{std::string(FacebookAppIdKey), "123"}, {std::string(FacebookPermissionsKey), Array{"email"}}});
  const auto plugin = loaded.module->create(platform.services());
  ASSERT_THAT(plugin, NotNull());

  const OperationEnd end = platform.run(
      [&] { plugin->handleAccessRequestToAccountsOfType(type, client, options, platform.store, true, platform.completion()); });

  EXPECT_EQ(end, OperationEnd::returned);
  EXPECT_THAT(platform.completions(), ElementsAre(FieldsAre(true, Eq(std::nullopt))));
  const auto alerts = platform.trace.named("SystemAlert.createAlert");
  ASSERT_THAT(alerts, SizeIs(1));
  const Dictionary* const shown = alerts.front()["description"].dictionary();
  ASSERT_THAT(shown, NotNull());
  EXPECT_THAT(shown->find("message"),
              Pointee(Value("“Photos” would like to see your basic profile and friend list on Facebook.")));
  const auto credential = platform.keychain.entry("me", "org.example.photos");
  ASSERT_THAT(credential, NotNull());
  EXPECT_EQ(credential->oauthToken(), "client token");
  const auto record = platform.authorizations.recordOf(*client, type->identifier());
  ASSERT_THAT(record, NotNull());
  EXPECT_TRUE(record->isGranted());
  EXPECT_THAT(record->grantedPermissions(), Pointee(UnorderedElementsAre("email")));
}

}  // namespace
}  // namespace palisade
