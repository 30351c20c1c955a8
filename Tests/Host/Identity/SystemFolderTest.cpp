#include "Host/Identity/SystemFolder.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <fstream>

#include "Tests/Host/Identity/CallerProcess.h"
#include "Tests/Host/TemporaryFolder.h"

// Every machine has folders and files that are root's alone: those in /etc. No test has to make them.

namespace palisade {
namespace {

using testing::HasSubstr;
using testing::Optional;

constexpr const char* folderOfRoot = "/etc";
constexpr const char* fileOfRoot = "passwd";
constexpr const char* folderOfLinks = "/etc/alternatives";

std::string troubleWith(const SystemFolder& folder, const std::string& name) {
  const SystemFolder::File opened = folder.open(name);
  EXPECT_TRUE(opened.file.isOpen()) << name << " is to be read in any case";
  return opened.trouble.value_or("");
}

class AFolderOfTheSystem : public testing::Test {
 protected:
  void SetUp() override {
    if (!hasNamespacesOfTheMachine()) GTEST_SKIP() << "This runs in a user namespace, where nothing is the system's.";
    struct stat status {};
    if (stat("/", &status) != 0 || status.st_uid != 0) GTEST_SKIP() << "The root folder here is not root's.";
  }
};

TEST_F(AFolderOfTheSystem, HasFilesThatAreRootsAlone) {
  const SystemFolder folder(folderOfRoot);
  EXPECT_EQ(folder.trouble(), std::nullopt);
  EXPECT_EQ(troubleWith(folder, fileOfRoot), "");
}

TEST_F(AFolderOfTheSystem, HasNoFilesBehindLinks) {
  const SystemFolder folder(folderOfLinks);
  if (folder.trouble()) GTEST_SKIP() << folderOfLinks << " is not here: " << *folder.trouble();
  for (const auto& entry : std::filesystem::directory_iterator(folderOfLinks)) {
    if (!entry.is_symlink() || !entry.is_regular_file()) continue;
    EXPECT_EQ(troubleWith(folder, entry.path().filename()), "it is a link") << entry.path();
    return;
  }
  GTEST_SKIP() << folderOfLinks << " has no link to a file.";
}

TEST_F(AFolderOfTheSystem, HasNoFilesThatAreElsewhere) {
  const SystemFolder folder(folderOfRoot);
  EXPECT_THAT(troubleWith(folder, "../etc/passwd"), HasSubstr("is a mount of its own"));
  EXPECT_THAT(troubleWith(folder, "/etc/passwd"), HasSubstr("is a mount of its own"));
  EXPECT_THAT(troubleWith(SystemFolder("/"), "proc/version"), HasSubstr("is a mount of its own"));
}

TEST_F(AFolderOfTheSystem, IsNoneOfAUser) {
  const TemporaryFolder folder;
  const bool isAUsers = geteuid() != 0 || chown(folder.path().c_str(), 65534, 65534) == 0;
  ASSERT_TRUE(isAUsers);
  EXPECT_THAT(SystemFolder(folder.path()).trouble(), Optional(HasSubstr("belongs to another user than root")));
}

TEST_F(AFolderOfTheSystem, IsNoneThatOthersMayWrite) {
  EXPECT_THAT(SystemFolder("/tmp").trouble(), Optional(HasSubstr("its folder is writable by others than root")));
}

TEST_F(AFolderOfTheSystem, IsNoneThatIsNotThere) {
  EXPECT_THAT(SystemFolder("/etc/palisade/no such folder").trouble(), Optional(HasSubstr("cannot be examined")));
}

// Has the kernel answer openat2 as one does that lacks it, in this process from now on.
bool refuseOpenat2() {
  std::array<sock_filter, 4> program = {{
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_openat2, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | ENOSYS),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  }};
  const sock_fprog filter{.len = program.size(), .filter = program.data()};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 && prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

TEST_F(AFolderOfTheSystem, HasNoFilesWhereTheKernelCannotOpenThemWithoutLinks) {
  const pid_t child = fork();
  if (child == 0) {
    if (!refuseOpenat2()) _exit(2);
    const SystemFolder folder(folderOfRoot);
    const SystemFolder::File opened = folder.open(fileOfRoot);
    const bool isRefused = opened.file.isOpen() && opened.trouble && opened.trouble->find("openat2") != std::string::npos;
    _exit(isRefused ? 0 : 1);
  }
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
}

TEST(AFolderInAUserNamespace, IsNoneOfTheSystemWhateverItSays) {
  const std::string output = outputOf("unshare --user --map-root-user --mount " TRIAL_PROGRAM " folder /etc");
  if (output.starts_with("unshare: ")) GTEST_SKIP() << "User namespaces are not allowed here: " << output;
  EXPECT_THAT(output, HasSubstr("runs in a user namespace"));
}

// What bindfs shows as root's is this user's own.
TEST(AFolderOfAUsersOwnFileSystem, IsNoneOfTheSystemWhateverItSays) {
  const TemporaryFolder folder;
  const auto source = folder.path() / "source";
  const auto shown = folder.path() / "shown";
  std::filesystem::create_directory(source);
  std::filesystem::create_directory(shown);
  std::ofstream(source / "photos.toml") << "name = 'Photos'\n";
  const std::string output =
      outputOf("bindfs --no-allow-other --force-user=0 --force-group=0 --perms=go-w " + source.string() + " " + shown.string());
  struct stat status {};
  const bool isMounted = output.empty() && stat((shown / "photos.toml").c_str(), &status) == 0;
  if (!isMounted) GTEST_SKIP() << "FUSE file systems cannot be mounted here: " << output;
  EXPECT_EQ(status.st_uid, 0U);
  {
    const SystemFolder system(shown);
    EXPECT_THAT(system.trouble(), Optional(HasSubstr(hasNamespacesOfTheMachine() ? "FUSE" : "user namespace")));
    EXPECT_NE(troubleWith(system, "photos.toml"), "");
  }
  EXPECT_EQ(outputOf("fusermount3 -u " + shown.string()), "");
}

}  // namespace
}  // namespace palisade
