#include "image/clip.h"

#include <gtest/gtest.h>

#include <cstdlib>

#include "support/every_store.h"

namespace picturezor {
namespace {

/// One axis by trying every line: which lines of the destination a block covers, and from where.
struct Lines {
  int First = 0, Count = 0, Source = 0;
};
Lines Tried(int at, int count, int source, int size, int sourceSize) {
  if (source < 0) {
    at += source;
    count += source;
    source = 0;
  }
  const int first = count < 0 ? at + count : at;
  Lines lines;
  for (int i = 0; i < std::abs(count); ++i) {
    const int dest = first + i, from = source + i;
    if (dest < 0 || dest >= size || from >= sourceSize) continue;
    if (lines.Count++ == 0) lines = {dest, 1, from};
  }
  return lines;
}

void Expect(const zor::Rectangle& is, const Lines& columns, const Lines& rows) {
  const bool empty = columns.Count == 0 || rows.Count == 0;
  EXPECT_EQ(is.Empty(), empty);
  if (empty) return;
  EXPECT_EQ(is.X, columns.First);
  EXPECT_EQ(is.Y, rows.First);
  EXPECT_EQ(is.Width, columns.Count);
  EXPECT_EQ(is.Height, rows.Count);
}

TEST(Clip, GivesTheLinesThatLieInside) {
  const Picture picture(5, 4, Format::G), source(6, 3, Format::G);
  Noise noise(31);
  for (int i = 0; i < 20000; ++i) {
    const auto some = [&] { return noise.Between(-9, 9); };
    const zor::Rectangle asked{some(), some(), some(), some()};
    const int sx = some(), sy = some();
    SCOPED_TRACE(testing::PrintToString(std::array{asked.X, asked.Y, asked.Width, asked.Height, sx, sy}));
    Expect(zor::FilterRect(DataOf(picture), asked), Tried(asked.X, asked.Width, 0, 5, 1000),
           Tried(asked.Y, asked.Height, 0, 4, 1000));
    const Lines columns = Tried(asked.X, asked.Width, sx, 5, 6),
                rows = Tried(asked.Y, asked.Height, sy, 4, 3);
    const zor::CopyBlock block = zor::CopyRect(DataOf(picture), DataOf(source), {asked, sx, sy});
    Expect(block.Dest, columns, rows);
    if (!block.Dest.Empty()) {
      EXPECT_EQ(block.SourceX, columns.Source);
      EXPECT_EQ(block.SourceY, rows.Source);
    }
    if (testing::Test::HasFailure()) break;
  }
}

// Catches sums that wrap round 32 bits.
TEST(Clip, TakesAnyNumbers) {
  const Picture picture(5, 4, Format::G);
  constexpr int Least = -0x7FFFFFFF - 1, Most = 0x7FFFFFFF;
  const auto& data = DataOf(picture);
  EXPECT_EQ(zor::FilterRect(data, {Most, 0, Most, 4}).Empty(), true);
  EXPECT_EQ(zor::FilterRect(data, {Least, 0, Most, 4}).Empty(), true);
  EXPECT_EQ(zor::FilterRect(data, {1, 1, Most, Most}).Width, 4);
  EXPECT_EQ(zor::FilterRect(data, {5, 4, Least, Least}).Height, 4);
  EXPECT_TRUE(zor::CopyRect(data, data, {{0, 0, Most, Most}, Least, Least}).Dest.Empty());
  EXPECT_TRUE(zor::CopyRect(data, data, {{0, 0, Most, Most}, Most, Most}).Dest.Empty());
  EXPECT_EQ(zor::CopyRect(data, data, {{Least, 0, Most, 4}, Least, 0}).Dest.Empty(), true);
}

}
}
