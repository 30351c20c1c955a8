// The process is killed, or the power goes, while it writes. What it has acknowledged has to be there afterwards, and of the
// change that it was making all or nothing.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "Tests/Host/Store/AccountStoreFixture.h"
#include "Tests/Host/Store/ChildProcess.h"
#include "Tests/Host/Store/DiskFaults.h"

namespace palisade {
namespace {

using testing::AnyOf;
using testing::Optional;

void require(const std::optional<Error>& error) {
  if (error) throw std::runtime_error(error->description.value_or("no description"));
}

enum class End { kill, powerCut };

class AKilledProcess : InMemory, public AccountStoreFixture, public testing::WithParamInterface<End> {
 protected:
  // A history of changes; after change n the client "one" has state n.
  static constexpr int changeCount = 4;

  void change(int number) {
    if (number == changeCount) {
      require(store->removeAllClientAuthorizationsForAccountType(facebookType));
    } else {
      require(set("one", number == 3 ? refusal : grantNumber(number)));
    }
  }

  static std::optional<RecordContent> state(int number) {
    if (number == 0 || number == changeCount) return std::nullopt;
    return number == 3 ? refusal : grantNumber(number);
  }
};

TEST_P(AKilledProcess, LosesNothingItAcknowledgedAndHalvesNothing) {
  disk::watch(folder.path());
  disk::keepSyncedCopies(GetParam() == End::powerCut);

  int kills = 0;
  for (std::size_t call = 1;; ++call) {
    SCOPED_TRACE("killed at call " + std::to_string(call));
    store.reset();
    std::filesystem::remove_all(path.parent_path());
    restart();
    store.reset();

    ChildProcess child([&](const ChildProcess::Acknowledge& acknowledge) {
      disk::order(disk::Fault::kill, call);
      restart();
      for (int number = 1; number <= changeCount; ++number) {
        change(number);
        acknowledge();
      }
      store.reset();
    });
    const ChildProcess::End end = child.wait();
    if (GetParam() == End::powerCut) disk::cutPower(path.parent_path());

    restart();
    EXPECT_THAT(get("one"), AnyOf(state(end.acknowledgements), state(std::min(end.acknowledgements + 1, changeCount))));
    EXPECT_EQ(set("two", grantNumber(2)), std::nullopt) << "the store goes on";
    if (!end.wasKilled) {
      EXPECT_EQ(end.acknowledgements, changeCount);
      break;
    }
    ++kills;
    ASSERT_FALSE(HasFailure());
  }
  EXPECT_GE(kills, 10);
}

INSTANTIATE_TEST_SUITE_P(Ends, AKilledProcess, testing::Values(End::kill, End::powerCut),
                         [](const auto& each) { return each.param == End::kill ? "Kill" : "PowerCut"; });

class AWriter : public AccountStoreFixture {};

TEST_F(AWriter, KilledAgainAndAgainLosesNothingItAcknowledged) {
  std::mt19937 random(1);
  int written = 0;
  for (int round = 0; round < 50; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    store.reset();
    ChildProcess child([&](const ChildProcess::Acknowledge& acknowledge) {
      restart();
      for (int number = written + 1;; ++number) {
        require(set("client " + std::to_string(number % 7), grantNumber(number)));
        acknowledge();
      }
    });
    child.waitForAcknowledgements(std::uniform_int_distribution(0, 10)(random));
    child.kill();
    const ChildProcess::End end = child.wait();
    ASSERT_TRUE(end.wasKilled);
    written += end.acknowledgements;

    restart();
    for (int number = std::max(1, written - 6); number <= written; ++number) {
      const bool mayBeReplaced = number == written - 6;  // by the change that was being made
      const auto record = get("client " + std::to_string(number % 7));
      EXPECT_THAT(record, AnyOf(Optional(grantNumber(number)),
                                Optional(mayBeReplaced ? grantNumber(written + 1) : grantNumber(number))));
    }
    for (const StoredAuthorization& stored : store->storedAuthorizations(facebookType.identifier())) {
      EXPECT_FALSE(stored.isDamaged);
    }
    // The change that was being made counts as made when it is there.
    if (get("client " + std::to_string((written + 1) % 7)) == grantNumber(written + 1)) ++written;
    ASSERT_FALSE(HasFailure());
  }
}

TEST_F(AWriter, SharesTheStoreWithAnotherProcess) {
  store.reset();
  constexpr int writes = 40;
  const auto writeAll = [&](const std::string& name) {
    return [&, name](const ChildProcess::Acknowledge&) {
      restart();
      for (int number = 0; number < writes; ++number) require(set(name + std::to_string(number), grantNumber(number)));
    };
  };
  ChildProcess one(writeAll("one"));
  ChildProcess two(writeAll("two"));
  EXPECT_EQ(one.wait().exitStatus, 0);
  EXPECT_EQ(two.wait().exitStatus, 0);

  restart();
  for (int number = 0; number < writes; ++number) {
    EXPECT_THAT(get("one" + std::to_string(number)), Optional(grantNumber(number)));
    EXPECT_THAT(get("two" + std::to_string(number)), Optional(grantNumber(number)));
  }
}

TEST_F(AWriter, MakesANewStoreTogetherWithAnotherProcess) {
  for (int round = 0; round < 20; ++round) {
    store.reset();
    std::filesystem::remove_all(path.parent_path());
    const auto writeOne = [&](const std::string& name) {
      return [&, name](const ChildProcess::Acknowledge&) {
        restart();
        require(set(name, grantNumber(1)));
      };
    };
    ChildProcess one(writeOne("one"));
    ChildProcess two(writeOne("two"));
    ASSERT_EQ(one.wait().exitStatus, 0);
    ASSERT_EQ(two.wait().exitStatus, 0);
    restart();
    ASSERT_THAT(get("one"), Optional(grantNumber(1)));
    ASSERT_THAT(get("two"), Optional(grantNumber(1)));
  }
}

}  // namespace
}  // namespace palisade
