#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>
#include <memory>
#include <stdexcept>

#include "Tests/Host/Identity/Identify.h"
#include "Tests/Host/Identity/Records.h"
#include "Tests/Host/OwnRoot.h"

// Real cgroups, laid out as the service manager of a user lays them out. Who may not make any covers the kernel's list of the
// caller's cgroups by a file that looks the same.

namespace palisade {
namespace {

using testing::IsEmpty;

class ACallerInAUnit : public testing::Test {
 protected:
  void SetUp() override {
    for (const char* mount : {"/sys/fs/cgroup/unified", "/sys/fs/cgroup"}) {
      if (!std::filesystem::exists(std::filesystem::path(mount) / "cgroup.procs")) continue;
      _slice = std::filesystem::path(mount) / sliceName();
      std::error_code error;
      std::filesystem::create_directories(_slice / service, error);
      if (!error) return;
      _mayNotMake = true;
    }
    _slice.clear();
    if (!_mayNotMake) GTEST_SKIP() << "There are no cgroups here: /sys/fs/cgroup is not mounted.";
    _isDone = ranWithItsOwnRoot();
  }

  void TearDown() override {
    _caller.reset();
    if (_slice.empty()) return;
    std::error_code ignored;
    if (!_unit.empty()) std::filesystem::remove(_unit, ignored);
    std::filesystem::remove(_slice / service, ignored);
    std::filesystem::remove(_slice, ignored);
  }

  // Starts the program and puts it into a unit of that name.
  pid_t start(const std::filesystem::path& program, const std::string& unit) {
    return start(std::vector<std::string>{program}, unit);
  }

  pid_t start(const std::vector<std::string>& words, const std::string& unit) {
    _caller = std::make_unique<CallerProcess>(words);
    if (_mayNotMake) {
      coverCgroupsWith("/" + sliceName() + "/" + service + "/" + unit);
    } else {
      _unit = _slice / service / unit;
      std::filesystem::create_directory(_unit);
      std::ofstream(_unit / "cgroup.procs") << _caller->pid();
    }
    return _caller->pid();
  }

  bool _isDone = false;
  Records _folder;

 private:
  static constexpr const char* service = "user@65533.service";

  static std::string sliceName() { return "palisadetest" + std::to_string(getpid()) + ".slice"; }

  // In the old hierarchy of the service manager and in the one of today.
  void coverCgroupsWith(const std::string& path) {
    const auto file = _folder.write("cgroups", "1:name=systemd:" + path + "\n0::" + path + "\n");
    const std::string list = "/proc/" + std::to_string(_caller->pid()) + "/cgroup";
    if (mount(file.c_str(), list.c_str(), nullptr, MS_BIND, nullptr) != 0) throw std::runtime_error(std::strerror(errno));
  }

  bool _mayNotMake = false;
  std::filesystem::path _slice;
  std::filesystem::path _unit;
  std::unique_ptr<CallerProcess> _caller;
};

TEST_F(ACallerInAUnit, IsRecognisedByTheApplicationInItsUnitsName) {
  if (_isDone) return;
  _folder.writePhotos("unit = 'org.example.Photo-Album'");
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(CALLER_PROGRAM, "app-gnome-org.example.Photo\\x2dAlbum-1234.scope"));
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->clientClass(), ClientClass::unit);
}

TEST_F(ACallerInAUnit, IsRecognisedByTheWholeNameOfItsUnit) {
  if (_isDone) return;
  _folder.writePhotos("unit = 'photo-backup.service'");
  const ClientRegistry registry({_folder.path()});
  EXPECT_EQ(identify(registry, start(CALLER_PROGRAM, "photo-backup.service"))->id(), "org.example.photos");
}

TEST_F(ACallerInAUnit, MustBeTheExecutableThatTheRecordNamesToo) {
  if (_isDone) return;
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos("unit = 'org.example.Photos'\n" + Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(photos, "app-org.example.Photos-1.scope"));
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->clientClass(), ClientClass::unit);
}

TEST_F(ACallerInAUnit, IsNotRecognisedWithAnotherExecutableThanTheRecords) {
  if (_isDone) return;
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos("unit = 'org.example.Photos'\n" + Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(CALLER_PROGRAM, "app-org.example.Photos-1.scope"));
  EXPECT_EQ(client->id(), CALLER_PROGRAM);
  EXPECT_EQ(client->bundleID(), std::nullopt);
}

TEST_F(ACallerInAUnit, IsNotRecognisedInAnotherUnitThanTheRecords) {
  if (_isDone) return;
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos("unit = 'org.example.Photos'\n" + Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  EXPECT_EQ(identify(registry, start(photos, "app-org.example.Terminal-1.scope"))->id(), photos);
}

TEST_F(ACallerInAUnit, OfSomebodyElseIsRecognisedByItsExecutable) {
  if (_isDone) return;
  const auto photos = _folder.copyProgram("photos");
  _folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({_folder.path()});
  const auto client = identify(registry, start(photos, "app-org.example.Terminal-1.scope"));
  EXPECT_EQ(client->id(), "org.example.photos");
  EXPECT_EQ(client->clientClass(), ClientClass::bare);
}

TEST_F(ACallerInAUnit, WithNamespacesOfItsOwnIsInASandboxOfAnUnknownKind) {
  if (_isDone) return;
  _folder.writePhotos("unit = 'photo-backup.service'");
  const ClientRegistry registry({_folder.path()});
  const auto client =
      identify(registry, start({"bwrap", "--die-with-parent", "--dev-bind", "/", "/", "--unshare-user", "--", CALLER_PROGRAM},
                               "photo-backup.service"));
  EXPECT_EQ(client->id(), "sandbox:" CALLER_PROGRAM);
  EXPECT_EQ(client->bundleID(), std::nullopt);
}

TEST_F(ACallerInAUnit, OfASnapIsSandboxed) {
  if (_isDone) return;
  _folder.writePhotos(Records::executable(CALLER_PROGRAM));
  const ClientRegistry registry({_folder.path()});
  const auto client =
      identify(registry, start(CALLER_PROGRAM, "snap.photo-album.viewer-4706fe54-7802-4808-aa7e-ae8b567239e0.scope"));
  EXPECT_EQ(client->id(), "photo-album");
  EXPECT_EQ(client->bundleID(), "photo-album");
  EXPECT_EQ(client->clientClass(), ClientClass::sandboxed);
}

TEST_F(ACallerInAUnit, OfASnapIsRecognisedByTheRecordOfTheSnap) {
  if (_isDone) return;
  _folder.writePhotos("snap = 'photo-album'");
  const ClientRegistry registry({_folder.path()});
  EXPECT_EQ(identify(registry, start(CALLER_PROGRAM, "snap.photo-album.viewer.service"))->id(), "org.example.photos");
}

}  // namespace
}  // namespace palisade
