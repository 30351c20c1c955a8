#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <memory>
#include <string>
#include <string_view>

#include "Host/Secrets/ProcessSecrecy.h"
#include "Host/Secrets/Wipe.h"
#include "Host/Secrets/WipingMemory.h"

namespace palisade {
namespace {

using testing::Each;

#if defined __SANITIZE_ADDRESS__ || defined __SANITIZE_THREAD__
constexpr bool isSanitized = true;
#else
constexpr bool isSanitized = false;
#endif

// What the program prints: how many pieces of a secret that it has given back are in its memory.
int piecesLeftBy(const std::string& program) {
  const std::unique_ptr<FILE, int (*)(FILE*)> output(popen(program.c_str(), "r"), pclose);
  int pieces = -1;
  EXPECT_EQ(std::fscanf(output.get(), "%d", &pieces), 1) << program;
  return pieces;
}

class ASecretThatWasGivenBack : public testing::Test {
 protected:
  void SetUp() override {
    if (isSanitized) GTEST_SKIP() << "a sanitizer's memory is too large to search, and keeps what lay on the stack";
  }
};

TEST_F(ASecretThatWasGivenBack, IsNowhereInTheProcess) { EXPECT_EQ(piecesLeftBy(CANARY_PROGRAM), 0); }

TEST_F(ASecretThatWasGivenBack, IsFoundWithoutTheWipingOperators) { EXPECT_GT(piecesLeftBy(CANARY_PROGRAM_WITHOUT_WIPING), 0); }

TEST(Wiping, LeavesZerosInMemory) {
  std::array<char, 8> memory{'s', 'e', 'c', 'r', 'e', 't', '!', '!'};
  wipe(memory.data(), 7);
  EXPECT_EQ(memory, (std::array<char, 8>{0, 0, 0, 0, 0, 0, 0, '!'}));
}

// Leaves a secret behind in its frame, and says where.
[[gnu::noinline]] std::uintptr_t keepASecretOnTheStack() {
  volatile char frame[64 * 1024];
  for (volatile char& character : frame) character = 's';
  return reinterpret_cast<std::uintptr_t>(&frame[0]);
}

// How many words there hold nothing but the secret's character, by a way that the compiler does not see. What is called on the
// way leaves the character there as well, but not eight in a row.
std::ptrdiff_t secretsAt(std::uintptr_t place) {
  static std::array<std::uint64_t, 8 * 1024> content;
  const int memory = open("/proc/self/mem", O_RDONLY | O_CLOEXEC);
  const ssize_t size = pread(memory, content.data(), sizeof content, static_cast<off_t>(place));
  close(memory);
  EXPECT_EQ(size, static_cast<ssize_t>(sizeof content));
  return std::ranges::count(content, 0x7373737373737373U);
}

TEST(Wiping, ReachesWhatFunctionsHaveLeftOnTheStack) {
  const std::uintptr_t place = keepASecretOnTheStack();
  EXPECT_GT(secretsAt(place), 4 * 1024) << "there is something to be wiped";
  wipeDeadStack();
  EXPECT_EQ(secretsAt(place), 0);
}

TEST(Wiping, EmptiesATextAndWhatItHeldBefore) {
  std::string text(100, 's');
  text.resize(3);
  // The text stays where it is, so its memory may be looked at beyond its end.
  const std::string_view memory(text.data(), 100);
  wipe(text);
  EXPECT_TRUE(text.empty());
  EXPECT_THAT(memory, Each('\0'));
}

TEST(WipingMemory, KeepsTheContentOfABlockThatGrowsOrShrinks) {
  void* block = wipingMalloc(5);
  std::memcpy(block, "abcd", 5);
  for (const std::size_t size : {100U, 5U, 5000U, 5U}) {
    block = wipingRealloc(block, size);
    EXPECT_STREQ(static_cast<const char*>(block), "abcd") << size;
  }
  EXPECT_EQ(wipingRealloc(block, 0), nullptr);
  wipingFree(nullptr);
  EXPECT_NE(block = wipingRealloc(nullptr, 1), nullptr);
  wipingFree(block);
}

// Runs the check in a child, because it changes the process for good.
template <typename Check>
bool holdsInAChild(Check check) {
  const pid_t child = fork();
  if (child == 0) _exit(check() ? 0 : 1);
  int status = -1;
  waitpid(child, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST(AProcessThatKeepsToItself, CannotBeDumpedOrRead) {
  EXPECT_TRUE(holdsInAChild([] {
    dropDumpable();
    rlimit limit{};
    getrlimit(RLIMIT_CORE, &limit);
    return prctl(PR_GET_DUMPABLE) == 0 && limit.rlim_cur == 0 && limit.rlim_max == 0;
  }));
}

TEST(AProcessThatKeepsToItself, IsClosedToOthersOfTheSameUser) {
  // Root reads everything, so there both processes become another user's.
  const auto becomeOrdinary = [] { return geteuid() != 0 || setuid(65534) == 0; };
  int ready[2];
  ASSERT_EQ(pipe(ready), 0);
  int done[2];
  ASSERT_EQ(pipe(done), 0);
  const pid_t keeper = fork();
  if (keeper == 0) {
    if (!becomeOrdinary()) _exit(1);
    dropDumpable();
    char byte = 'r';
    if (write(ready[1], &byte, 1) != 1 || read(done[0], &byte, 1) != 1) _exit(1);
    _exit(0);
  }
  char byte = 0;
  ASSERT_EQ(read(ready[0], &byte, 1), 1);
  EXPECT_TRUE(holdsInAChild([&] {
    if (!becomeOrdinary()) return false;
    return !std::ifstream("/proc/" + std::to_string(keeper) + "/mem") &&
           !std::ifstream("/proc/" + std::to_string(keeper) + "/environ");
  }));
  ASSERT_EQ(write(done[1], &byte, 1), 1);
  waitpid(keeper, nullptr, 0);
}

}  // namespace
}  // namespace palisade
