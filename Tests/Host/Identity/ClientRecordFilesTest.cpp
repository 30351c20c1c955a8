#include "Host/Identity/ClientRecordFiles.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "Host/Identity/ClientRegistry.h"
#include "Host/Identity/SystemFolder.h"
#include "Tests/Host/Identity/Records.h"
#include "Tests/Host/OwnRoot.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr uid_t nobody = 65534;

std::string entitledRecord(const std::string& bundleID, const std::string& snap) {
  return "bundle_id = '" + bundleID + "'\nname = 'Photos'\nentitlements = ['com.example.one']\nmatch.snap = '" + snap + "'\n";
}

std::vector<std::string> bundleIDs(const ClientRecords& records) {
  std::vector<std::string> ids;
  for (const ClientRecord& record : records.records) ids.push_back(record.bundleID);
  return ids;
}

TEST(ARecordsEntitlements, CountOnlyInFilesThatAreRootsAlone) {
  if (ranWithItsOwnRoot()) return;
  struct Case {
    std::string what;
    mode_t fileMode = 0644, folderMode = 0755;
    uid_t fileOwner = 0, folderOwner = 0;
    bool counts = false;
  };
  const std::vector<Case> cases = {
      {.what = "root's alone", .counts = true},
      {.what = "for root's eyes only", .fileMode = 0600, .folderMode = 0700, .counts = true},
      {.what = "of a user", .fileOwner = nobody},
      {.what = "in a user's folder", .folderOwner = nobody},
      {.what = "writable by the group", .fileMode = 0664},
      {.what = "writable by the world", .fileMode = 0666},
      {.what = "in a folder writable by the group", .folderMode = 0775},
      {.what = "in a folder writable by the world", .folderMode = 01777},
  };
  for (const Case& one : cases) {
    SCOPED_TRACE(one.what);
    const Records folder;
    const auto file = folder.write("photos.toml", entitledRecord("org.example.photos", "photos"));
    ASSERT_EQ(chown(file.c_str(), one.fileOwner, 0), 0);
    ASSERT_EQ(chmod(file.c_str(), one.fileMode), 0);
    ASSERT_EQ(chown(folder.path().c_str(), one.folderOwner, 0), 0);
    ASSERT_EQ(chmod(folder.path().c_str(), one.folderMode), 0);

    // As root of a user namespace of its own this test sees that nothing counts there.
    const bool counts = one.counts && hasNamespacesOfTheMachine();
    const ClientRegistry registry({folder.path()}, {folder.path()});
    const auto client = registry.clientWithID("org.example.photos");
    ASSERT_NE(client, nullptr);
    EXPECT_EQ(client->hasEntitlement("com.example.one"), counts);
    EXPECT_FALSE(client->hasEntitlement("com.example"));
    if (counts) {
      EXPECT_THAT(registry.troubles(), IsEmpty());
    } else {
      EXPECT_THAT(registry.troubles(), ElementsAre(AllOf(StartsWith(file.string() + ": "), HasSubstr("do not count"))));
    }
  }
}

TEST(ARecordsEntitlements, DoNotCountInAFolderThatIsNotTheSystems) {
  const Records folder;
  const auto file = folder.write("photos.toml", entitledRecord("org.example.photos", "photos"));
  const ClientRecords records = readClientRecords({folder.path()}, {"/etc/palisade/clients"});
  ASSERT_THAT(bundleIDs(records), ElementsAre("org.example.photos"));
  EXPECT_THAT(records.records.front().entitlements, IsEmpty());
  EXPECT_THAT(records.troubles, ElementsAre(AllOf(StartsWith(file.string() + ": "), HasSubstr("none of the system's"))));
}

TEST(ARecordWithoutEntitlements, MayBeAnybodys) {
  const Records folder;
  std::filesystem::permissions(folder.writePhotos("snap = 'photos'"), std::filesystem::perms(0666));
  const ClientRecords records = readClientRecords({folder.path()});
  EXPECT_THAT(bundleIDs(records), ElementsAre("org.example.photos"));
  EXPECT_THAT(records.troubles, IsEmpty());
}

TEST(AFileThatIsNoRecord, IsLeftOutAndToldWithItsReason) {
  struct Case {
    std::string content, reason;
  };
  const std::string good = "bundle_id = 'org.example.photos'\nname = 'Photos'\n";
  const std::vector<Case> cases = {
      {"", "'bundle_id' is missing."},
      {"bundle_id = ", "line 1"},
      {good + "[match\n", "line 3"},
      {good + "[match]\nsnap = 'photos'\nsnap = 'photos'\n", "line 5"},
      {good + "[match]\nsnap = \"\xff\"\n", "line 4"},
      {good + "[match]\nflatpak = 1979-05-27\n", "'match.flatpak' must be"},
      {good + "[[match]]\nsnap = 'photos'\n", "'match' must be a table."},
      {good + "bundleid = 'x'\n", "'bundleid' is unknown here."},
      {good, "'match' must say how"},
      {good + "[match]\nsnap = 'photos'\n#" + std::string(64 * 1024, 'x'), "it is larger than 64 KiB."},
      {"\x7f"
       "ELF\x02\x01\x01",
       "line 1"},
  };
  for (const auto& [content, reason] : cases) {
    const Records folder;
    const auto file = folder.write("photos.toml", content);
    const ClientRecords records = readClientRecords({folder.path()});
    EXPECT_THAT(records.records, IsEmpty());
    EXPECT_THAT(records.troubles,
                ElementsAre(AllOf(StartsWith(file.string() + ": "), HasSubstr(reason), EndsWith("The record is left out."))));
  }
}

TEST(WhatIsNoRegularFile, IsLeftOutAndKeepsNobodyWaiting) {
  const Records folder;
  ASSERT_EQ(mkfifo((folder.path() / "a.toml").c_str(), 0644), 0);
  std::filesystem::create_directory(folder.path() / "b.toml");
  std::filesystem::create_symlink("/nowhere", folder.path() / "c.toml");
  folder.write("d.txt", "no record");
  folder.write(".e.toml.123", "a draft");
  folder.write(".f.toml", "hidden");
  const ClientRecords records = readClientRecords({folder.path(), folder.path() / "missing"});
  EXPECT_THAT(records.records, IsEmpty());
  EXPECT_THAT(records.troubles,
              ElementsAre(HasSubstr("a.toml: it is no regular file."), HasSubstr("b.toml: it is no regular file."),
                          HasSubstr("c.toml: it cannot be read")));
}

TEST(AFolderThatIsNone, IsTold) {
  const Records folder;
  const auto file = folder.write("file", "");
  EXPECT_THAT(readClientRecords({file}).troubles, ElementsAre(StartsWith(file.string() + ": it cannot be read")));
}

TEST(TheFirstFolder, DecidesAboutABundleID) {
  const Records first;
  const Records second;
  first.write("x.toml", "bundle_id = 'org.example.photos'\nname = 'First'\nmatch.snap = 'one'\n");
  second.write("a.toml", "bundle_id = 'org.example.photos'\nname = 'Second'\nmatch.snap = 'two'\n");
  second.write("b.toml", "bundle_id = 'org.example.mail'\nname = 'Mail'\nmatch.snap = 'mail'\n");
  const ClientRegistry registry({first.path(), second.path()});
  EXPECT_EQ(registry.clients().size(), 2U);
  EXPECT_EQ(registry.clientWithID("org.example.photos")->recordFile(), first.path() / "x.toml");
  EXPECT_EQ(registry.clientWithID("org.example.mail")->clientClass(), ClientClass::sandboxed);
  EXPECT_EQ(registry.clientWithID("org.example.unknown"), nullptr);
  EXPECT_THAT(registry.troubles(), IsEmpty());
}

TEST(TheSecondOfTwoRecordsForOneApplication, IsLeftOut) {
  const Records folder;
  folder.write("a.toml", entitledRecord("org.example.photos", "photos"));
  folder.write("b.toml", entitledRecord("org.example.photos", "other"));
  folder.write("c.toml", entitledRecord("org.example.thief", "photos"));
  ClientRecords records = readClientRecords({folder.path()});
  EXPECT_THAT(bundleIDs(records), ElementsAre("org.example.photos"));
  std::erase_if(records.troubles, [](const std::string& trouble) { return trouble.find("do not count") != std::string::npos; });
  EXPECT_THAT(records.troubles,
              ElementsAre(AllOf(HasSubstr("b.toml: "), HasSubstr("a.toml describes 'org.example.photos' already.")),
                          AllOf(HasSubstr("c.toml: "), HasSubstr("a.toml recognises the snap 'photos' already."))));
}

}  // namespace
}  // namespace palisade
