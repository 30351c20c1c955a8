// The disk fails at every call that an operation makes, once or from then on. Whatever is answered has to be true.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <functional>

#include "Tests/Host/Store/AccountStoreFixture.h"
#include "Tests/Host/Store/DiskFaults.h"

namespace palisade {
namespace {

using testing::AnyOf;
using testing::Optional;

struct Failure {
  const char* name;
  disk::Fault fault;
  int errorNumber;
};

void PrintTo(const Failure& failure, std::ostream* stream) { *stream << failure.name; }

class AFailingDisk : InMemory, public AccountStoreFixture, public testing::WithParamInterface<Failure> {
 protected:
  AFailingDisk() { disk::watch(folder.path()); }
  ~AFailingDisk() override { disk::withdraw(); }

  // Lets the disk fail at call 1, 2, 3... of `operation`, until the operation gets by without a failure. `before` prepares each
  // attempt, `after` is told whether the operation said that it had succeeded. Answers how many attempts failed.
  int atEveryCall(const std::function<void()>& before, const std::function<bool()>& operation,
                  const std::function<void(bool success)>& after) {
    int failures = 0;
    for (std::size_t call = 1;; ++call) {
      SCOPED_TRACE("the disk fails at call " + std::to_string(call));
      before();
      disk::order(GetParam().fault, call, GetParam().errorNumber);
      const bool success = operation();
      const bool hasFailed = disk::withdraw();
      after(success);
      if (HasFailure() || !hasFailed) return failures;
      failures += success ? 0 : 1;
    }
  }
};

TEST_P(AFailingDisk, NeverMakesAnUnstoredGrantLookStored) {
  const int failures = atEveryCall([&] { ASSERT_EQ(set("one", grantNumber(1)), std::nullopt); },
                                   [&] { return set("one", grantNumber(2)) == std::nullopt; },
                                   [&](bool success) {
                                     EXPECT_THAT(get("one"), Optional(grantNumber(success ? 2 : 1)));
                                     restart();
                                     EXPECT_THAT(get("one"), Optional(grantNumber(success ? 2 : 1)));
                                   });
  EXPECT_GE(failures, 2) << "writing and syncing the log have to matter";
}

TEST_P(AFailingDisk, NeverMakesAStandingGrantLookRevoked) {
  const int failures =
      atEveryCall([&] { ASSERT_EQ(set("one", grantNumber(1)), std::nullopt); },
                  [&] { return store->removeAllClientAuthorizationsForAccountType(facebookType) == std::nullopt; },
                  [&](bool success) {
                    restart();
                    EXPECT_EQ(get("one"), success ? std::nullopt : std::optional(grantNumber(1)));
                  });
  EXPECT_GE(failures, 2);
}

TEST_P(AFailingDisk, LeavesAStoreThatWorksWhenTheDiskDoes) {
  atEveryCall([] {}, [&] { return set("one", grantNumber(1)) == std::nullopt; },
              [&](bool) {
                EXPECT_EQ(set("two", grantNumber(2)), std::nullopt);
                EXPECT_THAT(get("two"), Optional(grantNumber(2)));
              });
}

TEST_P(AFailingDisk, IsToldInTheError) {
  disk::order(GetParam().fault, 1, GetParam().errorNumber);
  const std::optional<Error> error = set("one", grantNumber(1));
  disk::withdraw();
  ASSERT_TRUE(error);
  EXPECT_EQ(error->domain, StoreErrorDomain);
  EXPECT_EQ(error->code, GetParam().errorNumber == ENOSPC ? StoreErrorFull : StoreErrorOther) << *error->description;
  EXPECT_THAT(error->description,
              Optional(testing::AllOf(testing::HasSubstr(path.string()), testing::HasSubstr("cannot store"))));
}

TEST_P(AFailingDisk, LeavesNoHalfMadeStore) {
  store.reset();
  atEveryCall([&] { std::filesystem::remove_all(path.parent_path()); },
              [&] {
                try {
                  restart();
                } catch (const SqliteError& error) {
                  EXPECT_THAT(error.code(), AnyOf(StoreErrorFull, StoreErrorOther, StoreErrorNotWritable)) << error.what();
                  return false;
                }
                return true;
              },
              [&](bool) {
                restart();
                EXPECT_EQ(set("one", grantNumber(1)), std::nullopt);
              });
}

INSTANTIATE_TEST_SUITE_P(Failures, AFailingDisk,
                         testing::Values(Failure{"fullOnce", disk::Fault::failsOnce, ENOSPC},
                                         Failure{"fullFromThenOn", disk::Fault::failsFromNow, ENOSPC},
                                         Failure{"brokenOnce", disk::Fault::failsOnce, EIO},
                                         Failure{"brokenFromThenOn", disk::Fault::failsFromNow, EIO}),
                         [](const auto& each) { return each.param.name; });

}  // namespace
}  // namespace palisade
