#include <gtest/gtest.h>

#include "support/every_store.h"

// Run under the thread sanitizer too.

namespace picturezor {
namespace {

struct Scaling {
  Picture Source{160, 170, Format::RGBA}, Dest{120, 130, Format::RGBA};
  explicit Scaling(unsigned seed) { FillWithNoise(Source, seed); }
  std::vector<Samples> Plain() const {
    EXPECT_TRUE(Dest.Scale(Source, {}, Kernel::Lanczos3, 120, 130));
    return StoredRows(Dest);
  }
  std::vector<Samples> OnThreads(int threads) const {
    EXPECT_TRUE(Dest.ScaleMT(threads, Source, {}, Kernel::Lanczos3, 120, 130));
    return StoredRows(Dest);
  }
};

// Catches a worker that is given a second work before the first one is done, and a result that depends on who
// did which rows.
TEST(Threads, AScaleMayComeWhileAnotherOneRuns) {
  const Scaling outer(1), inner(2);
  const std::vector<Samples> outerRows = outer.Plain(), innerRows = inner.Plain();
  int depth = 0, nested = 0;
  Host::OnYield([&] {
    if (depth > 0) return;
    ++depth;
    ++nested;
    EXPECT_EQ(inner.OnThreads(3), innerRows);
    --depth;
  });
  for (int tries = 0; nested == 0 && tries < 1000; ++tries)
    for (const int threads : {4, 1, 32, 0}) {
      for (const Picture* picture : {&outer.Source, &outer.Dest, &inner.Source}) picture->SetYieldTicks(1);
      EXPECT_EQ(outer.OnThreads(threads), outerRows) << threads << " threads";
    }
  Host::OnYield({});
  EXPECT_GT(nested, 0) << "nothing yielded";
}

}
}
