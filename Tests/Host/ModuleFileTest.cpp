#include "Host/Daemon/ModuleFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <link.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstddef>
#include <filesystem>
#include <random>
#include <string>
#include <string_view>

#include "Host/Daemon/PluginLoader.h"
#include "Tests/Host/ModuleFolder.h"
#include "Tests/Host/OwnRoot.h"

using namespace palisade;
using testing::AllOf;
using testing::AnyOf;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

constexpr std::size_t step = 64;

std::string quoted(const std::filesystem::path& path) { return std::string("'").append(path.string()).append("'"); }

template <typename Number>
std::string withNumber(const std::string& bytes, std::size_t offset, Number number) {
  const std::string_view numberBytes(reinterpret_cast<const char*>(&number), sizeof number);
  return bytes.substr(0, offset).append(numberBytes).append(bytes, offset + sizeof number, std::string::npos);
}

std::string withoutSectionTable(const std::string& bytes) {
  return withNumber<Elf64_Half>(withNumber<Elf64_Off>(bytes, offsetof(Elf64_Ehdr, e_shoff), 0), offsetof(Elf64_Ehdr, e_shnum),
                                0);
}

}  // namespace

TEST(APathThatIsNoModule, IsRefused) {
  const ModuleFolder folder;
  const std::string good = moduleBytes("good");
  const std::filesystem::path pipe = folder.path() / "pipe.so";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  const std::filesystem::path loop = folder.path() / "loop.so";
  std::filesystem::create_symlink(loop, loop);
  const std::filesystem::path dangling = folder.path() / "dangling.so";
  std::filesystem::create_symlink(folder.path() / "gone.so", dangling);

  const struct {
    std::filesystem::path file;
    const char* problem;
  } cases[] = {
      {"", "its path cannot be followed"},
      {folder.path() / "missing.so", "there is no such file"},
      {folder.install("good") / "below.so", "there is no such file"},
      {dangling, "there is no such file"},
      {loop, "its path cannot be followed"},
      {folder.path(), "it is not a regular file"},
      {pipe, "it is not a regular file"},
      {"/dev/null", "it is not a regular file"},
      {folder.write("empty.so", ""), "it is not a shared object"},
      {folder.write("text.so", "not a module at all, but long enough to hold a header of sixty-four bytes"),
       "it is not a shared object"},
      {folder.write("magic.so", good.substr(0, 4)), "it is cut off"},
      {folder.write("otherClass.so", withNumber<char>(good, EI_CLASS, ELFCLASS32)), "another kind of machine"},
      {folder.write("otherOrder.so", withNumber<char>(good, EI_DATA, ELFDATA2MSB)), "another kind of machine"},
      {folder.write("otherMachine.so", withNumber<Elf64_Half>(good, offsetof(Elf64_Ehdr, e_machine), EM_S390)),
       "another kind of machine"},
      {folder.write("object.so", withNumber<Elf64_Half>(good, offsetof(Elf64_Ehdr, e_type), ET_REL)), "not a shared object"},
      {folder.write("noSegments.so", withNumber<Elf64_Half>(good, offsetof(Elf64_Ehdr, e_phnum), 0)),
       "its program headers are damaged"},
      {folder.write("oddSegments.so", withNumber<Elf64_Half>(good, offsetof(Elf64_Ehdr, e_phentsize), 8)),
       "its program headers are damaged"},
      {folder.write("farSegments.so", withNumber<Elf64_Off>(good, offsetof(Elf64_Ehdr, e_phoff), ~Elf64_Off{7})),
       "it is cut off"},
      {folder.write("farSections.so", withNumber<Elf64_Off>(good, offsetof(Elf64_Ehdr, e_shoff), ~Elf64_Off{7})),
       "it is cut off"},
  };
  for (const auto& [file, problem] : cases) {
    SCOPED_TRACE(file);
    EXPECT_THAT(refusalOf(file), AllOf(HasSubstr(quoted(file)), HasSubstr(problem)));
  }
}

TEST(AModuleThatOthersCanWrite, IsRefused) {
  const ModuleFolder folder;
  const std::filesystem::path file = folder.install("good");
  for (const mode_t mode : {0664U, 0646U, 0666U, 0777U}) {
    SCOPED_TRACE(mode);
    ASSERT_EQ(chmod(file.c_str(), mode), 0);
    EXPECT_THAT(refusalOf(file), HasSubstr("it is writable by other users"));
  }
  ASSERT_EQ(chmod(file.c_str(), 0755), 0);
  EXPECT_THAT(refusalOf(file), IsEmpty());
}

TEST(AModuleInAFolderThatOthersCanWrite, IsRefused) {
  const ModuleFolder folder;
  const std::filesystem::path file = folder.install("good");
  for (const mode_t mode : {0777U, 0775U, 01777U}) {
    SCOPED_TRACE(mode);
    ASSERT_EQ(chmod(folder.path().c_str(), mode), 0);
    EXPECT_THAT(refusalOf(file), HasSubstr("its folder " + quoted(folder.path()) + " is writable by other users"));
  }
}

TEST(AModuleBelowAFolderThatOthersCanWrite, IsRefused) {
  const ModuleFolder folder;
  const std::filesystem::path below = folder.path() / "above" / "plugins";
  std::filesystem::create_directories(below);
  const std::filesystem::path file = below / "good.so";
  std::filesystem::copy_file(folder.install("good"), file);
  for (const std::filesystem::path& above : {folder.path() / "above", folder.path()}) {
    for (const mode_t mode : {0777U, 0757U}) {
      SCOPED_TRACE(mode);
      ASSERT_EQ(chmod(above.c_str(), mode), 0);
      EXPECT_THAT(refusalOf(file), AllOf(HasSubstr("the folder " + quoted(above) + " above it is writable by other users"),
                                         HasSubstr("chmod go-w")));
    }
    // There nobody can take the place of a folder of this user's.
    ASSERT_EQ(chmod(above.c_str(), 01777), 0);
    EXPECT_THAT(refusalOf(file), IsEmpty());
    ASSERT_EQ(chmod(above.c_str(), 0755), 0);
  }
}

TEST(AModuleBelowAFolderThatAGroupCanWrite, IsRefusedUnlessTheGroupIsItsUsersAlone) {
  if (ranWithItsOwnRoot()) return;
  const ModuleFolder folder;
  const std::filesystem::path below = folder.path() / "plugins";
  std::filesystem::create_directories(below);
  const std::filesystem::path file = below / "good.so";
  std::filesystem::copy_file(folder.install("good"), file);
  ASSERT_EQ(chmod(folder.path().c_str(), 0775), 0);
  EXPECT_THAT(refusalOf(file), IsEmpty());
  constexpr gid_t ofOthers = 1;
  ASSERT_EQ(chown(folder.path().c_str(), 0, ofOthers), 0);
  EXPECT_THAT(refusalOf(file), HasSubstr("the folder " + quoted(folder.path()) + " above it is writable by other users"));
}

TEST(AModuleBelowAFolderOfAnotherUser, IsRefused) {
  if (ranWithItsOwnRoot()) return;
  const ModuleFolder folder;
  const std::filesystem::path below = folder.path() / "plugins";
  std::filesystem::create_directories(below);
  std::filesystem::copy_file(folder.install("good"), below / "good.so");
  constexpr uid_t somebody = 1;
  ASSERT_EQ(chown(folder.path().c_str(), somebody, somebody), 0);
  EXPECT_THAT(refusalOf(below / "good.so"),
              HasSubstr("the folder " + quoted(folder.path()) + " above it belongs to another user"));
}

TEST(AModuleOfAnotherUser, IsRefused) {
  if (ranWithItsOwnRoot()) return;
  const ModuleFolder folder;
  const std::filesystem::path file = folder.install("good");
  ASSERT_EQ(chown(file.c_str(), 65534, 65534), 0);
  EXPECT_THAT(refusalOf(file), HasSubstr("it belongs to another user (user ID 65534)"));
  ASSERT_EQ(chown(file.c_str(), 0, 0), 0);
  ASSERT_EQ(chown(folder.path().c_str(), 65534, 65534), 0);
  EXPECT_THAT(refusalOf(file), HasSubstr("its folder " + quoted(folder.path()) + " belongs to another user"));
}

TEST(AModuleThatWasCutOff, IsRefusedAtEveryLength) {
  const ModuleFolder folder;
  const std::string good = moduleBytes("good");
  for (std::size_t length = 0; length < good.size(); length += step) {
    ASSERT_THAT(refusalOf(folder.write("cut.so", good.substr(0, length))),
                AnyOf(HasSubstr("it is cut off or damaged"), HasSubstr("it is not a shared object")))
        << length;
  }
  ASSERT_THAT(refusalOf(folder.write("cut.so", good.substr(0, good.size() - 1))), HasSubstr("it is cut off or damaged"));
  EXPECT_THAT(refusalOf(folder.write("whole.so", good)), IsEmpty());
}

TEST(AModuleWithoutASectionTable, MayLackOnlyWhatIsNotLoaded) {
  const ModuleFolder folder;
  const std::string good = withoutSectionTable(moduleBytes("good"));
  std::size_t loaded = 0;
  for (std::size_t length = 0; length < good.size() + step; length += step) {
    // A loaded module stays mapped, so each length is a file of its own.
    const std::filesystem::path file = folder.write(std::to_string(length) + ".so", good.substr(0, length));
    if (loaded == 0 && !refusalOf(file).empty()) continue;
    ++loaded;
    ASSERT_TRUE(loadPlugin(file).module->supportsAccountTypeWithIdentifier("supported")) << length;
  }
  EXPECT_GT(loaded, 1U);
  EXPECT_LT(loaded * step, good.size());
}

TEST(ADamagedHeader, NeverMakesTheCheckFailInAnotherWay) {
  const ModuleFolder folder;
  const std::string good = moduleBytes("good");
  std::mt19937 random(20251121);
  int refused = 0;
  for (int round = 0; round < 2'000; ++round) {
    std::string bytes = good;
    for (unsigned change = random() % 4 + 1; change > 0; --change) bytes[random() % 0x300] = static_cast<char>(random());
    const std::filesystem::path file = folder.write("damaged.so", bytes);
    try {
      checkModuleFile(file);
    } catch (const PluginLoadError&) {
      ++refused;
    }
  }
  EXPECT_GT(refused, 200);
}
