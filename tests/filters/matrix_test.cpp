#include <gtest/gtest.h>

#include <cmath>

#include "support/filter_models.h"

namespace picturezor {
namespace {

constexpr std::int32_t Most = 2147483647, Least = -Most - 1;

AreaFilter Matrix(int dimension, const std::vector<std::int32_t>& weights, std::int32_t delta, double scale) {
  return {[=](const Picture& source, const Picture& dest) {
            return source.ApplyMatrix(dest, dimension, IntegerArray(weights), delta, scale);
          },
          [=](const Planar& source, Planar& dest) {
            const int half = dimension / 2;
            for (int y = 0; y < source.Height; ++y)
              for (int x = 0; x < source.Width; ++x) {
                std::vector<std::int64_t> sums(std::size_t(source.Count), delta);
                for (int j = 0; j < dimension; ++j)
                  for (int i = 0; i < dimension; ++i) {
                    const std::size_t cell = std::size_t(j * dimension + i);
                    if (cell >= weights.size() || weights[cell] > 254) continue;
                    for (int c = 0; c < source.Count; ++c)
                      sums[std::size_t(c)] +=
                          std::int64_t{weights[cell]} * source.Near(c, x - half + i, y - half + j);
                  }
                for (int c = 0; c < source.Count; ++c) {
                  const double scaled = std::trunc(double(sums[std::size_t(c)]) * scale);
                  dest(c, x, y) = std::uint8_t(scaled > 0 ? std::min(scaled, 255.0) : 0);
                }
              }
          },
          true, AreaFilter::ReadsWhatItWrote};
}

std::vector<std::int32_t> Weights(int count, int first, int last, Noise& noise) {
  std::vector<std::int32_t> weights;
  for (int i = 0; i < count; ++i) weights.push_back(noise.Between(first, last));
  return weights;
}

TEST(ApplyMatrix, SumsTheWeightedSurroundings) {
  Noise noise(51);
  ExpectLikeModel(Matrix(3, Weights(9, -9, 9, noise), 30, 1.0), {{1, 1}, {9, 5}});
  ExpectLikeModel(Matrix(2, Weights(4, -300, 254, noise), -100, 0.01), {{5, 6}});
}

// Every width of the sums, dimensions that are and aren't a whole number of steps, each instruction set.
TEST(ApplyMatrix, TakesAllDimensionsAndWeights) {
  Noise noise(52);
  for (const auto& [dimension, least, most, delta, scale] : {std::tuple{3, -10, 10, 0, 1.0},
                                                             {5, -3, 3, 128, 1.0},
                                                             {4, -500, 300, 9, 1 / 7.0},
                                                             {7, -100, 254, -50, -0.01},
                                                             {50, -4, 4, 0, 0.3},
                                                             {3, Least, Least + 5, Least, -1e-12},
                                                             {1, 254, 254, Most, 1.0},
                                                             {1, 1, 1, Most - 3, 1e-7},
                                                             {2, 255, 300, 7, 1.0},
                                                             {3, -9, 9, 0, std::nan("")},
                                                             {6, 0, 0, 77, 1.0},
                                                             {3, 0, 9, 0, 1e300}}) {
    SCOPED_TRACE(testing::Message() << dimension << " rows, " << delta << ", " << scale);
    ExpectLikeModelOnEveryTarget(
        Matrix(dimension, Weights(dimension * dimension, least, most, noise), delta, scale), Format::RGB,
        {{1100, 3}, {dimension > 1 ? dimension - 1 : 1, 2}});
  }
}

TEST(ApplyMatrix, WorksOutByHand) {
  struct {
    int Dimension;
    std::vector<std::int32_t> Weights;
    std::int32_t Delta;
    double Scale;
    Samples Out;
  } const cases[] = {
      {3, {0, 0, 0, 0, 1, 0, 0, 0, 0}, 0, 1.0, {10, 20, 30, 40}},
      // The corner counts four times, its neighbours on the edges twice.
      {3, {1, 1, 1, 1, 1, 1, 1, 1, 1}, 0, 1.0, {180, 210, 240, 255}},
      {3, {1, 1, 1, 1, 1, 1, 1, 1, 1}, 0, 1.0 / 9, {20, 23, 26, 30}},
      {2, {1, 2, 4, 8}, 0, 0.5, {75, 125, 195, 245}},
      {1, {-1}, 25, 1.0, {15, 5, 0, 0}},
      {1, {-1}, 0, 0.5, {0, 0, 0, 0}},
      {1, {255}, 9, 1.0, {9, 9, 9, 9}},  // a hole
      {1, {254}, 0, 1.0, {255, 255, 255, 255}},
      {0, {}, 300, 0.5, {150, 150, 150, 150}},
      {-3, {1, 1}, 7, 1.0, {7, 7, 7, 7}},
      {3, {0, 0, 0, 0, 2}, 0, 1.0, {20, 40, 60, 80}},  // the rest counts as 0
  };
  const Picture picture(2, 2, Format::G);
  SetPacked(picture, {10, 20, 30, 40});
  for (const auto& [dimension, weights, delta, scale, out] : cases)
    EXPECT_EQ(Packed(picture.ApplyMatrix({}, dimension, IntegerArray(weights), delta, scale)), out)
        << testing::PrintToString(weights) << scale;
}

// Every sum up to 1279 by itself. Catches a factor that is rounded before it is used.
TEST(ApplyMatrix, TruncatesWhatTheFactorGives) {
  const Picture picture(256, 1, Format::G);
  SetPacked(picture, Ramp());
  for (const double scale :
       {1.0 / 3, 1.0 / 9, 0.1, 0.5, 0.7, 1.0 / 273, 0.999999999, 3.3, 1e-9, 1e-6, 1.1e-6, 9.9e5, 1e6})
    for (int delta = 0; delta < 1280; delta += 256) {
      const Samples out = Packed(picture.ApplyMatrix({}, 1, IntegerArray({1}), delta, scale));
      for (int x = 0; x < 256; ++x)
        ASSERT_EQ(out[std::size_t(x)], std::min(int((x + delta) * scale), 255)) << scale << " " << x + delta;
    }
}

TEST(ApplyMatrix, HasShortForms) {
  const Picture picture(1, 1, Format::G);
  SetPacked(picture, {100});
  EXPECT_EQ(Packed(picture.ApplyMatrix({}, 1, IntegerArray({2}))), Samples{200});
  EXPECT_EQ(Packed(picture.ApplyMatrix({}, 1, IntegerArray({2}), -50)), Samples{150});
  EXPECT_EQ(Packed(picture.ApplyMatrix({}, 1, IntegerArray())), Samples{0}) << "nil has no weights";
}

TEST(ApplyMatrix, RefusesMoreThanFiftyRows) {
  const Picture picture(2, 2, Format::G), dest(2, 2, Format::G);
  SetPacked(dest, {1, 2, 3, 4});
  EXPECT_FALSE(picture.ApplyMatrix(dest, 51, IntegerArray(std::vector<std::int32_t>(51 * 51, 1))));
  EXPECT_EQ(Packed(dest), (Samples{1, 2, 3, 4}));
  EXPECT_TRUE(picture.ApplyMatrix(dest, 50, IntegerArray(std::vector<std::int32_t>(2600, 1))));
}

}
}
