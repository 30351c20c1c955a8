#pragma once

/// Runs a piece of a test in a process of its own, where nothing has been set up that is set up once a process.
///
/// The body makes its own platform and scene. What it expects in vain fails the test, with the failures in its output. Threads:
/// called on the test's thread.

#include <cstdlib>
#include <functional>
#include <iostream>

#include <gtest/gtest.h>

namespace palisade {

[[noreturn]] inline void exitWithResultOf(const std::function<void()>& body) {
  body();
  const ::testing::TestResult& result = *::testing::UnitTest::GetInstance()->current_test_info()->result();
  for (int part = 0; part < result.total_part_count(); ++part) {
    const ::testing::TestPartResult& failure = result.GetTestPartResult(part);
    std::cerr << failure.file_name() << ':' << failure.line_number() << ": " << failure.message() << '\n';
  }
  std::exit(result.Failed() ? EXIT_FAILURE : EXIT_SUCCESS);
}

inline void inFreshProcess(const std::function<void()>& body) {
  // A new process, not a copy of this one: a copy would hold what earlier tests set up.
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(exitWithResultOf(body), ::testing::ExitedWithCode(EXIT_SUCCESS), "");
}

}  // namespace palisade
