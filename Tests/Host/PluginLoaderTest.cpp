#include "Host/Daemon/PluginLoader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "Tests/Host/ModuleFolder.h"

using namespace palisade;
using testing::AllOf;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

namespace {

std::string startOfRefusal(const std::filesystem::path& file) {
  return "The plug-in module '" + file.string() + "' was not loaded: ";
}

}  // namespace

TEST(AGoodModule, IsLoadedAndAnswers) {
  const ModuleFolder folder;
  const LoadedPlugin plugin = loadPlugin(folder.install("good"));
  EXPECT_EQ(plugin.path, folder.path() / "good.so");
  EXPECT_EQ(plugin.module->abiNumber, AccountAccessPluginABINumber);
  EXPECT_TRUE(plugin.module->supportsAccountTypeWithIdentifier("supported"));
  EXPECT_FALSE(plugin.module->supportsAccountTypeWithIdentifier("other"));
}

TEST(AGoodModule, IsTheSameWhenItIsLoadedTwice) {
  const ModuleFolder folder;
  const std::filesystem::path file = folder.install("good");
  EXPECT_EQ(loadPlugin(file).module, loadPlugin(file).module);
}

TEST(AGoodModule, MayDescribeMoreThanTheDaemonKnows) {
  const ModuleFolder folder;
  EXPECT_NE(loadPlugin(folder.install("larger")).module->create, nullptr);
}

TEST(AModuleBehindALink, IsKnownByItsOwnPath) {
  const ModuleFolder folder;
  const std::filesystem::path file = folder.install("good");
  const TemporaryFolder elsewhere;
  std::filesystem::create_symlink(file, elsewhere.path() / "link.so");
  EXPECT_EQ(loadPlugin(elsewhere.path() / "link.so").path, file);
}

TEST(AFileNameAlone, IsLookedForInTheWorkingDirectory) {
  const ModuleFolder folder;
  const std::filesystem::path file = folder.install("good");
  const std::filesystem::path before = std::filesystem::current_path();
  std::filesystem::current_path(folder.path());
  const LoadedPlugin plugin = loadPlugin("good.so");
  EXPECT_THAT(refusalOf("libc.so.6"), HasSubstr("there is no such file"));
  std::filesystem::current_path(before);
  EXPECT_EQ(plugin.path, file);
}

TEST(AModuleThatDoesNotFit, IsRefusedWithTheReason) {
  const std::string ours = std::to_string(AccountAccessPluginABINumber);
  const std::string others = std::to_string(AccountAccessPluginABINumber + 6);
  const std::pair<std::string, std::string> cases[] = {
      {"ofAnotherABI", "it has ABI number " + others + " and this daemon has " + ours + ";"},
      {"smaller", "its description of itself has 8 bytes and this daemon needs 24;"},
      {"withoutCreate", "it lacks the function 'create';"},
      {"withoutSupports", "it lacks the function 'supportsAccountTypeWithIdentifier';"},
      {"nothing", "its function 'accountAccessPluginModule' answered nothing;"},
      {"throwing", "its function 'accountAccessPluginModule' threw an exception;"},
      {"withoutEntry", "it does not export 'accountAccessPluginModule';"},
      {"withUnknownSymbol", "the dynamic linker refuses it ("},
  };
  const ModuleFolder folder;
  for (const auto& [module, reason] : cases) {
    SCOPED_TRACE(module);
    const std::filesystem::path file = folder.install(module);
    EXPECT_THAT(refusalOf(file), AllOf(StartsWith(startOfRefusal(file) + reason), EndsWith("."), Not(HasSubstr("\n"))));
  }
}

TEST(TheDynamicLinkersOwnRefusal, IsPassedOn) {
  const ModuleFolder folder;
  EXPECT_THAT(refusalOf(folder.install("withUnknownSymbol")), HasSubstr("functionThatNobodyDefines"));
}
