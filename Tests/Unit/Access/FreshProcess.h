#pragma once

/// Runs a piece of a test in a process of its own, where nothing has been set up that is set up once a process.
///
/// The body makes its own platform and scene. Its expectations are printed and counted like those of every test. Threads:
/// called on the test's thread.

#include <cstdlib>
#include <functional>

#include <gtest/gtest.h>

namespace palisade {

inline void inFreshProcess(const std::function<void()>& body) {
  // A new process, not a copy of this one: a copy would hold what earlier tests set up.
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        body();
        std::exit(::testing::Test::HasFailure() ? EXIT_FAILURE : EXIT_SUCCESS);
      },
      ::testing::ExitedWithCode(EXIT_SUCCESS), "");
}

}  // namespace palisade
