#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <cstring>
#include <limits>

#include "geometry/planes.h"
#include "geometry/sample_parts.h"
#include "support/every_target.h"

namespace picturezor {
namespace {

/// One plane of a picture.
struct Sheet {
  int Width, Height;
  Samples Of;
  std::uint8_t& At(int x, int y) { return Of[std::size_t(y) * std::size_t(Width) + std::size_t(x)]; }
  std::uint8_t At(int x, int y) const { return Of[std::size_t(y) * std::size_t(Width) + std::size_t(x)]; }
};

// A second implementation of the shears: one plane, one sample after the other, no two forms of anything.

void SkewLine(int count, int bound, double d, int background, const std::function<int(int)>& in,
              const std::function<void(int, int)>& out) {
  const int shift = int(std::floor(d));
  const double f = d - std::floor(d);
  for (int x = 0; x < bound; ++x) out(x, background);
  int left = int(background * f) & 255;
  for (int i = 0; i < count; ++i) {
    const int p = in(i), part = int(f * p) & 255;
    if (i + shift >= 0 && i + shift < bound) out(i + shift, p - (part - left));
    left = part;
  }
  if (count + shift < bound) out(count + shift, int(background - (background * f - left)));
}

Sheet SkewRows(const Sheet& from, int width, int height, int background,
               const std::function<double(int)>& distance) {
  Sheet into{width, height, Samples(std::size_t(width * height))};
  for (int y = 0; y < std::min(height, from.Height); ++y)
    SkewLine(
        from.Width, width, distance(y), background, [&](int i) { return from.At(i, y); },
        [&](int x, int value) { into.At(x, y) = std::uint8_t(value); });
  return into;
}

Sheet Rotated(const Sheet& base, double angle, int background) {
  const int w = base.Width, h = base.Height;
  // With long numbers, which round to the nearest double. Besides, the library's own doubles take an
  // instruction on PowerPC that qemu doesn't know.
  const long double theta = angle * 3.141592653589793 / 180.0;
  const double s = double(std::sin(theta)), t = double(std::tan(theta * 0.5)), c = double(std::cos(theta));
  const Sheet first = SkewRows(base, w + int(h * std::fabs(t)), h, background,
                               [&](int y) { return t >= 0 ? t * (y + 0.5) : t * (y - h + 0.5); });
  const int w1 = first.Width, h2 = int(h * c + w * std::fabs(s)) + 1;
  Sheet second{w1, h2, Samples(std::size_t(w1 * h2))};
  double d = s > 0 ? s * (w - 1) : -s * (w - w1);
  for (int x = 0; x < w1; ++x, d -= s)
    SkewLine(
        h, h2, d, background, [&](int i) { return first.At(x, i); },
        [&](int y, int value) { second.At(x, y) = std::uint8_t(value); });
  const int h3 = int(w * std::fabs(s) + h * c) + 1;
  d = s >= 0 ? s * (w - 1) * -t : t * -(s * (w - 1) - (1 - h3));
  return SkewRows(second, int(h * std::fabs(s) + w * c) + 1, h3, background,
                  [&](int) { return std::exchange(d, d + t); });
}

struct Turned {
  Picture Base;
  double Angle;
};

/// The exact turn, and the angle that is left.
Turned Turn(const Picture& picture, double angle) {
  if (angle > 45 && angle <= 135) return {picture.Rotate90slow(), angle - 90};
  if (angle > 135 && angle <= 225) return {picture.Rotate180({}), angle - 180};
  if (angle > 225 && angle <= 315) return {picture.Rotate270slow(), angle - 270};
  return {picture, angle};
}

Sheet SheetOf(const Picture& picture, int offset) {
  const Samples pixels = Packed(picture);
  Sheet sheet{picture.Width(), picture.Height(), {}};
  for (std::size_t i = std::size_t(offset); i < pixels.size(); i += std::size_t(picture.PixelSize()))
    sheet.Of.push_back(pixels[i]);
  return sheet;
}

constexpr Picture::Background Corners{10, 100, 200, 30, 255, 60, 70, 80, 90};
/// In the order of the planes.
constexpr int CornerSamples[] = {Corners.Gray,    Corners.Red,    Corners.Green, Corners.Blue, Corners.Cyan,
                                 Corners.Magenta, Corners.Yellow, Corners.Black, Corners.Alpha};

void ExpectRotated(const Picture& picture, double angle, const Picture& result) {
  const auto [base, rest] = Turn(picture, angle);
  const Format format = picture.ImageFormat();
  Samples wanted;
  const auto pixel = std::size_t(BytesPerPixel(format));
  for (const auto& [plane, offset] : PlanesOf(Picture(1, 1, format))) {
    const Sheet sheet = Rotated(SheetOf(base, offset), rest, CornerSamples[int(plane)]);
    ASSERT_EQ(result.Width(), sheet.Width);
    ASSERT_EQ(result.Height(), sheet.Height);
    wanted.resize(sheet.Of.size() * pixel);
    for (std::size_t i = 0; i < sheet.Of.size(); ++i) wanted[i * pixel + std::size_t(offset)] = sheet.Of[i];
  }
  // Filler bytes stay as the new picture had them.
  EXPECT_EQ(Packed(result), wanted);
}

constexpr double Angles[] = {12, 45, 45.0001, 90.0000001, 134, 135, 181, 225, 300, 315, 350, 359.99};

TEST(Rotate, IsThreeShears) {
  constexpr ImageSize sizes[] = {{1, 1}, {40, 5}, {23, 31}};
  for (const Format format : EveryFormat()) {
    if (PlanesOf(Picture(1, 1, format)).empty()) continue;
    for (const auto& [w, h] : sizes) {
      const Samples pixels = Noise(61).Many(std::size_t(w * h * BytesPerPixel(format)));
      ForEveryStore(w, h, format, [&](const Picture& picture) {
        SetPacked(picture, pixels);
        for (const double angle : Angles) {
          SCOPED_TRACE(testing::Message() << int(format) << " " << w << " x " << h << " by " << angle);
          ExpectRotated(picture, angle, picture.Rotate(angle, Corners));
        }
      });
    }
  }
}

// Larger than the pieces that the columns are sheared in.
TEST(Rotate, IsThreeShearsInPieces) {
  ForEveryTarget([] {
    for (const Format format : {Format::G, Format::RGB, Format::XRGB}) {
      const Picture picture(900, 310, format);
      SetPacked(picture, Noise(62).Many(std::size_t(900 * 310 * BytesPerPixel(format))));
      for (const double angle : {44.0, 329.0}) ExpectRotated(picture, angle, picture.Rotate(angle, Corners));
    }
  });
}

TEST(Rotate, TakesItsPicturesFromTheFactory) {
  constexpr int w = 31, h = 17;
  const Samples pixels = Noise(63).Many(w * h * 3);
  const Picture plain(w, h, Format::RGB);
  SetPacked(plain, pixels);
  std::vector<std::unique_ptr<StoredPicture>> kept;
  for (const double angle : {12.0, 40.0, 100.0, 330.0}) {
    SCOPED_TRACE(angle);
    const Picture wanted = plain.Rotate(angle, Corners);
    const PictureFactory mapped([&](int width, int height, Format format) {
      kept.push_back(std::make_unique<StoredPicture>(StoredPicture::Mapped, width, height, format));
      return kept.back()->Get();
    });
    const StoredPicture file(StoredPicture::Mapped, w, h, Format::RGB);
    SetPacked(file.Get(), pixels);
    // Also where an exact turn comes first.
    kept.clear();
    file.Get().SetFactory(mapped);
    const Picture onFiles = file.Get().Rotate(angle, Corners);
    file.Get().SetFactory({});
    EXPECT_EQ(kept.size(), angle == 100 ? 4u : 3u);
    ASSERT_TRUE(onFiles);
    EXPECT_TRUE(onFiles.IsMapping());
    EXPECT_EQ(Packed(onFiles), Packed(wanted));

    // An order that changes from picture to picture ends in other formats and the same planes.
    int made = 0;
    const PictureFactory others([&](int width, int height, Format) {
      return Picture(width, height, ++made % 2 ? Format::XBGR : Format::RGBA);
    });
    const Picture other = plain.Clone();
    other.SetFactory(others);
    const Picture result = other.Rotate(angle, Corners);
    ASSERT_TRUE(result);
    EXPECT_EQ(result.DataStringInFormat(Format::RGB), wanted.DataStringInFormat(Format::RGB));
    other.SetFactory({});
  }
}

TEST(Rotate, RefusesPicturesThatDontServe) {
  const Picture whole(80, 80, Format::RGB), picture = whole.ClipImage({9, 9, 30, 30});
  FillWithNoise(whole, 64);
  const Samples before = Packed(whole);
  const std::function<Picture(int, int, Format)> makers[] = {
      [&](int, int, Format) { return whole; }, [&](int, int, Format) { return whole.ClipImage(); },
      [](int width, int height, Format) { return Picture(width, height, Format::G); },
      [same = Picture(80, 80, Format::RGB)](int, int, Format) { return same; },
      // Its rows overlap.
      [](int width, int height, Format) {
        return Picture(MemoryBlock(std::size_t(width * (height + 2))), width, height, Format::RGB, width);
      }};
  for (std::size_t i = 0; i < std::size(makers); ++i) {
    const PictureFactory factory(makers[i]);
    picture.SetFactory(factory);
    EXPECT_FALSE(picture.Rotate(12)) << i;
    EXPECT_EQ(Packed(whole), before) << i;
  }
  picture.SetFactory({});
}

TEST(Rotate, TakesExactTurnsAndOddAngles) {
  const Picture picture(20, 10, Format::RGB);
  SetPacked(picture, Noise(65).Many(600));
  for (const double angle : {0.0, -0.0, 360.0, -720.0, 360e15})
    EXPECT_EQ(picture.Rotate(angle, Corners), picture) << angle;
  const Picture left = picture.Rotate90(), right = picture.Rotate270(), half = picture.Rotate180({});
  const struct {
    double Angle;
    const Picture& Wanted;
  } exact[] = {{90, left}, {-270, left}, {450, left}, {180, half}, {-180, half}, {-90, right}, {630, right}};
  for (const auto& [angle, wanted] : exact) {
    const Picture result = picture.Rotate(angle, Corners);
    EXPECT_EQ(result.Width(), wanted.Width()) << angle;
    EXPECT_EQ(Packed(result), Packed(wanted)) << angle;
  }
  // Reduced as by 360 again and again.
  EXPECT_EQ(Packed(picture.Rotate(360e6 + 12)), Packed(picture.Rotate(12)));
  EXPECT_EQ(Packed(picture.Rotate(-12)), Packed(picture.Rotate(348)));
  // So little below 0 that it becomes 360, which is sheared by next to nothing.
  EXPECT_EQ(picture.Rotate(-1e-20).Width(), 21);
  for (const double nowhere :
       {std::numeric_limits<double>::infinity(), -std::numeric_limits<double>::infinity(),
        std::numeric_limits<double>::quiet_NaN()})
    EXPECT_FALSE(picture.Rotate(nowhere));
  EXPECT_EQ(Picture(100, 100, Format::G).Rotate(45).Width(), 142);
}

TEST(Rotate, FillsTheCorners) {
  const Picture red = Picture(20, 20, Format::RGB).Rotate(45, {.Red = -1});
  EXPECT_EQ(red.RowInFormat(0, Format::RGB).front(), 255);
  const Picture gray = Picture(20, 20, Format::G).Rotate(45, {.Red = 9, .Gray = 256 + 7});
  EXPECT_EQ(gray.RowInFormat(0, Format::G).front(), 7);
  const Picture opaque(20, 20, Format::RGBA);
  opaque.AlphaChannel().Invert();
  const Picture turned = opaque.Rotate(45);
  EXPECT_EQ(turned.RowInFormat(0, Format::RGBA)[3], 0);
  EXPECT_EQ(turned.RowInFormat(14, Format::RGBA)[14 * 4 + 3], 255);
}

TEST(Rotate, KnowsOnlyExactTurnsWithoutColours) {
  const Picture raw(8, 8, Format::Scaling3);
  EXPECT_FALSE(raw.Rotate(10));
  EXPECT_EQ(Packed(raw.Rotate(90)), Samples(8 * 8 * 3));
  const Picture closed(8, 8, Format::G);
  closed.Close();
  EXPECT_FALSE(closed.Rotate(10));
  EXPECT_FALSE(closed.Rotate(100));
}

// The multiplication in whole numbers gives what the doubles give, for every sample, or says that it doesn't.
TEST(Rotate, MultipliesByWholeNumbers) {
  std::vector<double> parts{0, 0x1p-60, 0.5, 1 - 0x1p-53, 1};
  for (int d = 2; d < 256; ++d)
    for (int n = 1; n < d; ++n) {
      const double fraction = double(n) / d;
      for (const double part : {fraction, std::nextafter(fraction, 0), std::nextafter(fraction, 1)})
        parts.push_back(part);
    }
  Noise noise(66);
  for (int i = 0; i < 20000; ++i) parts.push_back(noise.Between(1, 1 << 30) * 0x1p-31 + 0.25);
  int found = 0;
  for (const double part : parts) {
    const zor::SampleTable table = zor::PartsOf(part);
    zor::Multiplier multiplier;
    const bool fits = zor::FindMultiplier(part, table, multiplier);
    found += fits;
    for (int sample = 0; sample < 256; ++sample) {
      ASSERT_EQ(table[std::size_t(sample)], int(part * sample));
      if (fits) {
        ASSERT_EQ(multiplier(std::uint16_t(sample)), table[std::size_t(sample)]) << part;
      }
    }
  }
  // Nearly all, or it would be of no use.
  EXPECT_GT(found, int(parts.size()) * 9 / 10);
}

}
}
