#include <gtest/gtest.h>

#include <cmath>

#include "filters/box_mean.h"
#include "support/filter_models.h"

namespace picturezor {
namespace {

/// The mean of 2r + 1 rows or columns, straight from its definition.
Planar Blurred(const Planar& source, std::int64_t r, int down, int across) {
  Planar dest = source;
  for (int c = 0; c < source.Count; ++c)
    for (int y = 0; y < source.Height; ++y)
      for (int x = 0; x < source.Width; ++x) {
        std::int64_t sum = 0;
        for (std::int64_t s = -r; s <= r; ++s) sum += source.Near(c, x + int(s) * across, y + int(s) * down);
        dest(c, x, y) = std::uint8_t(sum / (2 * r + 1));
      }
  return dest;
}

AreaFilter Blur(double radius, std::int64_t r, bool vertical, bool horizontal) {
  return {[=](const Picture& source, const Picture& dest) {
            return source.BoxBlurFilter(dest, radius, vertical, horizontal);
          },
          [=](const Planar& source, Planar& dest) {
            dest = source;
            if (vertical) dest = Blurred(dest, r, 1, 0);
            if (horizontal) dest = Blurred(dest, r, 0, 1);
          },
          true, AreaFilter::Refused};
}

TEST(BoxBlurFilter, IsTheMeanOfRowsThenOfColumns) {
  ExpectLikeModel(Blur(2.9, 2, true, true), {{1, 1}, {9, 7}, {40, 6}});
  ExpectLikeModel(Blur(1, 1, true, false), {{11, 5}});
  ExpectLikeModel(Blur(3, 3, false, true), {{5, 5}});
}

// Where the sums become wider, and a radius that reaches over the whole picture on both sides.
TEST(BoxBlurFilter, TakesLargeRadii) {
  for (const int r : {50, 127, 128, 1000}) {
    SCOPED_TRACE(r);
    ExpectLikeModelOnEveryTarget(Blur(r, r, true, true), Format::RGB,
                                 {{300, 3}, {2, 290}, {1, 1}, {r - 1, 2}, {r, 1}, {r + 1, 2}});
  }
  ExpectLikeModelOnEveryTarget(Blur(3, 3, true, true), Format::GA,
                               {{2, 3}, {3, 4}, {4, 9}, {33, 5}, {70, 8}});
}

// With r far beyond the picture, half of the rows are the first and half the last. Catches sums of 32 bits.
TEST(BoxBlurFilter, TakesRadiiUpToTheLargestInteger) {
  const Picture picture(3, 3, Format::G);
  SetPacked(picture, {255, 255, 255, 0, 7, 0, 252, 252, 252});
  for (const double radius : {8421504.0, 1e8, 2147483647.0, 1e300}) {
    EXPECT_EQ(Packed(picture.BoxBlurFilter({}, radius, true, false)), Samples(9, 253)) << radius;
    EXPECT_EQ(Packed(picture.BoxBlurFilter({}, radius, false, true)),
              (Samples{255, 255, 255, 0, 0, 0, 252, 252, 252}))
        << radius;
  }
}

TEST(BoxBlurFilter, CopiesWithARadiusBelowOne) {
  ExpectLikeModel(Blur(0.99, 0, true, true), {{4, 5}});
  const Picture picture = NoisePicture(4, 5, Format::BGRX, 36);
  for (const double radius : {0.0, -0.5, -7.0, -1e300, std::nan("")})
    for (const auto& [vertical, horizontal] : {std::pair{true, true}, {true, false}, {false, true}})
      EXPECT_EQ(PlanesIn(picture.BoxBlurFilter({}, radius, vertical, horizontal), 4, 5).Of,
                PlanesIn(picture, 4, 5).Of)
          << radius;
}

TEST(BoxBlurFilter, WritesNothingInNoDirection) {
  const Picture picture = NoisePicture(2, 2, Format::RGB, 37);
  ExpectUntouched(picture, [](const Picture& source, const Picture& dest) {
    return source.BoxBlurFilter(dest, 3, false, false);
  });
}

TEST(BoxBlurFilter, Iterates) {
  const Picture picture(7, 6, Format::RGBA), dest(7, 6, Format::RGBA);
  FillWithNoise(picture, 32);
  const Planar source = PlanesIn(picture, 7, 6);
  Planar once = source, thrice = source;
  Blur(2, 2, true, true).Model(source, once);
  Blur(2, 2, true, true).Model(once, thrice);
  Blur(2, 2, true, true).Model(Planar(thrice), thrice);

  const Picture result = picture.BoxBlurFilter(dest, 2, 3);
  EXPECT_EQ(PlanesIn(result, 7, 6).Of, thrice.Of);
  EXPECT_FALSE(result == dest);
  EXPECT_EQ(PlanesIn(dest, 7, 6).Of, once.Of);
  EXPECT_TRUE(picture.BoxBlurFilter(dest, 2, 1, true, true) == dest);
  EXPECT_TRUE(picture.BoxBlurFilter(dest, 2, 0, true, true) == picture);
  EXPECT_TRUE(picture.BoxBlurFilter({}, 2, -5, true, true) == picture);
  EXPECT_EQ(PlanesIn(picture.BoxBlurFilter(dest, 2, 2147483647), 7, 6).Of,
            PlanesIn(picture.BoxBlurFilter({}, 2, 1000), 7, 6).Of);
  EXPECT_FALSE(picture.BoxBlurFilter(picture, 2, 2, true, true));
  EXPECT_FALSE(picture.BoxBlurFilter(Picture(6, 6, Format::RGBA), 2, 2, true, true));
}

// Catches passes left out, once they change nothing, that somebody can see.
TEST(BoxBlurFilter, AsksTheFactoryForEveryPass) {
  const Picture even(4, 3, Format::RGB);
  int asked = 0;
  const PictureFactory factory([&asked](int width, int height, Format format) {
    ++asked;
    return Picture(width, height, format);
  });
  const auto passes = [&](auto&& filter) {
    asked = 0;
    EXPECT_TRUE(filter());
    return asked;
  };
  PictureFactory::SetFactory(factory);
  EXPECT_EQ(passes([&] { return even.BoxBlurFilter({}, 1, 7); }), 7);
  EXPECT_EQ(passes([&] { return even.BoxBlurFilter(Picture(4, 3, Format::RGB), 1, 7); }), 6);
  EXPECT_EQ(passes([&] { return even.StampFilter({}, 3, 0.5, 0.5, {}, {}); }), 4);
  PictureFactory::SetFactory({});
  even.SetFactory(factory);
  EXPECT_EQ(passes([&] { return even.BoxBlurFilter({}, 1, 7); }), 1) << "later passes are of new pictures";
  even.SetFactory({});
}

// Catches a blur that reads its own output where the two overlap.
TEST(BoxBlurFilter, TakesADestThatSharesMemory) {
  for (const auto& from : {Rect{0, 0, 6, 6}, Rect{2, 3, 6, 6}}) {
    const Picture whole = NoisePicture(8, 9, Format::RGB, 33);
    const Picture source = whole.ClipImage(from), dest = whole.ClipImage({1, 2, 6, 6});
    Planar wanted(6, 6, 3);
    const Planar before(PlanesIn(source.Clone(), 6, 6));
    Blur(1, 1, true, true).Model(before, wanted);
    EXPECT_TRUE(source.BoxBlurFilter(dest, 1) == dest);
    EXPECT_EQ(PlanesIn(dest, 6, 6).Of, wanted.Of);
  }
  const Picture picture = NoisePicture(6, 6, Format::BGR, 34);
  Planar wanted(6, 6, 1);
  Blur(1, 1, true, true).Model(PlanesIn(picture.RedChannel(), 6, 6), wanted);
  const Planar green = PlanesIn(picture.GreenChannel(), 6, 6);
  picture.RedChannel().BoxBlurFilter(picture.BlueChannel(), 1);
  EXPECT_EQ(PlanesIn(picture.BlueChannel(), 6, 6).Of, wanted.Of);
  EXPECT_EQ(PlanesIn(picture.GreenChannel(), 6, 6).Of, green.Of);
}

/// Every sum of n samples, narrow; the sums around each multiple of n, wide.
TEST(BoxMean, EqualsTheDivision) {
  for (std::int64_t n = 3; zor::BoxMean<std::uint16_t>::Holds(n); n += 2) {
    const zor::BoxMean<std::uint16_t> mean(n);
    for (std::int64_t sum = 0; sum <= 255 * n; ++sum)
      ASSERT_EQ(mean(std::uint16_t(sum)), sum / n) << sum << " / " << n;
  }
  for (std::int64_t n = 3; zor::BoxMean<std::uint32_t>::Holds(n); n += n < 100000 ? 2 : 12346) {
    const zor::BoxMean<std::uint32_t> mean(n);
    for (std::int64_t multiple = 0; multiple <= 255 * n; multiple += n)
      for (const std::int64_t sum : {multiple - 1, multiple, multiple + n / 2})
        if (sum >= 0 && sum <= 255 * n) {
          ASSERT_EQ(mean(std::uint32_t(sum)), sum / n) << sum << " / " << n;
        }
  }
}

// Catches rows of a mapped picture that went away with a window: with both rows of a sum in one, and with few
// rows in each.
TEST(BoxBlurFilter, MovesWindows) {
  for (const auto& [width, height, radius] : {std::array{400000, 90, 2}, {3500000, 9, 1}}) {
    const Picture noise = NoisePicture(width, height, Format::G, 9);
    const TemporaryFile file, other;
    // Windows of 16 MiB, or of five rows.
    const Picture from = Picture::Mapped(file.Path(), width, height, Format::G),
                  into = Picture::Mapped(other.Path(), width, height, Format::G);
    SetPacked(from, Packed(noise));
    ASSERT_TRUE(from.BoxBlurFilter(into, radius));
    EXPECT_TRUE(Packed(into) == Packed(noise.BoxBlurFilter({}, radius))) << width << ' ' << radius;
  }
}

}
}
