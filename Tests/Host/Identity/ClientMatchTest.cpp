#include "Host/Identity/ClientMatch.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

namespace palisade {
namespace {

TEST(TwoRecords, ShareAMatchWhenOneCallerCouldFitBoth) {
  struct Case {
    ClientMatch one, other;
    bool isShared;
  };
  const std::vector<Case> cases = {
      {{.flatpak = "org.example.X"}, {.flatpak = "org.example.X"}, true},
      {{.flatpak = "org.example.X"}, {.flatpak = "org.example.Y"}, false},
      {{.flatpak = "x"}, {.snap = "x"}, false},
      {{.snap = "x"}, {.snap = "x", .executable = "/usr/bin/x"}, true},
      {{.executable = "/usr/bin/x"}, {.executable = "/usr/bin/x"}, true},
      {{.executable = "/usr/bin/x"}, {.executable = "/usr/bin/y"}, false},
      {{.unit = "x"}, {.unit = "x"}, true},
      {{.unit = "x", .executable = "/usr/bin/x"}, {.unit = "x"}, true},
      {{.unit = "x", .executable = "/usr/bin/x"}, {.unit = "x", .executable = "/usr/bin/x"}, true},
      {{.unit = "x", .executable = "/usr/bin/x"}, {.unit = "x", .executable = "/usr/bin/y"}, false},
      // One interpreter may run two applications, each in a unit of its own.
      {{.unit = "x", .executable = "/usr/bin/python3"}, {.unit = "y", .executable = "/usr/bin/python3"}, false},
      {{.unit = "x", .executable = "/usr/bin/x"}, {.executable = "/usr/bin/x"}, false},
      {{}, {}, false},
  };
  for (std::size_t index = 0; index < cases.size(); ++index) {
    const auto& [one, other, isShared] = cases[index];
    EXPECT_EQ(sharedMatch(one, other).has_value(), isShared) << "case " << index;
    EXPECT_EQ(sharedMatch(other, one).has_value(), isShared) << "case " << index;
  }
}

TEST(ARecord, IsAsCertainAsItsWeakestWayIn) {
  EXPECT_EQ((ClientMatch{.flatpak = "org.example.X", .snap = "x"}.weakestClass()), ClientClass::sandboxed);
  EXPECT_EQ((ClientMatch{.flatpak = "org.example.X", .unit = "x"}.weakestClass()), ClientClass::unit);
  EXPECT_EQ((ClientMatch{.unit = "x", .executable = "/usr/bin/x"}.weakestClass()), ClientClass::unit);
  EXPECT_EQ((ClientMatch{.flatpak = "org.example.X", .executable = "/usr/bin/x"}.weakestClass()), ClientClass::bare);
}

TEST(AClientClass, HasAName) {
  EXPECT_EQ(nameOf(ClientClass::sandboxed), "sandboxed");
  EXPECT_EQ(nameOf(ClientClass::unit), "unit");
  EXPECT_EQ(nameOf(ClientClass::bare), "bare");
}

}  // namespace
}  // namespace palisade
