#include "support/every_target.h"
#include "support/plain_picture.h"

namespace picturezor {
namespace {

// Catches a plane that isn't counted, a filler byte that is, and a row that isn't reached.
TEST(CompareImages, AddsUpTheDifferencesOfAllPairs) {
  constexpr int Width = 37, Height = 5;
  Noise noise(31);
  for (const Format a : EveryFormat())
    for (const Format b : EveryFormat()) {
      SCOPED_TRACE(testing::Message() << int(a) << " and " << int(b) << ", seed 31");
      const Picture one = NoisePicture(Width, Height, a, noise.Byte());
      const PlainPicture plain(one);
      ForStores(a == b, Width, Height, b, [&](const Picture& other) {
        SetPacked(other, noise.Many(std::size_t(Width * Height * other.PixelSize())));
        const PlainPicture otherPlain(other);
        std::int64_t total = -1;
        if (plain.Family() && plain.Family() == otherPlain.Family() &&
            plain.Has('A') == otherPlain.Has('A')) {
          total = 0;
          for (int y = 0; y < Height; ++y)
            for (int x = 0; x < Width; ++x)
              for (char plane : plain.Colours() + (plain.Has('A') ? "A" : ""))
                total += std::abs(plain.At(x, y, plane) - otherPlain.At(x, y, plane));
        }
        EXPECT_EQ(one.CompareImages(other), total);
      });
    }
}

TEST(CompareImages, CountsBeyond32Bits) {
  const Picture black(5000, 4000, Format::G), white(5000, 4000, Format::G);
  white.FillRect(255);
  ForEveryTarget([&] { EXPECT_EQ(black.CompareImages(white), std::int64_t{5000} * 4000 * 255); });
}

TEST(CompareImages, RefusesWhatCantBeCompared) {
  const Picture picture(4, 4, Format::RGB), wider(5, 4, Format::RGB), higher(4, 5, Format::RGB);
  EXPECT_EQ(picture.CompareImages({}), -1);
  EXPECT_EQ(picture.CompareImages(Picture(0, 4, Format::RGB)), -1);
  EXPECT_EQ(picture.CompareImages(wider), -1);
  EXPECT_EQ(picture.CompareImages(higher), -1);
  EXPECT_EQ(picture.CompareImages(Picture(4, 4, Format::ARGB)), -1);
  EXPECT_EQ(Picture(4, 4, Format::Buffer).CompareImages(Picture(4, 4, Format::Buffer)), -1);
  EXPECT_EQ(picture.CompareImages(wider.ClipImage({1, 0, 4, 4}).RGBChannels()), 0);
  const Picture closed(4, 4, Format::RGB);
  closed.Close();
  EXPECT_EQ(picture.CompareImages(closed), -1);
  EXPECT_EQ(closed.CompareImages(picture), -1);
}

}
}
