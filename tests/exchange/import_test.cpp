#include <gmock/gmock.h>

#include <algorithm>
#include <optional>

#include "exchange_test_support.h"

namespace picturezor {
namespace {

constexpr int Width = 9, Height = 7, SourceWidth = 8, SourceHeight = 6;

struct Block {
  Rect Dest;
  int SourceX, SourceY;
};

/// One axis, in the order of the rules: a negative source origin, then a negative size.
struct Axis {
  std::int64_t At, Count, From;
  Axis(int at, int count, int from) : At(at), Count(count), From(from) {
    if (from < 0) {
      At += from;
      Count += from;
      From = 0;
    }
    if (Count < 0) {
      At += Count;
      Count = -Count;
    }
  }
  /// The line of the source that lands on a line, or nothing.
  std::optional<int> SourceOf(int line, int sourceSize) const {
    const std::int64_t from = line - At + From;
    if (line < At || line - At >= Count || from >= sourceSize) return std::nullopt;
    return int(from);
  }
};

/// What a pixel becomes; `mask` is null where the picture has none.
using Change =
    std::function<void(const std::string& letters, std::uint8_t* pixel, Color source, const Color* mask)>;

/// The slow second way: pixel by pixel, with all tests inside.
Samples Expected(const Picture& image, const HostPicture& picture, const HostPicture& mask,
                 const Block& block, const Change& change) {
  Samples pixels = Packed(image);
  const std::string letters = LettersOf(image.ImageFormat());
  const Axis columns(block.Dest.X, block.Dest.Width, block.SourceX),
      rows(block.Dest.Y, block.Dest.Height, block.SourceY);
  for (int y = 0; y < image.Height(); ++y)
    for (int x = 0; x < image.Width(); ++x) {
      const auto sx = columns.SourceOf(x, picture.Width()), sy = rows.SourceOf(y, picture.Height());
      if (!sx || !sy) continue;
      const Color masked = mask ? mask.Pixel(*sx, *sy) : Color();
      change(letters,
             &pixels[(std::size_t(y) * std::size_t(image.Width()) + std::size_t(x)) * letters.size()],
             picture.Pixel(*sx, *sy), mask ? &masked : nullptr);
    }
  return pixels;
}

bool IsRGB(const std::string& letters) { return letters.find('R') != letters.npos; }

void SetColours(const std::string& letters, std::uint8_t* pixel, Color c) {
  pixel[letters.find('R')] = c.Red;
  pixel[letters.find('G')] = c.Green;
  pixel[letters.find('B')] = c.Blue;
}

Change Gray(std::uint8_t Color::*colour) {
  return [=](const std::string& letters, std::uint8_t* pixel, Color source, const Color*) {
    if (const auto at = letters.find('g'); at != letters.npos) pixel[at] = source.*colour;
  };
}

void Colours(const std::string& letters, std::uint8_t* pixel, Color source, const Color*) {
  if (IsRGB(letters)) SetColours(letters, pixel, source);
}

Change WithAlpha(bool invert) {
  return [=](const std::string& letters, std::uint8_t* pixel, Color source, const Color* mask) {
    if (!IsRGB(letters)) return;
    const int alpha = mask ? mask->Red : 255;
    const auto at = letters.find('A');
    // Byte 0 where there is no alpha; a colour that stands there is written after it.
    pixel[at == letters.npos ? 0 : at] = std::uint8_t(invert ? 255 - alpha : alpha);
    SetColours(letters, pixel, source);
  };
}

Change Blended(bool invert) {
  return [=](const std::string& letters, std::uint8_t* pixel, Color source, const Color* mask) {
    if (!IsRGB(letters)) return;
    if (!mask) return SetColours(letters, pixel, source);
    const auto mixed = [&](char letter, std::uint8_t Color::*colour) {
      const int d = pixel[letters.find(letter)], s = source.*colour, m = mask->*colour;
      return std::uint8_t(invert ? (d * (255 - m) + s * m) / 255 : (d * m + s * (255 - m)) / 255);
    };
    SetColours(letters, pixel,
               {mixed('R', &Color::Red), mixed('G', &Color::Green), mixed('B', &Color::Blue)});
  };
}

struct Method {
  const char* Name;
  std::function<void(const Picture&, const HostPicture&, const Rect& dest, int sourceX, int sourceY)> Call;
  Change By;
};

std::vector<Method> Methods() {
  std::vector<Method> methods = {
      {"red", [](auto& i, const auto&... of) { i.DrawPictureRedToGrayChannel(of...); }, Gray(&Color::Red)},
      {"green", [](auto& i, const auto&... of) { i.DrawPictureGreenToGrayChannel(of...); },
       Gray(&Color::Green)},
      {"blue", [](auto& i, const auto&... of) { i.DrawPictureBlueToGrayChannel(of...); }, Gray(&Color::Blue)},
      {"colours", [](auto& i, const auto&... of) { i.DrawPictureRGB(of...); }, Colours}};
  for (const bool invert : {false, true}) {
    methods.push_back({"alpha", [=](auto& i, const auto&... of) { i.DrawMaskedPictureRGB(of..., invert); },
                       WithAlpha(invert)});
    methods.push_back({"blend",
                       [=](auto& i, const auto&... of) { i.DrawMaskedPictureApplyMaskRGB(of..., invert); },
                       Blended(invert)});
  }
  return methods;
}

/// Blocks with a story, and some by chance.
std::vector<Block> Blocks() {
  constexpr int most = 2147483647;
  std::vector<Block> blocks = {
      {{0, 0, 8, 6}, 0, 0},       {{4, 4, 20, 20}, -2, 0},     {{-5, 0, 20, 20}, 0, 0},
      {{7, 5, -6, -4}, 1, 1},     {{2, 1, 5, 4}, 0, 3},        {{0, 0, 5, 5}, 8, 0},
      {{9, 0, 5, 5}, 0, 0},       {{0, 0, 0, 5}, 0, 0},        {{3, 3, 1, 1}, -4, -4},
      {{0, 0, most, most}, 0, 0}, {{most, 0, -most, 6}, 0, 0}, {{-most, -most, most, most}, most, most}};
  Noise noise(99);
  for (int i = 0; i < 4; ++i)
    blocks.push_back(
        {{noise.Between(-9, 9), noise.Between(-9, 9), noise.Between(-12, 12), noise.Between(-12, 12)},
         noise.Between(-4, 8),
         noise.Between(-4, 8)});
  return blocks;
}

/// Every method with every block, in one store and format.
void DrawAll(const Picture& image, const HostPicture& picture, const HostPicture& mask,
             bool reachable = true) {
  const Samples before = Noise(17).Many(Packed(image).size());
  for (const Method& method : Methods())
    for (const Block& block : Blocks()) {
      SCOPED_TRACE(testing::Message() << method.Name << ' ' << testing::PrintToString(block.Dest) << " from "
                                      << block.SourceX << ' ' << block.SourceY);
      SetPacked(image, before);
      const Samples expected = reachable ? Expected(image, picture, mask, block, method.By) : before;
      method.Call(image, picture, block.Dest, block.SourceX, block.SourceY);
      ASSERT_EQ(Packed(image), expected);
    }
}

// Catches a wrong plane or byte, a clipping off by one, rows or masks that aren't skipped alike, filler or
// alpha that is touched, a mask used the wrong way round, and anything that stays locked.
TEST(Import, DrawsIntoEveryFormatAndStore) {
  for (const PictureForm form : {PictureForm::GWorld32, PictureForm::GWorld24, PictureForm::Rows})
    InHost(form, [&] {
      const HostPicture bare = NoisePicture(SourceWidth, SourceHeight, form, 1);
      const HostPicture masked = NoisePicture(SourceWidth, SourceHeight, form, 2);
      GiveMask(masked, NoisePicture(SourceWidth, SourceHeight, form, 3));
      for (const Format format : EveryFormat()) {
        SCOPED_TRACE(testing::Message() << "form " << int(form) << ", format " << int(format));
        // What a host picture looks like and where the image's rows stand have nothing to do with each other.
        if (form == PictureForm::GWorld24) {
          ForEveryStore(Width, Height, format,
                        [&](const Picture& image) { DrawAll(image, masked, masked.Mask()); });
          continue;
        }
        const Picture image(Width, Height, format);
        DrawAll(image, bare, {});
        DrawAll(image, masked, masked.Mask());
      }
      EXPECT_EQ(masked.References(), 1);
      EXPECT_EQ(masked.Mask().References(), 2);
      EXPECT_EQ(Inside(masked).CacheClears, 0);
    });
}

// A picture whose pixels nobody can reach is drawn into a fresh one; and a mask may be held in another way
// than its picture.
TEST(Import, ReachesEveryForm) {
  constexpr PictureForm direct[] = {PictureForm::GWorld32, PictureForm::GWorld24};
  constexpr PictureForm drawn[] = {PictureForm::Form1, PictureForm::Form2, PictureForm::Form3};
  constexpr PictureForm never[] = {PictureForm::GWorld16, PictureForm::None};
  InHost(PictureForm::GWorld32, [&] {
    const Picture image(Width, Height, Format::BGRA);
    const auto draw = [&](PictureForm form, PictureForm maskForm, bool reachable) {
      SCOPED_TRACE(testing::Message() << int(form) << " mask " << int(maskForm));
      const HostPicture picture = NoisePicture(SourceWidth, SourceHeight, form, 4);
      GiveMask(picture, NoisePicture(SourceWidth, SourceHeight, maskForm, 5));
      if (reachable) return DrawAll(image, picture, picture.Mask());
      const Samples before = Packed(image);
      image.DrawMaskedPictureRGB(picture);
      image.DrawMaskedPictureApplyMaskRGB(picture);
      EXPECT_EQ(Packed(image), before);
    };
    for (const PictureForm form : direct) {
      for (const PictureForm mask : direct) draw(form, mask, true);
      for (const PictureForm mask : drawn) draw(form, mask, true);
      for (const PictureForm other : drawn) draw(other, form, true);
      for (const PictureForm other : never) {
        draw(form, other, false);
        draw(other, form, false);
      }
    }
    for (const PictureForm form : never)
      DrawAll(image, NoisePicture(SourceWidth, SourceHeight, form, 6), {}, false);
    DrawAll(image, {}, {}, false);
  });
}

TEST(Import, FillsInArgumentsThatAreLeftOut) {
  InHost(PictureForm::GWorld32, [] {
    const HostPicture picture = NoisePicture(4, 3, PictureForm::GWorld32, 7);
    GiveMask(picture, NoisePicture(4, 3, PictureForm::GWorld32, 8));
    const Rect all{0, 0, 4, 3}, moved{2, 1, 4, 3}, turned{3, 2, -3, 2}, part{1, 1, 2, 2};
    const struct {
      std::function<void(const Picture&)> Call;
      Rect Dest;
      Change By;
    } cases[] = {
        {[&](auto& i) { i.DrawPictureRGB(picture); }, all, Colours},
        {[&](auto& i) { i.DrawPictureRGB(picture, 2, 1); }, moved, Colours},
        {[&](auto& i) { i.DrawPictureRGB(picture, turned); }, turned, Colours},
        {[&](auto& i) { i.DrawMaskedPictureRGB(picture, true); }, all, WithAlpha(true)},
        {[&](auto& i) { i.DrawMaskedPictureRGB(picture, 2, 1); }, moved, WithAlpha(false)},
        {[&](auto& i) { i.DrawMaskedPictureRGB(picture, part, true); }, part, WithAlpha(true)},
        {[&](auto& i) { i.DrawMaskedPictureApplyMaskRGB(picture); }, all, Blended(false)},
        {[&](auto& i) { i.DrawMaskedPictureApplyMaskRGB(picture, 2, 1, true); }, moved, Blended(true)},
        {[&](auto& i) { i.DrawMaskedPictureApplyMaskRGB(picture, part); }, part, Blended(false)},
        {[&](auto& i) { i.DrawPictureGreenToGrayChannel(picture, part); }, part, Gray(&Color::Green)},
    };
    for (const auto& one : cases)
      for (const Format format : {Format::RGBA, Format::G}) {
        SCOPED_TRACE(testing::Message() << "case " << &one - cases << ", format " << int(format));
        const Picture image = NoisePicture(5, 4, format, 9);
        const Samples expected = Expected(image, picture, picture.Mask(), {one.Dest, 0, 0}, one.By);
        one.Call(image);
        EXPECT_EQ(Packed(image), expected);
      }
  });
}

// Catches the mask that is written beside a narrow view: the filler byte that takes it stands in front of the
// view's own pixels, and a view of the colours leaves its parent's alpha alone.
TEST(Import, KeepsTheMaskWithinViews) {
  InHost(PictureForm::GWorld32, [] {
    const HostPicture picture(2, 1);
    picture.SetRGB(Samples{1, 2, 3, 4, 5, 6});
    const Picture filler(4, 1, Format::XBGR), alpha(2, 1, Format::ARGB);
    filler.ClipImage({2, 0, 2, 1}).DrawMaskedPictureRGB(picture);
    EXPECT_EQ(Packed(filler), (Samples{0, 0, 0, 0, 0, 0, 0, 0, 255, 3, 2, 1, 255, 6, 5, 4}));
    alpha.RGBChannels().DrawMaskedPictureRGB(picture);
    EXPECT_EQ(Packed(alpha), (Samples{0, 1, 2, 3, 0, 4, 5, 6}));
  });
}

// A mask is taken to be as large as its picture. One that is narrower can't be read there.
TEST(Import, RefusesAMaskThatIsTooNarrow) {
  InHost(PictureForm::GWorld32, [] {
    const HostPicture picture = NoisePicture(4, 4, PictureForm::GWorld32, 1);
    GiveMask(picture, NoisePicture(3, 4, PictureForm::GWorld32, 2));
    const Picture image(4, 4, Format::RGBA);
    image.DrawMaskedPictureRGB(picture);
    image.DrawMaskedPictureApplyMaskRGB(picture);
    EXPECT_EQ(Packed(image), Samples(4 * 4 * 4));
    image.DrawMaskedPictureRGB(picture, {0, 0, 3, 4});
    EXPECT_NE(Packed(image), Samples(4 * 4 * 4));
  });
}

}
}
