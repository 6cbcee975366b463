#include <algorithm>
#include <cmath>

#include "support/filter_models.h"

namespace picturezor {
namespace {

std::uint8_t Cell(int a, int b, double amount, int threshold) {
  const int d = a - b;
  if (std::abs(d) < threshold) return std::uint8_t(a);
  const double v = std::trunc((amount * 4.0 + 1.0) * d + b);
  return std::isnan(v) ? 0 : std::uint8_t(std::clamp(v, 0.0, 255.0));
}

/// All pairs of samples, and each amount in one picture.
TEST(UnsharpFilter, PushesEveryPair) {
  const Picture all(256, 256, Format::G), blurred(256, 256, Format::G);
  Samples a, b;
  for (int i = 0; i < 65536; ++i) {
    a.push_back(std::uint8_t(i >> 8));
    b.push_back(std::uint8_t(i));
  }
  SetPacked(blurred, b);
  constexpr double infinity = INFINITY, nan = NAN;
  for (const double amount :
       {0.0,   0.1,  0.3,  0.5, 0.35,  0.025, 0.33,  0.82,  31.25, 31.26, 0.155,    0.3333333333333333,
        1.0,   2.7,  63.0, 1e5, 1e300, -0.1,  -0.25, -0.26, -0.5,  -3.0,  infinity, nan,
        1e-17, 0.05, 0.2})
    for (const int threshold : {0, 1, 7, 255, 256, -5, 2147483647, -2147483647 - 1}) {
      SCOPED_TRACE(testing::Message() << amount << ' ' << threshold);
      ForEveryTarget([&] {
        SetPacked(all, a);
        ASSERT_TRUE(all.UnsharpFilter(blurred, amount, threshold));
        const Samples result = Packed(all);
        for (std::size_t i = 0; i < 65536; ++i)
          ASSERT_EQ(result[i], Cell(a[i], b[i], amount, threshold)) << int(a[i]) << ' ' << int(b[i]);
      });
      if (HasFailure()) return;
    }
  // k is 3: 3 * 10 + 100, and 3 * -20 + 120.
  EXPECT_EQ(Cell(110, 100, 0.5, 0), 130);
  EXPECT_EQ(Cell(100, 120, 0.5, 20), 60);
}

TEST(UnsharpFilter, WorksOnEveryPlaneOfEveryStore) {
  for (const Format format : EveryFormat())
    ForEveryTarget([&] {
      const Picture blurred = NoisePicture(37, 7, format, 80);
      const std::vector<Samples> others = StoredRows(blurred);
      const Planar from = PlanesIn(blurred, 37, 7);
      ForEveryStore(37, 7, format, [&](const Picture& picture) {
        SetPacked(picture, Noise(81).Many(std::size_t(37 * 7 * picture.PixelSize())));
        Planar planes = PlanesIn(picture, 37, 7);
        for (std::size_t i = 0; i < planes.Of.size(); ++i)
          planes.Of[i] = Cell(planes.Of[i], from.Of[i], 0.3, 4);
        const std::vector<Samples> wanted = With(StoredRows(picture), picture, planes);
        ASSERT_TRUE(picture.UnsharpFilter(blurred, 0.3, 4));
        ASSERT_EQ(StoredRows(picture), wanted) << int(format);
        ASSERT_EQ(StoredRows(blurred), others);
      });
    });
}

// The blurred picture may show the same samples: what has been written is then read again, from left to right
// and top to bottom, also through two windows of one file.
TEST(UnsharpFilter, ReadsWhatItHasWritten) {
  for (const auto kind : {StoredPicture::Memory, StoredPicture::Block, StoredPicture::Mapped})
    ForEveryTarget([&] {
      const StoredPicture stored(kind, 201, 6, Format::G);
      const Samples pixels = Noise(82).Many(201 * 6);
      SetPacked(stored.Get(), pixels);
      Samples wanted = pixels;
      for (std::size_t y = 0; y < 6; ++y)
        for (std::size_t x = 1; x < 201; ++x) {
          auto& sample = wanted[y * 201 + x];
          sample = Cell(sample, wanted[y * 201 + x - 1], 0.3, 4);
        }
      const Picture right = stored.Get().ClipImage({1, 0, 200, 6}),
                    left = stored.Get().ClipImage({0, 0, 200, 6});
      ASSERT_TRUE(right.UnsharpFilter(left, 0.3, 4));
      EXPECT_EQ(Packed(stored.Get()), wanted);
      EXPECT_TRUE(left.UnsharpFilter(left, 0.3, 4));
      EXPECT_EQ(Packed(stored.Get()), wanted) << "no difference from itself";
    });
}

TEST(UnsharpFilter, RefusesOtherPictures) {
  const Picture picture = NoisePicture(5, 4, Format::RGB, 3);
  const std::vector<Samples> before = StoredRows(picture);
  Picture closed(5, 4, Format::RGB);
  closed.Close();
  for (const Picture& other : {Picture(), closed, Picture(5, 4, Format::BGR), Picture(4, 4, Format::RGB),
                               Picture(5, 5, Format::RGB), Picture(0, 0, Format::RGB)})
    EXPECT_FALSE(picture.UnsharpFilter(other, 1, 0));
  EXPECT_FALSE(closed.UnsharpFilter(picture, 1, 0));
  EXPECT_EQ(StoredRows(picture), before);
  EXPECT_TRUE(Picture(3, 3, Format::Buffer).UnsharpFilter(Picture(3, 3, Format::Buffer), 1, 0));
}

}
}
