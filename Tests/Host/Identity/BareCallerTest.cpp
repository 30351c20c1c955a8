#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "Tests/Host/Identity/Identify.h"
#include "Tests/Host/Identity/Records.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;

TEST(AProgramWithARecord, IsRecognisedByItsExecutable) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  const auto record = folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({folder.path()});
  const CallerProcess caller({photos});
  const auto client = identify(registry, caller.pid());
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->bundleID(), "org.example.photos");
  EXPECT_EQ(client->localizedAppName(), "Photos");
  EXPECT_EQ(client->clientClass(), ClientClass::bare);
  EXPECT_EQ(client->recordFile(), record);
  EXPECT_EQ(client->description(), "org.example.photos");
}

TEST(AProgramWithoutARecord, IsKnownByItsPathAndHasNoBundleID) {
  const Records folder;
  folder.writePhotos("executable = '/usr/bin/photos'");
  const auto program = folder.copyProgram("program");
  const ClientRegistry registry({folder.path()});
  const CallerProcess caller({program});
  const auto client = identify(registry, caller.pid());
  EXPECT_EQ(client->id(), program);
  EXPECT_EQ(client->bundleID(), std::nullopt);
  EXPECT_EQ(client->localizedAppName(), program);
  EXPECT_EQ(client->clientClass(), ClientClass::bare);
  EXPECT_THAT(client->entitlements(), IsEmpty());
  EXPECT_THAT(client->recordFile(), IsEmpty());
}

TEST(ACopiedProgram, IsNotTheOriginal) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  const auto copy = folder.copyProgram("copy");
  folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({folder.path()});
  const CallerProcess caller({copy});
  EXPECT_EQ(identify(registry, caller.pid())->id(), copy);
}

TEST(ALiar, IsNotWhatItCallsItself) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  const auto liar = folder.copyProgram("liar");
  folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({folder.path()});
  const CallerProcess caller({liar, "photos"}, photos);
  EXPECT_EQ(identify(registry, caller.pid())->id(), liar);
}

TEST(AProgramUnderAnotherName, IsTheSameProgram) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  std::filesystem::create_hard_link(photos, folder.path() / "album");
  std::filesystem::create_symlink(photos, folder.path() / "link");
  for (const char* recorded : {"photos", "album", "link"}) {
    folder.writePhotos(Records::executable(folder.path() / recorded));
    const ClientRegistry registry({folder.path()});
    for (const char* started : {"photos", "album", "link"}) {
      const CallerProcess caller({folder.path() / started});
      EXPECT_EQ(identify(registry, caller.pid())->id(), "org.example.photos") << recorded << " as " << started;
    }
  }
}

TEST(AScript, IsItsInterpreter) {
  const Records folder;
  const auto script = folder.write("photos", "#!/bin/sh\necho ready\nread line\n");
  std::filesystem::permissions(script, std::filesystem::perms(0755));
  folder.writePhotos(Records::executable(script));
  const ClientRegistry registry({folder.path()});
  const CallerProcess caller({script});
  const auto client = identify(registry, caller.pid());
  EXPECT_EQ(client->id(), std::filesystem::canonical("/bin/sh"));
  EXPECT_EQ(client->bundleID(), std::nullopt);
}

TEST(AProgramThatFitsTwoRecords, IsRefused) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  std::filesystem::create_hard_link(photos, folder.path() / "album");
  folder.writePhotos(Records::executable(photos));
  folder.write("zalbum.toml",
               "bundle_id = 'org.example.album'\nname = 'Album'\nmatch." + Records::executable(folder.path() / "album") + "\n");
  const ClientRegistry registry({folder.path()});
  ASSERT_THAT(registry.troubles(), IsEmpty());
  const CallerProcess caller({photos});
  EXPECT_THAT(refusal(registry, caller.pid()), AllOf(HasSubstr("photos.toml"), HasSubstr("zalbum.toml")));
}

TEST(AReplacedProgram, IsRefusedUntilItIsStartedAgain) {
  const Records folder;
  const auto program = folder.copyProgram("program");
  const ClientRegistry registry({});
  const CallerProcess old({program});
  std::filesystem::remove(program);
  EXPECT_THAT(refusal(registry, old.pid()), HasSubstr("Start it again."));
  folder.copyProgram("program");
  EXPECT_THAT(refusal(registry, old.pid()), HasSubstr("Start it again."));
  const CallerProcess renewed({program});
  EXPECT_EQ(identify(registry, renewed.pid())->id(), program);
}

TEST(AReplacedProgram, IsNotRecognisedByTheRecordOfItsSuccessor) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({folder.path()});
  const CallerProcess old({photos});
  std::filesystem::remove(photos);
  folder.copyProgram("photos");
  EXPECT_THAT(refusal(registry, old.pid()), HasSubstr("was replaced"));
}

TEST(AProgramWhosePathCannotBeShown, IsRefused) {
  const Records folder;
  const auto program = folder.copyProgram("pro\ngram");
  const ClientRegistry registry({});
  const CallerProcess caller({program});
  EXPECT_THAT(refusal(registry, caller.pid()), AllOf(HasSubstr("cannot be shown"), HasSubstr("/pro gram")));
}

TEST(ARegistry, ServesManyThreadsAtOnce) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({folder.path()});
  const CallerProcess known({photos});
  const CallerProcess unknown({CALLER_PROGRAM});
  std::vector<std::thread> threads;
  for (int count = 0; count < 8; ++count) {
    threads.emplace_back([&] {
      for (int turn = 0; turn < 50; ++turn) {
        EXPECT_EQ(identify(registry, known.pid())->id(), "org.example.photos");
        EXPECT_EQ(identify(registry, unknown.pid())->id(), CALLER_PROGRAM);
        EXPECT_EQ(registry.clients().size(), 1U);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

// A container, a chroot or another init: the process identifies itself where there are no cgroups to be found.
TEST(AProgramWhereNoCgroupsAreMounted, HasNoUnitAndIsKnownByItsPath) {
  const std::string user = geteuid() == 0 ? "" : "--user --map-root-user ";
  for (const std::string folder : {"/sys", "/sys/fs/cgroup"}) {
    if (!std::filesystem::exists(folder)) continue;
    EXPECT_EQ(outputOf("unshare " + user + "--mount sh -c 'mount -t tmpfs none " + folder +
                       " && exec " TRIAL_PROGRAM " identify $$'"),
              TRIAL_PROGRAM "\n")
        << folder;
  }
}

}  // namespace
}  // namespace palisade
