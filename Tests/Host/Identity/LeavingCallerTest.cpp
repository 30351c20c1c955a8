#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <thread>

#include "Tests/Host/Identity/Identify.h"
#include "Tests/Host/Identity/Records.h"
#include "Tests/Host/OwnRoot.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;
using testing::ThrowsMessage;

TEST(AConnectionThatBelongsToAnotherProcess, IsRefused) {
  const CallerProcess caller({CALLER_PROGRAM});
  const ClientRegistry registry({});
  EXPECT_THAT(
      [&] { identify(registry, caller.pid(), [] { return getpid(); }); },
      ThrowsMessage<IdentityError>(AllOf(HasSubstr(std::to_string(caller.pid())), HasSubstr(std::to_string(getpid())))));
  EXPECT_THAT([&] { identify(registry, caller.pid(), [] { return 0; }); },
              ThrowsMessage<IdentityError>(HasSubstr("process 0")));
}

TEST(AConnectionThatTheBusNoLongerKnows, IsRefused) {
  const CallerProcess caller({CALLER_PROGRAM});
  const ClientRegistry registry({});
  EXPECT_THAT([&] { identify(registry, caller.pid(), []() -> pid_t { throw std::runtime_error("no such name"); }); },
              ThrowsMessage<IdentityError>(HasSubstr("no such name")));
}

TEST(ACallerThatTheBusDoesNotKnow, IsRefused) {
  const ClientRegistry registry({});
  for (const pid_t process : {0, -1, -getpid()}) EXPECT_THAT(refusal(registry, process), HasSubstr("does not know"));
}

TEST(ACallerThatLeft, IsRefused) {
  const ClientRegistry registry({});
  CallerProcess caller({CALLER_PROGRAM});
  const pid_t process = caller.pid();
  caller.wait();
  EXPECT_THAT(refusal(registry, process), HasSubstr("cannot be pinned"));
}

TEST(ACallerThatLeavesWhileTheBusIsAsked, IsRefused) {
  const ClientRegistry registry({});
  CallerProcess caller({CALLER_PROGRAM});
  EXPECT_THROW(identify(registry, caller.pid(),
                        [&] {
                          caller.wait();
                          return caller.pid();
                        }),
               IdentityError);
}

TEST(ACallerThatIsDeadAndNotYetBuried, IsRefused) {
  const ClientRegistry registry({});
  const CallerProcess caller({CALLER_PROGRAM});
  caller.kill();
  EXPECT_NE(refusal(registry, caller.pid()), "");
}

TEST(ACallerThatLeavesAtAnyMoment, IsItselfOrRefused) {
  const Records folder;
  const auto photos = folder.copyProgram("photos");
  folder.writePhotos(Records::executable(photos));
  const ClientRegistry registry({folder.path()});
  int known = 0;
  for (int turn = 0; turn < 300; ++turn) {
    const CallerProcess caller({photos});
    std::atomic<bool> isBeingIdentified = false;
    std::thread killer([&] {
      while (!isBeingIdentified) std::this_thread::yield();
      for (std::atomic<int> step = 0; step < turn * 100; ++step) {
      }
      caller.kill();
    });
    // Look-ups follow each other without a gap, so the caller's end falls into the midst of one.
    bool isRefused = false;
    while (!isRefused) {
      isBeingIdentified = true;
      try {
        const auto client = identify(registry, caller.pid());
        EXPECT_EQ(client->id(), "org.example.photos");
        ++known;
      } catch (const IdentityError&) {
        isRefused = true;
      }
    }
    killer.join();
    EXPECT_NE(refusal(registry, caller.pid()), "");
  }
  EXPECT_GT(known, 0);
}

TEST(AProcessThatGotTheNumberOfACaller, IsRefused) {
  const std::string user = geteuid() == 0 ? "" : "--user --map-root-user ";
  const std::string output = outputOf("unshare " + user + "--pid --fork --mount-proc " TRIAL_PROGRAM " reuse 1000");
  if (output.starts_with("unshare: ")) GTEST_SKIP() << "Processes of a chosen number need a PID namespace: " << output;
  EXPECT_EQ(output, "reused 1000, refused 1000\n");
}

TEST(AProcessOfAnotherUser, IsRefused) {
  if (ranWithItsOwnRoot()) return;
  const TemporaryFolder folder;
  // The other user may not reach the folder in which this was built.
  const auto trial = folder.path() / "trial";
  std::filesystem::copy_file(TRIAL_PROGRAM, trial);
  std::filesystem::permissions(folder.path(), std::filesystem::perms(0755));
  const CallerProcess caller({CALLER_PROGRAM});
  EXPECT_THAT(outputOf("setpriv --reuid=65534 --regid=65534 --clear-groups " + trial.string() + " identify " +
                       std::to_string(caller.pid())),
              AllOf(StartsWith("refused: "), HasSubstr("its process to the user 0")));
}

}  // namespace
}  // namespace palisade
