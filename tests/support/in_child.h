#pragma once
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <functional>

namespace picturezor {

/// Runs the body in a child process, and fails with what it says where an expectation in it failed.
inline void InChild(const std::function<void()>& body) {
  const auto run = [&] {
    const testing::TestResult& result = *testing::UnitTest::GetInstance()->current_test_info()->result();
    const int before = result.total_part_count();
    body();
    for (int i = before; i < result.total_part_count(); ++i) {
      const testing::TestPartResult& part = result.GetTestPartResult(i);
      std::fprintf(stderr, "%s:%d: %s\n", part.file_name() ? part.file_name() : "", part.line_number(),
                   part.message());
    }
    const int code = result.total_part_count() > before ? 1 : 0;
#ifdef PICTUREZOR_COVERAGE
    std::exit(code);  // which writes the counters
#endif
    // At once: an exception that can't be raised is nobody's to free, and no leak of the module's.
    std::fflush(nullptr);
    std::_Exit(code);
  };
  EXPECT_EXIT(run(), testing::ExitedWithCode(0), "");
}

}
