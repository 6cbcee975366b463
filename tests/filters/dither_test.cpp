#include "support/filter_models.h"

namespace picturezor {
namespace {

/// The cells of a matrix, told from outside: with two levels a sample goes to 255 where its cell lies below
/// its rest, so the lowest white sample of each column and row gives the cell away.
std::vector<int> LowestWhite(DitherMatrix matrix, int side) {
  std::vector<int> lowest(std::size_t(side * side), 256);
  for (int v = 255; v >= 0; --v) {
    const Picture flat(side, side, Format::G);
    SetPacked(flat, Samples(std::size_t(side * side), std::uint8_t(v)));
    const Samples result = Packed(flat.DitherFilter({}, matrix, 2));
    for (std::size_t i = 0; i < result.size(); ++i)
      if (result[i] == 255) lowest[i] = v;
  }
  return lowest;
}

struct Case {
  DitherMatrix Matrix;
  int Side;
  std::vector<int> FirstRow;
  int Sum, Weighted;
};
/// The first row of cells, and the sums that all cells make of what LowestWhite gives, for a wrong digit.
const Case Cases[] = {
    {DitherMatrix::Magic2x2, 2, {0, 2}, 514, 873},
    {DitherMatrix::Magic4x4, 4, {0, 14, 3, 13}, 2056, 15420},
    {DitherMatrix::Ordered4x4, 4, {0, 8, 2, 10}, 2056, 16860},
    {DitherMatrix::Lines4x4, 4, {0, 1, 2, 3}, 2056, 20520},
    {DitherMatrix::Halftone90_6x6, 6, {29, 18, 12, 19, 30, 34}, 4659, 88672},
    {DitherMatrix::Ordered6x6, 6, {1, 59, 15, 55, 2, 56}, 6534, 117426},
    {DitherMatrix::Ordered8x8, 8, {1, 235, 59, 219, 15, 231, 55, 215}, 14344, 470000},
    {DitherMatrix::Cluster3, 6, {9, 11, 10, 8, 6, 7}, 2382, 41649},
    {DitherMatrix::Cluster4, 8, {18, 20, 19, 16, 13, 11, 12, 15}, 4192, 132048},
    {DitherMatrix::Cluster8,
     16,
     {64, 69, 77, 87, 86, 76, 68, 67, 63, 58, 50, 40, 41, 51, 59, 60},
     16512,
     2105280},
};

/// The lowest v with cell < (side^2 + 1) v / 256.
int LowestAbove(int cell, int side) {
  for (int v = 0; v < 256; ++v)
    if (cell < (side * side + 1) * v / 256) return v;
  return 256;
}

TEST(DitherFilter, HasItsMatrices) {
  for (const auto& [matrix, side, firstRow, sum, weighted] : Cases) {
    SCOPED_TRACE(int(matrix));
    const std::vector<int> lowest = LowestWhite(matrix, side);
    for (std::size_t x = 0; x < firstRow.size(); ++x)
      EXPECT_EQ(lowest[x], LowestAbove(firstRow[x], side)) << x;
    int s = 0, w = 0;
    for (std::size_t i = 0; i < lowest.size(); ++i) {
      s += lowest[i];
      w += int(i) * lowest[i];
    }
    EXPECT_EQ(s, sum);
    EXPECT_EQ(w, weighted);
  }
}

TEST(DitherFilter, PicksTheLevelByThePlace) {
  for (const auto& [matrix, side, firstRow, sum, weighted] : Cases)
    for (const int levels : {2, 5, 256}) {
      SCOPED_TRACE(testing::Message() << int(matrix) << ' ' << levels);
      const std::vector<int> lowest = LowestWhite(matrix, side);
      const PointFilter filter{[&, matrix = matrix](const Picture& s, const Picture& d) {
                                 return s.DitherFilter(d, matrix, levels);
                               },
                               [&, side = side](Plane, std::uint8_t v, int x, int y) {
                                 const bool above = v >= lowest[std::size_t(y % side * side + x % side)];
                                 return std::uint8_t(255 * ((levels - 1) * v / 256 + above) / (levels - 1));
                               }};
      // All of it with one matrix, whose side divides no vector.
      if (matrix == DitherMatrix::Ordered6x6 && levels == 5) ExpectPointFilter(filter);
      for (const Format format : {Format::G, Format::GA, Format::RGB, Format::BGRX, Format::ARGB})
        ForEveryTarget([&] {
          const Picture picture = NoisePicture(150, 17, format, 91);
          const Picture blank(150, 17, format);
          ASSERT_EQ(StoredRows(picture.DitherFilter({}, matrix, levels)), WantedRows(filter, picture, blank));
        });
      if (HasFailure()) return;
    }
}

TEST(DitherFilter, TakesAnyNumbers) {
  const Picture picture = NoisePicture(20, 20, Format::RGB, 92);
  const auto dithered = [&](int levels) {
    return Packed(picture.DitherFilter({}, DitherMatrix::Cluster8, levels));
  };
  for (const int levels : {1, 0, -1, -2147483647 - 1}) EXPECT_EQ(dithered(levels), dithered(2));
  for (const int levels : {257, 2147483647}) EXPECT_EQ(dithered(levels), dithered(256));
  for (const int matrix : {0, -1, 11, 2147483647, -2147483647 - 1}) {
    ExpectUntouched(picture, [matrix = matrix](const Picture& source, const Picture& dest) {
      return source.DitherFilter(dest, DitherMatrix(matrix), 2);
    });
  }
}

}
}
