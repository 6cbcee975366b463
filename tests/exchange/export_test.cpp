#include <gmock/gmock.h>

#include <algorithm>
#include <optional>

#include "exchange_test_support.h"

namespace picturezor {
namespace {

/// Forms that a new picture can be written in.
constexpr PictureForm Written[] = {PictureForm::GWorld32, PictureForm::GWorld24, PictureForm::Rows};

/// The slow second way to what a picture's pixel looks like; nothing where its format has no colours.
std::optional<Color> ColourOf(const std::string& letters, const std::uint8_t* pixel) {
  const auto at = [&](char letter) { return int(pixel[letters.find(letter)]); };
  const auto has = [&](char letter) { return letters.find(letter) != std::string::npos; };
  const auto gray = [](int g) { return Color{std::uint8_t(g), std::uint8_t(g), std::uint8_t(g)}; };
  if (has('g')) return gray(at('g'));
  if (has('R')) return Color{std::uint8_t(at('R')), std::uint8_t(at('G')), std::uint8_t(at('B'))};
  if (!has('K')) return std::nullopt;
  const auto light = [&](char ink) {
    const int inked = at(ink) * (255 - at('K')) / 255;
    return std::uint8_t(255 - at('K') - inked);
  };
  return Color{light('C'), light('M'), light('Y')};
}

/// Where a rectangle and the picture meet: the first line, and how many.
std::pair<std::int64_t, std::int64_t> Meet(std::int64_t at, std::int64_t count, int size) {
  const std::int64_t first = std::max<std::int64_t>(std::min(at, at + count), 0);
  return {first, std::min<std::int64_t>(std::max(at, at + count), size) - first};
}

using Choice = std::function<std::optional<Color>(const std::uint8_t* pixel)>;

/// Compares a result with the pixels that `choice` makes of a rectangle.
void Expect(const HostPicture& result, const Picture& picture, const Rect& rect, const Choice& choice) {
  const auto [left, width] = Meet(rect.X, rect.Width, picture.Width());
  const auto [top, height] = Meet(rect.Y, rect.Height, picture.Height());
  const Samples pixels = Packed(picture);
  if (width < 1 || height < 1 || !choice(pixels.data())) {
    EXPECT_FALSE(result);
    return;
  }
  ASSERT_TRUE(result);
  ASSERT_EQ(result.Width(), width);
  ASSERT_EQ(result.Height(), height);
  Samples expected;
  for (auto y = top; y < top + height; ++y)
    for (auto x = left; x < left + width; ++x) {
      const Color colour = *choice(&pixels[std::size_t((y * picture.Width() + x) * picture.PixelSize())]);
      expected.insert(expected.end(), {colour.Red, colour.Green, colour.Blue});
    }
  EXPECT_EQ(result.RGB(), expected);
  if (result.Form() != PictureForm::GWorld24) {
    const int top = result.Form() == PictureForm::Rows ? 0x7F : 0xFF;
    for (int y = 0; y < height; ++y)
      for (int x = 0; x < width; ++x) ASSERT_EQ(*Inside(result).PixelAt(x, y), top);
  }
  EXPECT_EQ(result.References(), 1);
  EXPECT_EQ(Inside(result).CacheClears, 2);
}

const Rect Rectangles[] = {{0, 0, 9, 7},
                           {2, 1, 4, 3},
                           {5, 5, -3, -3},
                           {-3, -2, 6, 20},
                           {8, 6, 1, 1},
                           {9, 0, 3, 3},
                           {-5, 0, 5, 5},
                           {0, 0, 0, 10},
                           {3, 3, 2, -1},
                           {1, 1, 1 << 30, 1 << 30},
                           {-2147483647, 0, 2147483647, 3}};

// Catches a wrong plane, a wrong byte order, a filler that is read, a mirrored or shifted rectangle, a
// missing top byte, rows that don't go by the table, and a lock or a reference that stays.
TEST(Export, GivesTheColoursOfEveryFormat) {
  for (const PictureForm form : Written)
    InHost(form, [&] {
      SCOPED_TRACE(int(form));
      for (const Format format : EveryFormat()) {
        SCOPED_TRACE(int(format));
        const std::string letters = LettersOf(format);
        ForEveryStore(9, 7, format, [&](const Picture& picture) {
          SetPacked(picture, Noise(7).Many(9 * 7 * letters.size()));
          for (const Rect& rect : Rectangles) {
            SCOPED_TRACE(testing::PrintToString(rect));
            Expect(picture.CopyPicture(rect), picture, rect,
                   [&](const std::uint8_t* pixel) { return ColourOf(letters, pixel); });
            Expect(picture.CopyMask(rect), picture, rect,
                   [&](const std::uint8_t* pixel) -> std::optional<Color> {
                     const auto at = letters.find('A');
                     if (at == std::string::npos) return std::nullopt;
                     return Color{pixel[at], pixel[at], pixel[at]};
                   });
          }
          Expect(picture.CopyPicture(), picture, {0, 0, 9, 7},
                 [&](const std::uint8_t* pixel) { return ColourOf(letters, pixel); });
        });
      }
    });
}

TEST(Export, WorksOutInksByHand) {
  InHost(PictureForm::GWorld32, [] {
    const Picture picture(4, 1, Format::CMYK);
    SetPacked(picture, {0, 0, 0, 0, 9, 9, 9, 255, 50, 0, 0, 100, 255, 128, 1, 0});
    EXPECT_EQ(picture.CopyPicture().RGB(), (Samples{255, 255, 255, 0, 0, 0, 125, 155, 155, 0, 127, 254}));
  });
}

// Views have other steps and offsets than their formats say.
TEST(Export, GoesByThePlanesOfViews) {
  InHost(PictureForm::GWorld32, [] {
    const Picture picture(2, 1, Format::ABGR);
    SetPacked(picture, {1, 2, 3, 4, 5, 6, 7, 8});
    EXPECT_EQ(picture.GreenChannel().CopyPicture().RGB(), (Samples{3, 3, 3, 7, 7, 7}));
    EXPECT_EQ(picture.RGBChannels().CopyPicture().RGB(), (Samples{4, 3, 2, 8, 7, 6}));
    EXPECT_EQ(picture.AlphaChannel().CopyPicture().RGB(), picture.CopyMask().RGB());
    EXPECT_FALSE(picture.RGBChannels().CopyMask());
  });
}

TEST(Export, DrawsAlphaIntoTheMask) {
  for (const PictureForm form : Written)
    for (const bool draws : {true, false})
      InHost(form, [&] {
        SCOPED_TRACE(testing::Message() << int(form) << " drawing " << draws);
        Host::Hide("DrawPicture", !draws);
        const Picture picture = NoisePicture(9, 7, Format::GA, 5);
        const HostPicture result = picture.CopyPictureWithMask();
        EXPECT_EQ(result.RGB(), picture.CopyPicture().RGB());
        ASSERT_TRUE(result.Mask());
        // Without drawing there is the copy of rows, which only tables of rows allow.
        const bool drawn = draws || form == PictureForm::Rows;
        EXPECT_EQ(result.Mask().RGB(), drawn ? picture.CopyMask().RGB() : Samples(9 * 7 * 3, 255));
        EXPECT_EQ(result.References(), 1);
        EXPECT_EQ(result.Mask().References(), 2);  // the picture's and this one

        // The mask is asked for in the size that was given, not in the one that came of it.
        EXPECT_FALSE(picture.CopyPictureWithMask({5, 5, -3, -3}).Mask());
        EXPECT_TRUE(picture.CopyPictureWithMask({5, 5, -3, -3}));
        EXPECT_FALSE(picture.CopyPictureWithMask({9, 0, 5, 5}));
        EXPECT_FALSE(Picture(9, 7, Format::RGB).CopyPictureWithMask().Mask());
      });
}

TEST(Export, ShowsACornerToDebuggers) {
  InHost(PictureForm::GWorld32, [] {
    const Picture large(600, 520, Format::GA), small(3, 2, Format::RGB), buffer(3, 2, Format::Buffer);
    FillWithNoise(large, 3);
    EXPECT_FALSE(large.DebugPicture());
    for (const Picture& picture : {large, small, buffer}) picture.SetDebugPictureEnabled(true);
    const HostPicture shown = large.DebugPicture();
    EXPECT_EQ(shown.RGB(), large.CopyPicture({0, 0, 512, 512}).RGB());
    EXPECT_EQ(shown.Mask().RGB(), large.CopyMask({0, 0, 512, 512}).RGB());
    EXPECT_EQ(small.DebugPicture().Width(), 3);
    EXPECT_FALSE(buffer.DebugPicture());
  });
}

TEST(Export, EndsAtTheLargestPicture) {
  InHost(PictureForm::GWorld24, [] {
    const Picture wide(40000, 2, Format::G), high(1, 32768, Format::G);
    for (const Picture& picture : {wide, high})
      EXPECT_THAT(ServicesOf([&] { EXPECT_FALSE(picture.CopyPicture()); }), testing::IsEmpty());
    EXPECT_EQ(wide.CopyPicture({0, 0, 32767, 2}).Width(), 32767);
    EXPECT_EQ(high.CopyPicture({0, 1, 1, 32767}).Height(), 32767);
  });
}

TEST(Export, GivesNilForPicturesWithoutPixels) {
  InHost(PictureForm::GWorld32, [] {
    const Picture closed(3, 3, Format::RGBA), invalid(0, 3, Format::RGB), whole(3, 3, Format::RGBA);
    closed.Close();
    for (const Picture& picture : {closed, invalid, whole.ClipImage({3, 0, 2, 2})}) {
      EXPECT_FALSE(picture.CopyPicture() || picture.CopyMask() || picture.CopyPictureWithMask());
      EXPECT_FALSE(picture.CopyGWorld());
    }
  });
}

// Other host threads run before, between and after the rows.
TEST(Export, Yields) {
  InHost(PictureForm::GWorld32, [] {
    const Picture picture(2, 2, Format::RGB);
    picture.SetYieldTicks(1);
    int yields = 0;
    Host::OnYield([&] { ++yields; });
    EXPECT_TRUE(picture.CopyPicture());
    EXPECT_GE(yields, 1);
    struct Stopped {};
    picture.SetYieldTicks(0);
    Host::OnYield([&] { throw Stopped(); });
    EXPECT_TRUE(picture.CopyPicture());
    Host::OnYield({});
  });
}

}
}
