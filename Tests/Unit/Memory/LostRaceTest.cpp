// A set of the catalogue that another thread fills while this one is filling it. Which of two threads comes first is not left
// to chance here: the other one comes in the middle of this one's first allocation.

#include <gtest/gtest.h>

#include "Facebook/Palisade/PermissionCatalogueSets.h"
#include "Tests/Unit/Memory/FailingAllocations.h"

namespace palisade {
namespace {

constexpr std::string_view names[] = {"email", "friends"};

LazilyFilledSet& contestedSet() {
  static LazilyFilledSet set;
  return set;
}

TEST(ASetThatAnotherThreadFillsMeanwhile, IsTheOneThatWasThereFirst) {
  static const PermissionSet* first = nullptr;
  interruptNextAllocation([] { first = &contestedSet().filledWith(names); });
  const PermissionSet* second = nullptr;
  {
    const CountedAllocations counted;
    second = &contestedSet().filledWith(names);
  }

  ASSERT_NE(first, nullptr);
  EXPECT_EQ(second, first);
  EXPECT_EQ(*second, (PermissionSet{"email", "friends"}));
  EXPECT_EQ(&contestedSet().filledWith(names), first);
}

}  // namespace
}  // namespace palisade
