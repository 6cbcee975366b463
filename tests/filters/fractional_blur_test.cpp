#include <gtest/gtest.h>

#include <cmath>

#include "support/filter_models.h"

namespace picturezor {
namespace {

AreaFilter Blur(double radius) {
  return {[=](const Picture& source, const Picture& dest) {
            return source.BoxBlurFractionalFilter(dest, radius);
          },
          [=](const Planar& source, Planar& dest) {
            const double f = radius - std::floor(radius), k = 1.0 / (f + f + 1.0);
            const auto blend = [&](int p, int c, int n) { return std::uint8_t(k * (c + f * (p + n))); };
            Planar down = source;
            const int right = source.Width - 1;
            for (int c = 0; c < source.Count; ++c)
              for (int y = 0; y < source.Height; ++y)
                for (int x = 0; x <= right; ++x)
                  down(c, x, y) =
                      blend(source.Near(c, x, y - 1), source(c, x, y), source.Near(c, x, y == 0 ? 0 : y + 1));
            dest = down;
            for (int c = 0; c < source.Count; ++c)
              for (int y = 0; y < source.Height; ++y)
                for (int x = 0; x <= right; ++x)
                  dest(c, x, y) = blend(down.Near(c, x == right ? x : x - 1, y), down(c, x, y),
                                        down.Near(c, x == right ? x : x + 1, y));
          }};
}

TEST(BoxBlurFractionalFilter, BlendsWithTheNeighbours) {
  ExpectLikeModel(Blur(2.6), {{1, 1}, {2, 2}, {7, 6}});
  ExpectLikeModel(Blur(-0.25), {{9, 5}});
  ExpectLikeModelOnEveryTarget(Blur(0.7), Format::RGB, {{301, 4}, {64, 3}});
}

// The edges aren't symmetric: 80 (80 + 0.5 (80 + 80)) / 2, (0 + 0.5 (80 + 0)) / 2, ...
TEST(BoxBlurFractionalFilter, WorksOutByHand) {
  const Picture column(1, 3, Format::G), row(3, 1, Format::G);
  SetPacked(column, {80, 0, 40});
  SetPacked(row, {80, 0, 40});
  EXPECT_EQ(Packed(column.BoxBlurFractionalFilter({}, 2.5)), (Samples{80, 30, 30}));
  EXPECT_EQ(Packed(row.BoxBlurFractionalFilter({}, 0.5)), (Samples{60, 30, 40}));
}

TEST(BoxBlurFractionalFilter, TakesNothingButTheFraction) {
  const Picture picture = NoisePicture(40, 5, Format::BGRA, 53);
  const Planar source = PlanesIn(picture, 40, 5);
  const double infinity = std::numeric_limits<double>::infinity();
  for (const double radius : {0.0, 3.0, -2.0, 1e300, infinity, -infinity, std::nan("")})
    EXPECT_EQ(PlanesIn(picture.BoxBlurFractionalFilter({}, radius), 40, 5).Of, source.Of) << radius;
}

// k isn't exact with 0.6, and the product is truncated.
TEST(BoxBlurFractionalFilter, KeepsAnEvenPictureWhereTheWeightsAreExact) {
  const Picture picture(3, 3, Format::G);
  bool lower = false;
  for (int value = 0; value < 256; ++value) {
    SetPacked(picture, Samples(9, std::uint8_t(value)));
    EXPECT_EQ(Packed(picture.BoxBlurFractionalFilter({}, 0.5)), Samples(9, std::uint8_t(value)));
    lower = lower || Packed(picture.BoxBlurFractionalFilter({}, 0.6))[0] < value;
  }
  EXPECT_TRUE(lower);
}

}
}
