#include "Host/Identity/SnapName.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Host/Identity/IdentityError.h"

namespace palisade {
namespace {

using std::string_literals::operator""s;

struct Case {
  std::string evidence;
  std::optional<Snap> snap;
};

TEST(ASecurityLabel, NamesTheSnapThatTheKernelConfines) {
  const std::vector<Case> cases = {
      {"snap.photos.viewer (enforce)\n", Snap{"photos", "viewer", true}},
      {"snap.photos.viewer (enforce)\n\0"s, Snap{"photos", "viewer", true}},
      {"snap.photo-album.photo-album (enforce)", Snap{"photo-album", "photo-album", true}},
      {"snap.photos_two.viewer (enforce)\n", Snap{"photos_two", "viewer", true}},
      {"snap.photos.hook.configure (enforce)\n", Snap{"photos", "hook.configure", true}},
      {"snap.editor.editor (complain)\n", Snap{"editor", "editor", false}},
      {"snap.editor.editor (unconfined)\n", Snap{"editor", "editor", false}},
      {"snap.editor.editor", Snap{"editor", "editor", false}},
      {"unconfined\n", std::nullopt},
      {"", std::nullopt},
      {"/usr/bin/photos (enforce)\n", std::nullopt},
      {"snap-update-ns.photos (enforce)\n", std::nullopt},
      {"unconfined_u:unconfined_r:unconfined_t:s0-s0:c0.c1023\n", std::nullopt},
  };
  for (const auto& [evidence, snap] : cases) EXPECT_EQ(snapOfLabel(evidence), snap) << evidence;
}

TEST(ASecurityLabel, RefusesWhenItBeginsLikeASnapsAndNamesNone) {
  for (const char* label :
       {"snap.", "snap..viewer (enforce)", "snap.Photos.viewer (enforce)", "snap./.viewer (enforce)", "snap. (enforce)",
        "snap.a b.c (enforce)", "snap.a (enforce)", "snap.a.b x", "snap.-a.b (enforce)"}) {
    EXPECT_THROW(snapOfLabel(label), IdentityError) << label;
  }
}

TEST(Cgroups, NameTheSnapOfTheUnit) {
  const std::string uuid = "4706fe54-7802-4808-aa7e-ae8b567239e0";
  const std::string slice = "0::/user.slice/user-1000.slice/user@1000.service/app.slice/";
  const std::vector<Case> cases = {
      {slice + "snap.photos.viewer-" + uuid + ".scope\n", Snap{"photos", "viewer", true}},
      {slice + "snap.photo-album.photo-album-" + uuid + ".scope\n", Snap{"photo-album", "photo-album", true}},
      {"0::/system.slice/snap.photos.server.service\n", Snap{"photos", "server", true}},
      {"12:freezer:/snap.photos\n0::/user.slice\n", Snap{"photos", "", true}},
      {"7:freezer:/snap.photos\n1:name=systemd:/snap.photos.viewer-" + uuid + ".scope\n0::/", Snap{"photos", "viewer", true}},
      {"0::/\n", std::nullopt},
      {"", std::nullopt},
      {"garbage", std::nullopt},
      {":::", std::nullopt},
      {"5:cpu,cpuacct:/snap.photos\n0::/user.slice\n", std::nullopt},
      {slice + "app-org.example.Photos-1234.scope\n", std::nullopt},
      {"0::/snap.slice/user.scope\n", std::nullopt},
      {"0::/system.slice/snapd.service\n", std::nullopt},
  };
  for (const auto& [evidence, snap] : cases) EXPECT_EQ(snapOfCgroups(evidence), snap) << evidence;
}

TEST(Cgroups, RefuseWhenTheyContradictEachOther) {
  EXPECT_THROW(snapOfCgroups("7:freezer:/snap.photos\n0::/snap.mail.mail.service\n"), IdentityError);
  EXPECT_THROW(snapOfCgroups("0::/snap.photos.viewer.service/snap.mail.mail.scope\n"), IdentityError);
  EXPECT_THROW(snapOfCgroups("0::/snap.Photos.viewer.scope\n"), IdentityError);
}

}  // namespace
}  // namespace palisade
