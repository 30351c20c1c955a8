#include "Host/Identity/DesktopEntry.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

#include "Tests/Host/Identity/EnvironmentVariable.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::Eq;
using testing::Optional;

TEST(ADesktopEntry, HoldsTheNameInEveryLanguage) {
  EXPECT_THAT(
      nameInDesktopEntry("[Desktop Entry]\nType=Application\nName=Photos\nName[de]=Fotos\nName[sr@latin]=Fotografije\n"
                         "GenericName[fr]=Visionneur\n[Desktop Action new]\nName=New window\nName[it]=Finestra\n"),
      Optional(LocalizedText{.untranslated = "Photos", .translations = {{"de", "Fotos"}, {"sr@latin", "Fotografije"}}}));
}

TEST(ADesktopEntry, WithoutANameIsNone) {
  for (const char* text : {"", "[Desktop Entry]\nName[de]=Fotos\n", "[Other]\nName=Photos\n", "Name=Photos\n",
                           "[Desktop Entry]\nName=Photos\nbroken\n"}) {
    EXPECT_EQ(nameInDesktopEntry(text), std::nullopt) << text;
  }
}

TEST(TheDataFolders, AreTheUsersOwnAndThenTheSystems) {
  const EnvironmentVariable home("XDG_DATA_HOME", "/data/home");
  const EnvironmentVariable folders("XDG_DATA_DIRS", "/data/one:relative::/data/two");
  EXPECT_THAT(dataFolders(), ElementsAre("/data/home", "/data/one", "/data/two"));
}

TEST(TheDataFolders, HaveDefaults) {
  const EnvironmentVariable user("HOME", "/home/somebody");
  const EnvironmentVariable home("XDG_DATA_HOME", std::nullopt);
  const EnvironmentVariable folders("XDG_DATA_DIRS", "");
  EXPECT_THAT(dataFolders(), ElementsAre("/home/somebody/.local/share", "/usr/local/share", "/usr/share"));
}

class ADesktopFile : public testing::Test {
 protected:
  void write(const std::string& folder, const std::string& name, const std::string& content) const {
    std::filesystem::create_directories(_folder.path() / folder / "applications");
    std::ofstream(_folder.path() / folder / "applications" / name) << content;
  }

  TemporaryFolder _folder;
  EnvironmentVariable _home{"XDG_DATA_HOME", _folder.path() / "home"};
  EnvironmentVariable _folders{"XDG_DATA_DIRS", _folder.path() / "system"};
};

TEST_F(ADesktopFile, IsFoundInTheMostImportantFolder) {
  write("system", "photos.desktop", "[Desktop Entry]\nName=Photos\n");
  EXPECT_THAT(nameInDesktopFile("photos.desktop"), Optional(LocalizedText{.untranslated = "Photos"}));
  write("home", "photos.desktop", "[Desktop Entry]\nName=My photos\n");
  EXPECT_THAT(nameInDesktopFile("photos.desktop"), Optional(LocalizedText{.untranslated = "My photos"}));
}

TEST_F(ADesktopFile, IsNoneWhenItIsMissingOrNoFile) {
  EXPECT_EQ(nameInDesktopFile("photos.desktop"), std::nullopt);
  std::filesystem::create_directories(_folder.path() / "home/applications/photos.desktop");
  EXPECT_EQ(nameInDesktopFile("photos.desktop"), std::nullopt);
}

TEST_F(ADesktopFile, IsNoneWhenItIsTooLarge) {
  write("home", "photos.desktop", "[Desktop Entry]\nName=Photos\n" + std::string(2 * 1024 * 1024, '#'));
  EXPECT_EQ(nameInDesktopFile("photos.desktop"), std::nullopt);
}

}  // namespace
}  // namespace palisade
