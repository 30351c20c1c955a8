#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <fstream>
#include <memory>

#include "Tests/Host/Identity/Identify.h"
#include "Tests/Host/Identity/Records.h"

// Real cgroups, laid out as the service manager of a user lays them out.

namespace palisade {
namespace {

using testing::IsEmpty;

class ACallerInAUnit : public testing::Test {
 protected:
  void SetUp() override {
    for (const char* mount : {"/sys/fs/cgroup/unified", "/sys/fs/cgroup"}) {
      if (!std::filesystem::exists(std::filesystem::path(mount) / "cgroup.procs")) continue;
      _slice = std::filesystem::path(mount) / ("palisadetest" + std::to_string(getpid()) + ".slice");
      std::error_code error;
      std::filesystem::create_directories(_slice / "user@65533.service", error);
      if (!error) return;
    }
    _slice.clear();
    GTEST_SKIP() << "Units need cgroups, which this user cannot make here; run this test as root.";
  }

  void TearDown() override {
    _caller.reset();
    if (_slice.empty()) return;
    std::error_code ignored;
    if (!_unit.empty()) std::filesystem::remove(_unit, ignored);
    std::filesystem::remove(_slice / "user@65533.service", ignored);
    std::filesystem::remove(_slice, ignored);
  }

  // Starts the program and puts it into a unit of that name.
  pid_t start(const std::filesystem::path& program, const std::string& unit) {
    _unit = _slice / "user@65533.service" / unit;
    std::filesystem::create_directory(_unit);
    _caller = std::make_unique<CallerProcess>(std::vector<std::string>{program});
    std::ofstream(_unit / "cgroup.procs") << _caller->pid();
    return _caller->pid();
  }

  Records _folder;

 private:
  std::filesystem::path _slice;
  std::filesystem::path _unit;
  std::unique_ptr<CallerProcess> _caller;
};

TEST_F(ACallerInAUnit, IsRecognisedByTheApplicationInItsUnitsName) {
  _folder.writePhotos("unit = 'org.example.Photo-Album'");
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(CALLER_PROGRAM, "app-gnome-org.example.Photo\\x2dAlbum-1234.scope"));
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->clientClass(), ClientClass::unit);
}

TEST_F(ACallerInAUnit, IsRecognisedByTheWholeNameOfItsUnit) {
  _folder.writePhotos("unit = 'photo-backup.service'");
  const ClientRegistry registry({_folder.path()});
  EXPECT_EQ(identify(registry, start(CALLER_PROGRAM, "photo-backup.service"))->id(), "org.example.photos");
}

TEST_F(ACallerInAUnit, MustBeTheExecutableThatTheRecordNamesToo) {
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos("unit = 'org.example.Photos'\n" + Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(photos, "app-org.example.Photos-1.scope"));
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->clientClass(), ClientClass::unit);
}

TEST_F(ACallerInAUnit, IsNotRecognisedWithAnotherExecutableThanTheRecords) {
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos("unit = 'org.example.Photos'\n" + Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(CALLER_PROGRAM, "app-org.example.Photos-1.scope"));
  EXPECT_EQ(client->id(), CALLER_PROGRAM);
  EXPECT_EQ(client->bundleID(), std::nullopt);
}

TEST_F(ACallerInAUnit, IsNotRecognisedInAnotherUnitThanTheRecords) {
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos("unit = 'org.example.Photos'\n" + Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  EXPECT_EQ(identify(registry, start(photos, "app-org.example.Terminal-1.scope"))->id(), photos);
}

TEST_F(ACallerInAUnit, OfSomebodyElseIsRecognisedByItsExecutable) {
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(photos, "app-org.example.Terminal-1.scope"));
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->clientClass(), ClientClass::bare);
}

TEST_F(ACallerInAUnit, OfASnapIsSandboxed) {
  _folder.writePhotos(Records::executable(CALLER_PROGRAM));
  const ClientRegistry registry({_folder.path()});
  const auto client =
      identify(registry, start(CALLER_PROGRAM, "snap.photo-album.viewer-4706fe54-7802-4808-aa7e-ae8b567239e0.scope"));
  EXPECT_EQ(client->id(), "photo-album");
  EXPECT_EQ(client->bundleID(), "photo-album");
  EXPECT_EQ(client->clientClass(), ClientClass::sandboxed);
}

TEST_F(ACallerInAUnit, OfASnapIsRecognisedByTheRecordOfTheSnap) {
  _folder.writePhotos("snap = 'photo-album'");
  const ClientRegistry registry({_folder.path()});
  EXPECT_EQ(identify(registry, start(CALLER_PROGRAM, "snap.photo-album.viewer.service"))->id(), "org.example.photos");
}

}  // namespace
}  // namespace palisade
