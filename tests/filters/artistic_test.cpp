#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdlib>

#include "support/filter_models.h"

namespace picturezor {
namespace {

AreaFilter Oil(int levels, int range) {
  return {[=](const Picture& source, const Picture& dest) { return source.OilFilter(dest, levels, range); },
          [=](const Planar& source, Planar& dest) {
            const int classCount = std::clamp(levels, 1, 256), reach = std::clamp(range, 0, 40);
            for (int y = 0; y < source.Height; ++y)
              for (int x = 0; x < source.Width; ++x)
                for (int c = 0; c < source.Count; ++c) {
                  std::vector<int> counts(256), sums(256);
                  for (int row = std::max(y - reach, 0); row <= std::min(y + reach, source.Height - 1); ++row)
                    for (int column = std::max(x - reach, 0); column <= std::min(x + reach, source.Width - 1);
                         ++column) {
                      const int value = source(c, column, row);
                      ++counts[std::size_t(classCount * value / 256)];
                      sums[std::size_t(classCount * value / 256)] += value;
                    }
                  const auto best = std::ranges::max_element(counts) - counts.begin();
                  dest(c, x, y) = std::uint8_t(sums[std::size_t(best)] / counts[std::size_t(best)]);
                }
          },
          true, AreaFilter::ReadsWhatItWrote, false};
}

// The classes of values around each sample, in so few levels and such small neighbourhoods that there are
// ties, and neighbourhoods that the picture doesn't hold; on both sides of each change of form. The wide ones
// are done in several strips.
TEST(OilFilter, TakesTheMeanOfTheMostFrequentClass) {
  for (const int levels : {1, 5, 48, 49, 64, 65, 128, 129, 192, 193, 255, 256, 1000, 0, -4})
    for (const int range : {0, 1, 3, 4, 7, 8, 20, 2000, -1}) {
      SCOPED_TRACE(testing::Message() << levels << " levels, range " << range);
      ExpectLikeModelOnEveryTarget(Oil(levels, range), Format::RGBA, {{33, 21}});
    }
  for (const int levels : {20, 100, 256}) {
    SCOPED_TRACE(levels);
    ExpectLikeModelOnEveryTarget(Oil(levels, 3), Format::G, {{2049, 5}, {3, 3}, {4, 2}, {7, 1}});
    ExpectLikeModelOnEveryTarget(Oil(levels, 2), Format::BGRX, {{700, 5}});
  }
}

// Sums and counts at their largest.
TEST(OilFilter, LeavesAnEvenPictureAlone) {
  const Picture picture(20, 20, Format::RGB);
  for (const int value : {12, 255})
    for (const int levels : {1, 20, 200, 256})
      for (const int range : {3, 7, 8, 19}) {
        SetPacked(picture, Samples(1200, std::uint8_t(value)));
        ForEveryTarget([&] {
          EXPECT_EQ(Packed(picture.OilFilter({}, levels, range)), Samples(1200, std::uint8_t(value)))
              << levels << " " << range;
        });
      }
}

// More samples in a neighbourhood than 16 bits count.
TEST(OilFilter, TakesWideRanges) {
  const Picture picture = NoisePicture(300, 290, Format::G, 61);
  for (const int range : {127, 128}) {
    std::vector<int> counts(64), sums(64);
    const Samples pixels = Packed(picture);
    for (int y = 140 - range; y <= std::min(140 + range, 289); ++y)
      for (int x = 150 - range; x <= 150 + range; ++x) {
        const int value = pixels[std::size_t(y * 300 + x)];
        ++counts[std::size_t(value / 4)];
        sums[std::size_t(value / 4)] += value;
      }
    const auto best = std::size_t(std::ranges::max_element(counts) - counts.begin());
    EXPECT_EQ(Packed(picture.OilFilter({}, 64, range))[140 * 300 + 150], sums[best] / counts[best]) << range;
    // One class has all of a column's rows.
    const Picture even(3, 300, Format::G);
    even.FillRect(200);
    EXPECT_EQ(Packed(even.OilFilter({}, 64, range)), Samples(900, 200)) << range;
  }
}

TEST(OilFilter, WorksOnAllFormatsAndStores) {
  ExpectLikeModel(Oil(6, 1), {{6, 5}});
  ExpectLikeModel(Oil(256, 2), {{3, 6}});
}

// The places are drawn in the order of the pixels, the column before the row.
TEST(DiffuseFilter, TakesPixelsFromNearby) {
  for (const int level : {3, 0, -2, 1000})
    ExpectLikeModel({[=](const Picture& source, const Picture& dest) {
                       std::srand(7);
                       return source.DiffuseFilter(dest, level);
                     },
                     [=](const Planar& source, Planar& dest) {
                       std::srand(7);
                       const int reach = std::max(level, 0);
                       for (int y = 0; y < source.Height; ++y)
                         for (int x = 0; x < source.Width; ++x) {
                           const int dx = std::rand() % (2 * reach + 1) - reach;
                           const int dy = std::rand() % (2 * reach + 1) - reach;
                           for (int c = 0; c < source.Count; ++c)
                             dest(c, x, y) = source.Near(c, x + dx, y + dy);
                         }
                     },
                     false, AreaFilter::ReadsWhatItWrote},
                    {{6, 5}});
}

TEST(DiffuseFilter, TakesTheLargestLevel) {
  const Picture picture(2, 2, Format::G);
  SetPacked(picture, {1, 1, 1, 1});
  EXPECT_EQ(Packed(picture.DiffuseFilter({}, 2147483647)), Samples(4, 1));
}

AreaFilter Engrave(int level) {
  return {[=](const Picture& source, const Picture& dest) { return source.EngraveFilter(dest, level); },
          [=](const Planar& source, Planar& dest) {
            const int by = std::clamp(level, -1000, 1000);
            for (int y = 0; y < source.Height; ++y)
              for (int x = 0; x < source.Width; ++x)
                for (int c = 0; c < source.Count; ++c)
                  dest(c, x, y) = std::uint8_t(
                      std::clamp(source(c, x, y) - source.Near(c, x + by, y + by) + 128, 0, 255));
          },
          false, AreaFilter::ReadsWhatItWrote};
}

TEST(EngraveFilter, IsTheDifferenceToADiagonalNeighbour) {
  for (const int level : {1, 0, -2, 6, 2147483647, -2147483647 - 1}) {
    SCOPED_TRACE(level);
    ExpectLikeModel(Engrave(level), {{6, 5}});
  }
  ExpectLikeModelOnEveryTarget(Engrave(-1), Format::RGB, {{150, 3}});
}

std::uint8_t EdgeStrength(int sample, int below, int right) {
  const double e = (sample - below) * (sample - below) + (sample - right) * (sample - right);
  return std::uint8_t(std::min(float(std::sqrt(2 * e)), 255.f));
}

// What stands behind the last pixel: padding, the next pixel of the whole on a clip view, or nothing. It is
// looked up in the stored rows here.
TEST(NeonFilter, IsTheStrengthOfEdges) {
  for (const Format format : {Format::G, Format::AG, Format::RGB, Format::XBGR, Format::ARGB, Format::TwoOf3,
                              Format::CMYK, Format::AKYMC})
    for (const int width : {1, 16, 64, 71})
      ForEveryStore(width, 5, format, [&](const Picture& picture) {
        SetPacked(picture, Noise(64).Many(Packed(picture).size()));
        const std::vector<Samples> rows = StoredRows(picture);
        const int pixel = picture.PixelSize();
        const std::vector<PlacedPlane> planes = PlanesOf(picture);
        Planar wanted(width, 5, int(planes.size()));
        for (int c = 0; c < wanted.Count; ++c)
          for (int y = 0; y < 5; ++y)
            for (int x = 0; x < width; ++x) {
              const auto at = std::size_t(planes[std::size_t(c)].Offset + x * pixel),
                         right = at + std::size_t(pixel);
              const Samples& row = rows[std::size_t(y)];
              wanted(c, x, y) = EdgeStrength(row[at], y < 4 ? rows[std::size_t(y) + 1][at] : 0,
                                             right < row.size() ? row[right] : 0);
            }
        ForEveryTarget([&] { EXPECT_EQ(PlanesIn(picture.NeonFilter(), width, 5).Of, wanted.Of) << width; });
        const Picture dest(width + 1, 6, format);
        EXPECT_TRUE(picture.NeonFilter(dest) == dest);
        EXPECT_EQ(PlanesIn(dest, width, 5).Of, wanted.Of);
        EXPECT_TRUE(picture.NeonFilter(picture) == picture);
        EXPECT_EQ(PlanesIn(picture, width, 5).Of, wanted.Of) << "in place";
      });
}

TEST(NeonFilter, IsDarkInsideAnEvenPicture) {
  const Picture picture(64, 3, Format::G);  // without padding
  SetPacked(picture, Samples(3 * 64, 100));
  const Samples out = Packed(picture.NeonFilter());
  EXPECT_EQ(out[0], 0);
  EXPECT_EQ(out[63], 141);  // the root of 2 * 100 * 100
  EXPECT_EQ(out[2 * 64], 141);
  EXPECT_EQ(out[2 * 64 + 63], 200);
}

// Every strength that two differences can have.
TEST(NeonFilter, RoundsNoRootUp) {
  const Picture picture(256, 2, Format::G);
  for (int below = 0; below < 256; ++below) {
    Samples pixels(512, std::uint8_t(below));
    for (std::size_t x = 0; x < 256; x += 2) pixels[x] = std::uint8_t(x / 2 * 2 % 256), pixels[x + 1] = 0;
    SetPacked(picture, pixels);
    const Samples out = Packed(picture.NeonFilter());
    for (std::size_t x = 0; x < 255; ++x)
      ASSERT_EQ(out[x], EdgeStrength(pixels[x], below, pixels[x + 1])) << x << " " << below;
  }
}

}
}
