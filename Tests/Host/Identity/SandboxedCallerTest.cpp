#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Tests/Host/Identity/EnvironmentVariable.h"
#include "Tests/Host/Identity/Identify.h"
#include "Tests/Host/Identity/Records.h"

// Real sandboxes, made by the tool that Flatpak makes its own with.

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;

class ASandboxedCaller : public testing::Test {
 protected:
  void SetUp() override {
    const std::string output = outputOf("bwrap --ro-bind / / --proc /proc --dev /dev --unshare-user --unshare-pid true");
    if (!output.empty())
      GTEST_SKIP() << "Sandboxes need bubblewrap and user namespaces, which are not allowed here: " << output;
  }

  // The command for a program in a sandbox of its own, in which it is called /app.
  static std::vector<std::string> sandbox(const std::vector<std::string>& arguments, const std::string& name = "/app") {
    std::vector<std::string> words = {"bwrap",
                                      "--die-with-parent",
                                      "--unshare-user",
                                      "--unshare-pid",
                                      "--ro-bind",
                                      "/usr",
                                      "/usr",
                                      "--symlink",
                                      "usr/bin",
                                      "/bin",
                                      "--symlink",
                                      "usr/lib",
                                      "/lib",
                                      "--symlink",
                                      "usr/lib64",
                                      "/lib64",
                                      "--proc",
                                      "/proc",
                                      "--dev",
                                      "/dev",
                                      "--ro-bind",
                                      CALLER_PROGRAM,
                                      name};
    words.insert(words.end(), arguments.begin(), arguments.end());
    words.push_back(name);
    return words;
  }

  std::vector<std::string> flatpak(const std::string& info) const {
    return sandbox({"--ro-bind", _folder.write("info", info), "/.flatpak-info"});
  }

  NoLanguage _language;
  Records _folder;
  EnvironmentVariable _home{"XDG_DATA_HOME", _folder.path()};
  EnvironmentVariable _folders{"XDG_DATA_DIRS", _folder.path() / "none"};
};

const char* const photosInfo = "[Application]\nname=org.example.Photos\n\n[Instance]\ninstance-id=1234\n";

TEST_F(ASandboxedCaller, WithoutARecordIsKnownByWhatItsSandboxSays) {
  const ClientRegistry registry({});
  const CallerProcess caller(flatpak(photosInfo));
  const auto client = identify(registry, caller.pid());
  EXPECT_EQ(client->id(), "org.example.Photos");
  EXPECT_EQ(client->bundleID(), "org.example.Photos");
  EXPECT_EQ(client->localizedAppName(), "org.example.Photos");
  EXPECT_EQ(client->clientClass(), ClientClass::sandboxed);
  EXPECT_THAT(client->entitlements(), IsEmpty());
}

TEST_F(ASandboxedCaller, IsCalledAsItsDesktopFileSaysInTheUsersLanguage) {
  std::filesystem::create_directory(_folder.path() / "applications");
  _folder.write("applications/org.example.Photos.desktop", "[Desktop Entry]\nName=Photos\nName[de]=Fotos\n");
  const ClientRegistry registry({});
  const CallerProcess caller(flatpak(photosInfo));
  EXPECT_EQ(identify(registry, caller.pid())->localizedAppName(), "Photos");
  _language.lang.set("de_DE.UTF-8");
  EXPECT_EQ(identify(registry, caller.pid())->localizedAppName(), "Fotos");
}

TEST_F(ASandboxedCaller, IsRecognisedByTheRecordOfItsFlatpakApplication) {
  _folder.writePhotos("flatpak = 'org.example.Photos'");
  const ClientRegistry registry({_folder.path()});
  const CallerProcess caller(flatpak(photosInfo));
  const auto client = identify(registry, caller.pid());
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->localizedAppName(), "Photos");
  EXPECT_EQ(client->clientClass(), ClientClass::sandboxed);
}

TEST_F(ASandboxedCaller, IsRefusedUnderTheBundleIDOfAnotherApplication) {
  const auto record = _folder.writePhotos("executable = '/usr/bin/photos'");
  const ClientRegistry registry({_folder.path()});
  const CallerProcess caller(flatpak("[Application]\nname=org.example.photos\n"));
  EXPECT_THAT(refusal(registry, caller.pid()), AllOf(HasSubstr(record), HasSubstr("flatpak = \"org.example.photos\"")));
}

TEST_F(ASandboxedCaller, IsItsSandboxsApplicationWhateverItsExecutableIs) {
  _folder.writePhotos(Records::executable(CALLER_PROGRAM));
  const ClientRegistry registry({_folder.path()});
  const CallerProcess caller(flatpak("[Application]\nname=org.example.Other\n"));
  EXPECT_EQ(identify(registry, caller.pid())->id(), "org.example.Other");
}

TEST_F(ASandboxedCaller, IsRefusedWhenItsSandboxDoesNotNameAnApplication) {
  const std::string large = photosInfo + std::string(64 * 1024, '\n');
  for (const std::string& info : {std::string(), std::string("[Runtime]\nname=org.example.Platform\n"), large}) {
    const ClientRegistry registry({});
    const CallerProcess caller(flatpak(info));
    EXPECT_THAT(refusal(registry, caller.pid()), HasSubstr("/.flatpak-info"));
  }
}

TEST_F(ASandboxedCaller, IsRefusedWhenWhatTellsItsApplicationIsNoRegularFile) {
  const auto pipe = _folder.path() / "pipe";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0666), 0);
  _folder.write("info", photosInfo);
  const std::vector<std::vector<std::string>> sandboxes = {
      {"--dir", "/.flatpak-info"},
      {"--bind", pipe, "/.flatpak-info"},
      {"--ro-bind", _folder.path() / "info", "/info", "--symlink", "/info", "/.flatpak-info"},
      {"--symlink", "/nowhere", "/.flatpak-info"},
  };
  for (const auto& arguments : sandboxes) {
    const ClientRegistry registry({});
    const CallerProcess caller(sandbox(arguments));
    EXPECT_THAT(refusal(registry, caller.pid()), HasSubstr("/.flatpak-info")) << arguments.back();
  }
}

TEST_F(ASandboxedCaller, ThatLeavesTakesItsSandboxAlongAndIsRefused) {
  const ClientRegistry registry({});
  CallerProcess caller(flatpak(photosInfo));
  EXPECT_THROW(identify(registry, caller.pid(),
                        [&] {
                          caller.wait();
                          return caller.pid();
                        }),
               IdentityError);
}

TEST_F(ASandboxedCaller, OfAnUnknownKindIsRefusedUnlessItsProgramIsTheOneAtItsPath) {
  const ClientRegistry registry({});
  const CallerProcess hidden(sandbox({}));
  EXPECT_THAT(refusal(registry, hidden.pid()), AllOf(HasSubstr("/app"), HasSubstr("container")));
  const CallerProcess posing(sandbox({}, "/usr/bin/env"));
  EXPECT_THAT(refusal(registry, posing.pid()), AllOf(HasSubstr("/usr/bin/env"), HasSubstr("container")));
}

TEST_F(ASandboxedCaller, OfAnUnknownKindIsSandboxedAndKnownByItsProgramInASandbox) {
  const ClientRegistry registry({});
  const CallerProcess caller(sandbox({}, CALLER_PROGRAM));
  const auto client = identify(registry, caller.pid());
  EXPECT_EQ(client->id(), "sandbox:" CALLER_PROGRAM);
  EXPECT_EQ(client->bundleID(), std::nullopt);
  EXPECT_THAT(client->localizedAppName(), testing::EndsWith("identity-caller"));
  EXPECT_EQ(client->clientClass(), ClientClass::unknownSandbox);
  EXPECT_TRUE(client->isInSandbox());
}

TEST_F(ASandboxedCaller, OfAnUnknownKindDoesNotFitTheRecordOfItsProgram) {
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const CallerProcess outside({photos});
  EXPECT_EQ(identify(registry, outside.pid())->id(), "org.example.photos");
  const CallerProcess inside({"bwrap", "--die-with-parent", "--dev-bind", "/", "/", "--unshare-user", "--", photos});
  EXPECT_EQ(identify(registry, inside.pid())->id(), "sandbox:" + photos.string());
}

TEST_F(ASandboxedCaller, OfAnUnknownKindIsOneInForeignNamespacesOfAnyKind) {
  const ClientRegistry registry({});
  const std::string user = geteuid() == 0 ? "" : "--user ";
  for (const std::string& kind : {std::string("--user"), user + "--mount", user + "--pid --fork --kill-child"}) {
    std::vector<std::string> words = {"sh", "-c", "exec unshare " + kind + " " CALLER_PROGRAM};
    const CallerProcess caller(words);
    EXPECT_EQ(identify(registry, caller.pid())->clientClass(), ClientClass::unknownSandbox) << kind;
  }
  // Neither its network nor its name of the machine hides files or processes.
  for (const std::string& kind : {std::string("--net"), std::string("--uts"), std::string("--ipc")}) {
    if (geteuid() != 0) continue;
    const CallerProcess caller({"unshare", kind, CALLER_PROGRAM});
    EXPECT_EQ(identify(registry, caller.pid())->clientClass(), ClientClass::bare) << kind;
  }
}

TEST_F(ASandboxedCaller, IsOneInOtherNamespacesThanTheBusWhateverTheDaemonsAre) {
  const ClientRegistry registry({});
  const CallerProcess bus({"bwrap", "--die-with-parent", "--dev-bind", "/", "/", "--unshare-user", "--", CALLER_PROGRAM});
  const CallerProcess caller({CALLER_PROGRAM});
  auto connection = connectionOf(caller.pid());
  connection.busProcess = bus.pid();
  EXPECT_EQ(registry.identify(connection)->clientClass(), ClientClass::unknownSandbox);
  connection.process = bus.pid();
  connection.askProcessAgain = [&] { return bus.pid(); };
  EXPECT_EQ(registry.identify(connection)->clientClass(), ClientClass::bare);
}

TEST_F(ASandboxedCaller, CannotBeToldFromOthersWithoutTheBusAndIsRefused) {
  const ClientRegistry registry({});
  const CallerProcess caller({CALLER_PROGRAM});
  CallerProcess gone({CALLER_PROGRAM});
  auto connection = connectionOf(caller.pid());
  connection.busProcess = 0;
  EXPECT_THAT(refusal(registry, connection), HasSubstr("session bus"));
  connection.busProcess = gone.pid();
  gone.wait();
  EXPECT_THAT(refusal(registry, connection), HasSubstr("session bus"));
}

TEST_F(ASandboxedCaller, OfAnUnknownKindDoesNotFitTheRecordOfTheProgramWhosePathItTakes) {
  _folder.writePhotos("executable = '/usr/bin/env'");
  const ClientRegistry registry({_folder.path()});
  const CallerProcess posing(sandbox({}, "/usr/bin/env"));
  EXPECT_THAT(refusal(registry, posing.pid()), HasSubstr("container"));
}

}  // namespace
}  // namespace palisade
