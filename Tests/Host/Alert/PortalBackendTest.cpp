// Which backend asks, by the files that desktops install and by what they prefer.

#include "Host/Alert/PortalBackend.h"

#include <gmock/gmock.h>

#include <fstream>

#include "Tests/Host/Identity/EnvironmentVariable.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using Files = std::vector<std::pair<std::string, std::string>>;

std::string backendFile(const std::string& busName, const std::string& interfaces, const std::string& useIn = "") {
  return "[portal]\nDBusName=" + busName + "\nInterfaces=" + interfaces + "\n" + (useIn.empty() ? "" : "UseIn=" + useIn + "\n");
}

const std::string asking(accessInterface);
const std::string notAsking = "org.freedesktop.impl.portal.Account;org.freedesktop.impl.portal.Settings;";
const std::string nameOfGtk = "org.freedesktop.impl.portal.desktop.gtk";
const Files gtk = {{"system/xdg-desktop-portal/portals/gtk.portal", backendFile(nameOfGtk, notAsking + asking + ";", "gnome")}};

// Folders as a session names them in its environment: the user's and the system's configuration and data.
class APortalSession : public testing::Test {
 protected:
  void write(const Files& files) const {
    for (const auto& [name, text] : files) {
      const auto path = _folder.path() / name;
      std::filesystem::create_directories(path.parent_path());
      std::ofstream(path) << text;
    }
  }

  std::string under(const char* name) const { return (_folder.path() / name).string(); }

  TemporaryFolder _folder;
  EnvironmentVariable _desktops{"XDG_CURRENT_DESKTOP", std::nullopt};
  EnvironmentVariable _ownConfiguration{"XDG_CONFIG_HOME", under("config")};
  EnvironmentVariable _configuration{"XDG_CONFIG_DIRS", under("everybodys-config") + ":relative"};
  EnvironmentVariable _ownData{"XDG_DATA_HOME", under("data")};
  EnvironmentVariable _data{"XDG_DATA_DIRS", under("local") + ":" + under("system")};
};

struct Installed {
  const char* name;
  const char* desktops;
  Files files;
  std::optional<std::string> expected;
};

class APortalSessionWithFiles : public APortalSession, public testing::WithParamInterface<Installed> {};

TEST_P(APortalSessionWithFiles, AsksThroughTheBackendThatItsPortalUses) {
  _desktops.set(GetParam().desktops);
  write(GetParam().files);
  EXPECT_EQ(accessBackend(), GetParam().expected);
}

Files with(Files files, const Files& more) {
  files.insert(files.end(), more.begin(), more.end());
  return files;
}

Files preferring(const std::string& lines, const std::string& file = "config/xdg-desktop-portal/portals.conf") {
  return {{file, "[preferred]\n" + lines + "\n"}};
}

const Files kde = {{"system/xdg-desktop-portal/portals/kde.portal", backendFile("org.example.Kde", asking, "KDE")}};
const Files shell = {
    {"system/xdg-desktop-portal/portals/gnome-shell.portal", backendFile("org.example.Shell", asking, "gnome")}};
const Files wlroots = {{"system/xdg-desktop-portal/portals/wlr.portal", backendFile("org.example.Wlr", notAsking, "sway")}};
const Files allBackends = with(with(gtk, kde), with(shell, wlroots));
const std::string forAccess = asking + "=";

INSTANTIATE_TEST_SUITE_P(
    OfAnyDesktop, APortalSessionWithFiles,
    testing::Values(
        Installed{"NothingInstalled", "GNOME", {}, std::nullopt}, Installed{"NoneThatAsks", "sway", wlroots, std::nullopt},
        Installed{"TheDesktopsOwn", "KDE", allBackends, "org.example.Kde"},
        Installed{"TheFirstOfTheDesktopsOwn", "GNOME", allBackends, "org.example.Shell"},
        Installed{"TheMoreSpecialDesktopFirst", "KDE:GNOME", allBackends, "org.example.Kde"},
        Installed{"TheMoreGeneralDesktopSecond", "ubuntu:GNOME", with(gtk, kde), nameOfGtk},
        Installed{"GtksWithoutADesktop", "", allBackends, nameOfGtk},
        Installed{"GtksWhereTheDesktopsDoesNotAsk", "sway", allBackends, nameOfGtk},
        Installed{"AnyWhereThereIsNoOther", "sway", with(kde, wlroots), "org.example.Kde"},
        Installed{"ThePreferred", "GNOME", with(allBackends, preferring(forAccess + "kde")), "org.example.Kde"},
        Installed{"TheSecondPreferred", "GNOME", with(allBackends, preferring(forAccess + "absent;wlr;kde;gtk")),
                  "org.example.Kde"},
        Installed{"TheDefault", "GNOME", with(allBackends, preferring("default=kde;gtk;")), "org.example.Kde"},
        Installed{"TheDefaultAfterOneThatIsAbsent", "GNOME", with(allBackends, preferring(forAccess + "absent\ndefault=kde")),
                  "org.example.Kde"},
        Installed{"TheInterfacesBeforeTheDefault", "GNOME", with(allBackends, preferring("default=kde\n" + forAccess + "gtk")),
                  nameOfGtk},
        Installed{"AnyThatIsAllowed", "KDE", with(allBackends, preferring(forAccess + "*")), "org.example.Shell"},
        Installed{"NoneWanted", "GNOME", with(allBackends, preferring(forAccess + "none")), std::nullopt},
        Installed{"NoneWantedByDefault", "GNOME", with(allBackends, preferring("default=none")), std::nullopt},
        Installed{"OneWantedWhereNoneIsByDefault", "GNOME", with(allBackends, preferring("default=none\n" + forAccess + "kde")),
                  "org.example.Kde"},
        Installed{"TheDesktopsWhereThePreferredAreAbsent", "KDE", with(allBackends, preferring("default=absent")),
                  "org.example.Kde"},
        Installed{"OneDesktopsPreference", "Sway:GNOME",
                  with(allBackends, with(preferring(forAccess + "gtk"),
                                         preferring(forAccess + "kde", "config/xdg-desktop-portal/sway-portals.conf"))),
                  "org.example.Kde"},
        Installed{
            "TheUsersPreferenceFirst", "GNOME",
            with(allBackends, with(preferring(forAccess + "gtk", "everybodys-config/xdg-desktop-portal/gnome-portals.conf"),
                                   preferring(forAccess + "kde"))),
            "org.example.Kde"},
        Installed{"EverybodysPreferenceSecond", "GNOME",
                  with(allBackends, with(preferring(forAccess + "gtk", "system/xdg-desktop-portal/gnome-portals.conf"),
                                         preferring(forAccess + "kde", "everybodys-config/xdg-desktop-portal/portals.conf"))),
                  "org.example.Kde"},
        Installed{"TheDesktopsPreferenceLast", "GNOME",
                  with(allBackends, preferring(forAccess + "kde", "system/xdg-desktop-portal/gnome-portals.conf")),
                  "org.example.Kde"},
        Installed{"ALocalOneInFrontOfTheSystems", "GNOME",
                  with(gtk, {{"local/xdg-desktop-portal/portals/gtk.portal", backendFile("org.example.Local", asking)}}),
                  "org.example.Local"},
        Installed{"TheUsersOwnInFrontOfAll", "GNOME",
                  with(gtk, {{"data/xdg-desktop-portal/portals/gtk.portal", backendFile("org.example.Mine", asking)}}),
                  "org.example.Mine"},
        Installed{"ALocalOneThatHidesTheSystems", "GNOME",
                  with(gtk, {{"local/xdg-desktop-portal/portals/gtk.portal", backendFile(nameOfGtk, notAsking)}}),
                  std::nullopt},
        Installed{
            "AnotherKindOfFile", "GNOME", {{"system/xdg-desktop-portal/portals/gtk.conf", gtk.front().second}}, std::nullopt}),
    [](const auto& instance) { return instance.param.name; });

TEST_F(APortalSession, PassesMalformedFilesOver) {
  const std::vector<std::string> malformed = {"",
                                              "[portal]\n",
                                              "[portal]\nDBusName\n",
                                              "[other]\nDBusName=a.b\nInterfaces=" + asking + "\n",
                                              backendFile("", asking),
                                              backendFile("nodot", asking),
                                              backendFile(":1.5", asking),
                                              backendFile(".a.b", asking),
                                              backendFile("a.b',type='error", asking),
                                              backendFile(std::string(260, 'a') + ".b", asking),
                                              backendFile("a.b", asking + "s"),
                                              std::string(100 * 1024, '#')};
  for (const std::string& text : malformed) {
    write({{"data/xdg-desktop-portal/portals/bad.portal", text}});
    EXPECT_EQ(accessBackend(), std::nullopt) << text.substr(0, 80);
  }
  std::filesystem::create_directories(_folder.path() / "config/xdg-desktop-portal/portals.conf");
  std::filesystem::create_directories(_folder.path() / "data/xdg-desktop-portal/portals/folder.portal");
  write(gtk);
  EXPECT_EQ(accessBackend(), nameOfGtk);
}

TEST_F(APortalSession, TakesNoDesktopForAPath) {
  write(allBackends);
  write(preferring(forAccess + "kde", "evil-portals.conf"));
  _desktops.set("../../evil:GNOME");
  EXPECT_THAT(currentDesktops(), testing::ElementsAre("gnome"));
  EXPECT_EQ(accessBackend(), "org.example.Shell");
}

}  // namespace
}  // namespace palisade
