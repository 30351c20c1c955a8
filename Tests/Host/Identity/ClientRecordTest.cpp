#include "Host/Identity/ClientRecord.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Tests/Host/Identity/EnvironmentVariable.h"
#include "Tests/Host/Identity/Records.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::ThrowsMessage;

Dictionary minimal() {
  return {{"bundle_id", "org.example.photos"}, {"name", "Photos"}, {"match", Dictionary{{"snap", "photos"}}}};
}

Dictionary minimalWith(const std::string& key, Value value) {
  Dictionary table = minimal();
  table.set(key, std::move(value));
  return table;
}

TEST(ARecord, DescribesAnApplication) {
  Dictionary table = minimal();
  table.set("desktop_file", "org.example.photos.desktop");
  table.set("names", Dictionary{{"de", "Fotos"}, {"pt-BR", "Fotos do Brasil"}});
  table.set("match", Dictionary{{"flatpak", "org.example.Photos"},
                                {"snap", "photos"},
                                {"unit", "org.example.Photos"},
                                {"executable", "/usr/lib/../bin/photos"}});
  table.set("entitlements", Array{"com.example.one", "com.example.two"});
  const ClientRecord record = clientRecordFromTable(table);
  EXPECT_EQ(record.bundleID, "org.example.photos");
  EXPECT_EQ(record.name,
            (LocalizedText{.untranslated = "Photos", .translations = {{"de", "Fotos"}, {"pt_BR", "Fotos do Brasil"}}}));
  EXPECT_EQ(record.desktopFile, "org.example.photos.desktop");
  EXPECT_EQ(record.match.flatpak, "org.example.Photos");
  EXPECT_EQ(record.match.snap, "photos");
  EXPECT_EQ(record.match.unit, "org.example.Photos");
  EXPECT_EQ(record.match.executable, "/usr/bin/photos");
  EXPECT_THAT(record.entitlements, ElementsAre("com.example.one", "com.example.two"));
}

TEST(ARecord, MustBeRightInEveryKey) {
  struct Case {
    Dictionary table;
    std::string message;
  };
  const auto matching = [](const std::string& key, Value value) {
    return minimalWith("match", Dictionary{{key, std::move(value)}});
  };
  const std::vector<Case> cases = {
      {{}, "'bundle_id' is missing"},
      {{{"name", "Photos"}}, "'bundle_id' is missing"},
      {minimalWith("bundle_id", 5), "'bundle_id' must be"},
      {minimalWith("bundle_id", ""), "'bundle_id' must be"},
      {minimalWith("bundle_id", "photos"), "'bundle_id' must be"},
      {minimalWith("bundle_id", "/usr/bin/photos"), "'bundle_id' must be"},
      {minimalWith("bundle_id", "org.example.photos\n"), "'bundle_id' must be"},
      {minimalWith("bundle_id", "org.example."), "'bundle_id' must be"},
      {minimalWith("name", true), "'name' must be"},
      {minimalWith("name", " \n"), "'name' must be"},
      {minimalWith("names", "Fotos"), "'names' must be a table"},
      {minimalWith("names", Dictionary{{"de", 5}}), "'names.de' must be"},
      {minimalWith("desktop_file", "photos"), "'desktop_file' must be"},
      {minimalWith("desktop_file", "../photos.desktop"), "'desktop_file' must be"},
      {minimalWith("match", "photos"), "'match' must be a table"},
      {minimalWith("match", Dictionary()), "'match' must say how"},
      {{{"bundle_id", "org.example.photos"}, {"name", "Photos"}}, "'match' must say how"},
      {{{"bundle_id", "org.example.photos"}, {"match", Dictionary{{"snap", "photos"}}}}, "'name' is missing"},
      {matching("flatpack", "org.example.Photos"), "'match.flatpack' is unknown here. Known are 'match.flatpak', 'match.snap'"},
      {matching("flatpak", "Photos"), "'match.flatpak' must be"},
      {matching("flatpak", Array{"org.example.Photos"}), "'match.flatpak' must be"},
      {matching("snap", "snap.photos.viewer"), "'match.snap' must be"},
      {matching("unit", ""), "'match.unit' must be"},
      {matching("unit", "a/b"), "'match.unit' must be"},
      {matching("executable", "photos"), "'match.executable' must be an absolute path"},
      {matching("executable", "/usr/bin/"), "'match.executable' must be"},
      {matching("executable", false), "'match.executable' must be"},
      {minimalWith("entitlements", "com.example.one"), "'entitlements' must be a list of texts"},
      {minimalWith("entitlements", Array{"com.example.one", 2}), "'entitlements' must be a list of texts"},
      {minimalWith("entitlement", Array{}), "'entitlement' is unknown here"},
  };
  for (const auto& [table, message] : cases) {
    EXPECT_THAT([&table = table] { clientRecordFromTable(table); }, ThrowsMessage<ClientRecordError>(HasSubstr(message)));
  }
}

TEST(ARecordsName, FollowsTheLanguageOfTheMoment) {
  const NoLanguage environment;
  const ClientRecord record = clientRecordFromTable(minimalWith("names", Dictionary{{"de", "Fotos"}}));
  EXPECT_EQ(localizedName(record), "Photos");
  environment.lang.set("de_DE.UTF-8");
  EXPECT_EQ(localizedName(record), "Fotos");
}

TEST(ARecordsName, IsTheDesktopFilesWhenThereIsOne) {
  const NoLanguage environment;
  const Records folder;
  const EnvironmentVariable home("XDG_DATA_HOME", folder.path());
  const EnvironmentVariable system("XDG_DATA_DIRS", folder.path() / "none");
  std::filesystem::create_directory(folder.path() / "applications");
  const ClientRecord record = clientRecordFromTable(minimalWith("desktop_file", "photos.desktop"));
  EXPECT_EQ(localizedName(record), "Photos");
  folder.write("applications/photos.desktop", "[Desktop Entry]\nName=Photo\\nalbum\nName[de]=Fotoalbum\n");
  EXPECT_EQ(localizedName(record), "Photo album");
  environment.language.set("fr:de");
  EXPECT_EQ(localizedName(record), "Fotoalbum");
  folder.write("applications/photos.desktop", "[Desktop Entry]\nName=\n");
  EXPECT_EQ(localizedName(record), "Photos");
}

TEST(ARecordsName, IsTheBundleIDWhenTheDesktopFileIsMissingAndThereIsNoOther) {
  const EnvironmentVariable home("XDG_DATA_HOME", "/nowhere");
  const ClientRecord record = clientRecordFromTable({{"bundle_id", "org.example.photos"},
                                                     {"desktop_file", "org.example.photos-that-nobody-installed.desktop"},
                                                     {"match", Dictionary{{"snap", "photos"}}}});
  EXPECT_EQ(localizedName(record), "org.example.photos");
}

}  // namespace
}  // namespace palisade
