// Tests of what a process can have only once: each such body runs in a process of its own.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <functional>
#include <string>

namespace Host::Testing {

// Prints the failed expectations of this process on standard error, where the test that waits shows them.
inline void TellFailures() {
  const testing::TestResult& result = *testing::UnitTest::GetInstance()->current_test_info()->result();
  for (int i = 0; i < result.total_part_count(); ++i) {
    const testing::TestPartResult& part = result.GetTestPartResult(i);
    if (part.failed()) {
      std::fprintf(stderr, "%s:%d: %s\n", part.file_name(), part.line_number(), part.message());
    }
  }
}

// Runs the body in a child and checks how that ends: with 0 when no expectation of the body failed, unless
// the body ends it otherwise. `onStandardError` is a regular expression for what the child prints there.
inline void InOwnProcess(const std::function<void()>& body, int status = 0,
                         const std::string& onStandardError = "") {
  EXPECT_EXIT(
      {
        body();
        TellFailures();
        std::fflush(nullptr);
        _exit(testing::Test::HasFailure() ? 1 : 0);
      },
      testing::ExitedWithCode(status), onStandardError);
}

}  // namespace Host::Testing
