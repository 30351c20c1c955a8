#include "Host/Identity/UnitName.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace palisade {
namespace {

TEST(AUnitOfAnApplication, CarriesItsID) {
  const std::vector<std::pair<std::string, std::string>> cases = {
      {"app-flatpak-org.example.X-1234.scope", "org.example.X"},
      {"app-gnome-org.example.X-1234.scope", "org.example.X"},
      {"app-org.example.X-1234.scope", "org.example.X"},
      {"app-org.example.X@autostart.service", "org.example.X"},
      {"app-gnome-org.gnome.Evolution\\x2dalarm\\x2dnotify-2437.scope", "org.gnome.Evolution-alarm-notify"},
      {"app-gnome-org.gnome.Epiphany-182352.scope", "org.gnome.Epiphany"},
      {"app-glib-spice\\x2dvdagent-1839.scope", "spice-vdagent"},
      {"app-KDE-org.kde.okular@12345.service", "org.kde.okular"},
      {"app-firefox.service", "firefox"},
      {"app-org.kde.amarok.service", "org.kde.amarok"},
      {"app-gnome-org.gnome.SettingsDaemon.DiskUtilityNotify-autostart.service", "org.gnome.SettingsDaemon.DiskUtilityNotify"},
      {"app-org.example.X-autostart.service", "org.example.X"},
      {"app-gnome-org.gnome.Terminal-92502.slice", "org.gnome.Terminal"},
      {"app-com.obsproject.Studio-d70acc38b5154a3a8b4a60accc4b15f4.scope", "com.obsproject.Studio"},
      {"app-org.example.X@.service", "org.example.X"},
      {"app-org.example.X\\x40y-1.scope", "org.example.X@y"},
      {"app-autostart.service", "autostart"},
  };
  for (const auto& [unit, application] : cases) EXPECT_EQ(applicationOfUnit(unit), application) << unit;
}

TEST(AnyOtherUnit, IsNoApplications) {
  const std::vector<std::string> units = {
      "",
      "app",
      "app.slice",
      "app-not-a-well-formed-unit-name",
      "app-not-a-well-formed-unit-name.scope",
      "app-org.example.X.scope",
      "app-.scope",
      "app-.service",
      "app--1234.scope",
      "app-gnome--1234.scope",
      "app-@1.service",
      "app-org.example.X-1234.socket",
      "app-org.example.X-1234.timer",
      "application-org.example.X-1234.scope",
      "session-2.scope",
      "vte-spawn-4706fe54-7802-4808-aa7e-ae8b567239e0.scope",
      "dbus-:1.2-org.example.X@0.service",
      "snap.photos.viewer.service",
      "app-org.example.X\\x2-1234.scope",
      "app-org.example.X\\xzz-1234.scope",
      "app-org.example.X\\n-1234.scope",
      "app-org.example.X\\-1234.scope",
      "app-org.example.X\\x00Y-1234.scope",
      "app-org.example.X\\x0aY-1234.scope",
      "app-a-b-c-d.service",
  };
  for (const std::string& unit : units) EXPECT_EQ(applicationOfUnit(unit), std::nullopt) << unit;
}

}  // namespace
}  // namespace palisade
