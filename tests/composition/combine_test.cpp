#include "support/every_target.h"
#include "support/plain_picture.h"

namespace picturezor {
namespace {

int Blend(bool preMultiplied, int s, int m, int d) {
  return preMultiplied ? s + m * d / 255 : (s * (255 - m) + m * d) / 255;
}

bool IsGrayOrRGB(const PlainPicture& picture) { return picture.Family() == 'g' || picture.Family() == 'R'; }

/// What a plane of the dest gets from a picture: its plane, its gray, or its luma.
int SampleFor(char plane, const PlainPicture& picture, int x, int y) {
  return plane == 'g' || picture.Has('g') ? picture.Gray(x, y) : picture.At(x, y, plane);
}

int Part(char plane, int colour) {
  const int red = colour >> 16 & 255, green = colour >> 8 & 255, blue = colour & 255;
  return plane == 'R'   ? red
         : plane == 'G' ? green
         : plane == 'B' ? blue
                        : (red * 77 + green * 151 + blue * 28) >> 8;
}

struct Arguments {
  Rect Dest;
  int X, Y;
  CombineOptions How;
};

/// One pixel of the three forms with a mask or a colour.
void CombinePixel(PlainPicture& dest, int x, int y, const PlainPicture& image, const PlainPicture* mask,
                  int fromX, int fromY, const CombineOptions& how) {
  const auto store = [&](char plane, int s, int m) {
    auto& d = dest.At(x, y, plane);
    d = std::uint8_t(Blend(how.PreMultipliedSource, s, m, d));
  };
  const auto alphaOf = [&](const PlainPicture& picture) {
    return picture.Has('A') ? picture.At(fromX, fromY, 'A') : 255;
  };
  if (mask || how.MaskColour) {
    const int maskColour = !mask && how.UseColours ? how.MaskColour->Packed() : 0;
    for (char plane : dest.Colours())
      store(plane, SampleFor(plane, image, fromX, fromY),
            mask ? SampleFor(plane, *mask, fromX, fromY) : Part(plane, maskColour));
    if (mask && dest.Has('A')) store('A', alphaOf(image), alphaOf(*mask));
    return;
  }
  const int m =
      image.Has('g')
          ? image.At(fromX, fromY, 'g')
          : (image.At(fromX, fromY, 'R') + image.At(fromX, fromY, 'G') + image.At(fromX, fromY, 'B')) / 3;
  const int fore = how.ForeColour->Packed();
  if (dest.Has('R')) {
    for (char plane : std::string("RGB")) store(plane, Part(plane, fore), m);
  } else {
    const int d = dest.At(x, y, 'g');
    const auto blend = [&](char plane) { return Blend(how.PreMultipliedSource, Part(plane, fore), m, d); };
    dest.At(x, y, 'g') = std::uint8_t((blend('R') * 77 + blend('G') * 151 + blend('B') * 28) >> 8);
  }
}

/// The answer of a call that isn't CopyPixels; the dest as it has to be.
bool CombinePlain(PlainPicture& dest, const PlainPicture& image, const PlainPicture* mask,
                  const Arguments& a) {
  if (a.Dest.Width < 1 || a.Dest.Height < 1) return false;
  if (mask && (mask->Width != image.Width || mask->Height != image.Height)) return false;
  bool any = false;
  ForPixels(dest, image, a.Dest, a.X, a.Y, [&](int x, int y, int fromX, int fromY) {
    any = true;
    if (IsGrayOrRGB(dest) && IsGrayOrRGB(image) && (!mask || IsGrayOrRGB(*mask)))
      CombinePixel(dest, x, y, image, mask, fromX, fromY, a.How);
  });
  return any;
}

CombineOptions AnyOptions(Noise& noise, const Picture& mask) {
  CombineOptions how{.PreMultipliedSource = noise.Between(0, 1) > 0, .UseColours = noise.Between(0, 3) > 0};
  const int form = noise.Between(0, 3);
  if (form < 2) how.Mask = mask;
  if (form != 2) how.MaskColour = Color{noise.Byte(), noise.Byte(), noise.Byte()};
  if (form == 2 || noise.Between(0, 1)) how.ForeColour = Color{noise.Byte(), noise.Byte(), noise.Byte()};
  return how;
}

constexpr Format Formats[] = {Format::RGB,  Format::BGRA,   Format::XRGB,    Format::ARGB,    Format::G,
                              Format::GA,   Format::AG,     Format::TwoOf3,  Format::FourOf4, Format::CMYKA,
                              Format::KYMC, Format::Buffer, Format::Scaling4};

// Catches a wrong formula, plane or alpha in any combination of the three pictures' groups.
TEST(Combine, BlendsEveryTripleOfGroups) {
  constexpr int Width = 21, Height = 6;
  Noise noise(71);
  for (const Format image : Formats)
    for (const Format mask : Formats) {
      const Picture imagePicture(Width, Height, image), maskPicture(Width, Height, mask);
      FillWithNoise(imagePicture, noise.Byte());
      FillWithNoise(maskPicture, noise.Byte());
      const PlainPicture plainImage(imagePicture), plainMask(maskPicture);
      for (const Format dest : Formats)
        ForStores(image == mask, Width, Height, dest, [&](const Picture& picture) {
          SCOPED_TRACE(testing::Message()
                       << int(dest) << ", " << int(image) << ", " << int(mask) << ", seed 71");
          for (int round = 0; round < 3; ++round) {
            SetPacked(picture, noise.Many(std::size_t(Width * Height * picture.PixelSize())));
            PlainPicture wanted(picture);
            const Arguments a{AnyRect(noise, Width, Height), noise.Between(-3, 9), noise.Between(-3, 3),
                              AnyOptions(noise, maskPicture)};
            const bool done = CombinePlain(wanted, plainImage, a.How.Mask ? &plainMask : nullptr, a);
            ASSERT_EQ(picture.Combine(imagePicture, a.Dest, a.X, a.Y, a.How), done);
            ASSERT_EQ(Packed(picture), wanted.Pixels);
          }
        });
    }
}

// All 2^24 triples of source, mask and dest samples, in both formulas, with every instruction set.
TEST(Combine, DividesExactly) {
  const Picture image(256, 256, Format::G), mask(256, 256, Format::G), dest(256, 256, Format::G);
  for (int y = 0; y < 256; ++y) {
    image.SetRow(y, Ramp());
    mask.SetRow(y, Samples(256, std::uint8_t(y)));
  }
  for (const bool preMultiplied : {false, true})
    for (int d = 0; d < 256; ++d) {
      Samples wanted;
      for (int m = 0; m < 256; ++m)
        for (int s = 0; s < 256; ++s) wanted.push_back(std::uint8_t(Blend(preMultiplied, s, m, d)));
      ForEveryTarget([&] {
        dest.FillRect(d);
        ASSERT_TRUE(dest.Combine(image, {0, 0, 256, 256}, 0, 0,
                                 {.PreMultipliedSource = preMultiplied, .Mask = mask}));
        ASSERT_EQ(dest.DataStringInFormat(Format::G), wanted) << "over " << d;
      });
    }
}

// Rows longer than a stretch, and all ways of bringing an image and a mask into the dest's layout.
TEST(Combine, IsTheSameWithEveryInstructionSet) {
  constexpr int Width = 9001;
  const Format formats[] = {Format::RGB, Format::RGBA, Format::G};
  for (const Format dest : formats)
    for (const Format image : formats)
      for (const Format mask : formats) {
        const Picture picture(Width, 1, dest), imagePicture(Width, 1, image), maskPicture(Width, 1, mask);
        FillWithNoise(picture, 1);
        FillWithNoise(imagePicture, 2);
        FillWithNoise(maskPicture, 3);
        const Samples before = Packed(picture);
        PlainPicture wanted(picture);
        const PlainPicture plainImage(imagePicture), plainMask(maskPicture);
        const Arguments a{{3, 0, Width, 1}, 7, 0, {.Mask = maskPicture}};
        ASSERT_TRUE(CombinePlain(wanted, plainImage, &plainMask, a));
        ForEveryTarget([&] {
          SetPacked(picture, before);
          EXPECT_TRUE(picture.Combine(imagePicture, a.Dest, a.X, a.Y, a.How));
          EXPECT_EQ(Packed(picture), wanted.Pixels) << int(dest) << " " << int(image) << " " << int(mask);
        });
      }
}

/// A view of the whole size, so that it can be image and mask of another.
Picture AnyView(Noise& noise, const Picture& picture) {
  const Picture part = picture.ClipImage({noise.Between(0, 3), noise.Between(0, 3), 13, 9});
  switch (noise.Between(0, 3)) {
    case 0: return part.MirroredView();
    case 1: return part.Channel(noise.Between(0, part.ChannelCount() - 1));
    case 2: return part.RGBChannels();
    default: return part;
  }
}

// A call that reads what it writes gives what as many calls of a pixel each give, in their order.
TEST(Combine, GoesPixelByPixelWithinAStore) {
  Noise noise(72);
  for (const auto kind : StoredPicture::Kinds)
    for (int round = 0; round < 60; ++round) {
      SCOPED_TRACE(testing::Message() << StoredPicture::NameOf(kind) << ", round " << round << ", seed 72");
      const Samples pixels = noise.Many(16 * 12 * 4);
      const unsigned views = noise.Byte();
      const bool same = noise.Between(0, 3) == 0;
      const Arguments a{{noise.Between(0, 3), noise.Between(0, 3), 13, 9},
                        noise.Between(0, 3),
                        noise.Between(0, 3),
                        AnyOptions(noise, {})};
      Samples results[2];
      for (const bool byPixel : {false, true}) {
        const StoredPicture stored(kind, 16, 12, Format::BGRA);
        SetPacked(stored.Get(), pixels);
        Noise again(views);
        const Picture dest = AnyView(again, stored.Get()), image = same ? dest : AnyView(again, stored.Get());
        CombineOptions how = a.How;
        if (!how.ForeColour && !how.MaskColour) how.ForeColour = Color{1, 2, 3};
        if (round % 2) how.Mask = AnyView(again, stored.Get());
        if (!byPixel) dest.Combine(image, a.Dest, a.X, a.Y, how);
        for (int y = 0; byPixel && y < a.Dest.Height; ++y)
          for (int x = 0; x < a.Dest.Width; ++x)
            if (a.X + x < image.Width() && a.Y + y < image.Height())
              dest.Combine(image, {a.Dest.X + x, a.Dest.Y + y, 1, 1}, a.X + x, a.Y + y, how);
        results[byPixel] = Packed(stored.Get());
      }
      ASSERT_EQ(results[0], results[1]);
    }
}

TEST(Combine, GivesKnownAnswers) {
  const Color gray128{128, 128, 128}, some{10, 20, 30};
  struct {
    Format Dest, Image, Mask;  // Unknown for none
    Samples D, S, M;
    CombineOptions How;
    Samples Result;
  } cases[] = {
      {Format::G, Format::G, Format::G, {100}, {200}, {128}, {}, {149}},
      {Format::G, Format::G, Format::G, {100}, {200}, {255}, {}, {100}},
      {Format::G, Format::G, Format::G, {100}, {200}, {0}, {}, {200}},
      {Format::G, Format::G, Format::G, {100}, {200}, {255}, {.PreMultipliedSource = true}, {44}},
      // A mask without alpha keeps the dest's, and adds the source's when that is premultiplied.
      {Format::GA, Format::GA, Format::G, {1, 50}, {2, 60}, {0}, {}, {2, 50}},
      {Format::GA, Format::GA, Format::G, {1, 50}, {2, 60}, {0}, {.PreMultipliedSource = true}, {2, 110}},
      {Format::GA, Format::GA, Format::GA, {1, 50}, {2, 60}, {0, 0}, {.PreMultipliedSource = true}, {2, 60}},
      {Format::RGB, Format::G, Format::Unknown, {255, 255, 255}, {0}, {}, {.ForeColour = some}, {10, 20, 30}},
      {Format::RGB,
       Format::RGB,
       Format::Unknown,
       {9, 9, 9},
       {7, 8, 9},
       {},
       {.MaskColour = gray128},
       {7, 8, 9}},
      {Format::RGB,
       Format::RGB,
       Format::Unknown,
       {0, 0, 0},
       {255, 8, 9},
       {},
       {.UseColours = true, .ForeColour = some, .MaskColour = gray128},
       {127, 3, 4}},
      {Format::CMYK, Format::G, Format::G, {1, 2, 3, 4}, {9}, {0}, {}, {1, 2, 3, 4}},
      // Without a mask or colours it copies.
      {Format::CMYK,
       Format::G,
       Format::Unknown,
       {1, 2, 3, 4},
       {9},
       {},
       {.PreMultipliedSource = true},
       {0, 0, 0, 9}},
  };
  for (auto& c : cases) {
    SCOPED_TRACE(&c - cases);
    const Picture dest(1, 1, c.Dest), image(1, 1, c.Image);
    SetPacked(dest, c.D);
    SetPacked(image, c.S);
    if (c.Mask != Format::Unknown) {
      c.How.Mask = Picture(1, 1, c.Mask);
      SetPacked(c.How.Mask, c.M);
    }
    EXPECT_TRUE(dest.Combine(image, {0, 0, 1, 1}, 0, 0, c.How));
    EXPECT_EQ(Packed(dest), c.Result);
  }
}

TEST(Combine, RefusesAndLeavesTheDestAlone) {
  const Picture dest(4, 4, Format::RGB), image(4, 4, Format::RGB), mask(4, 4, Format::G),
      none(0, 4, Format::G);
  image.FillRect(200);
  const CombineOptions masked{.Mask = mask}, coloured{.ForeColour = Color{1, 2, 3}};
  const Rect all{0, 0, 4, 4};
  for (const CombineOptions& how : {masked, coloured, CombineOptions{}}) {
    EXPECT_FALSE(dest.Combine({}, all, 0, 0, how));
    EXPECT_FALSE(dest.Combine(none, all, 0, 0, how));
    EXPECT_FALSE(none.Combine(image, all, 0, 0, how));
    EXPECT_FALSE(dest.Combine(image, {0, 0, 0, 4}, 0, 0, how));
    EXPECT_FALSE(dest.Combine(image, {0, 0, 4, -4}, 0, 0, how));
    EXPECT_FALSE(dest.Combine(image, all, 4, 0, how));
    EXPECT_FALSE(dest.Combine(image, {0, 4, 4, 4}, 0, 0, how));
  }
  EXPECT_FALSE(dest.Combine(image, all, 0, 0, {.Mask = mask.ClipImage({0, 0, 4, 3})}));
  EXPECT_FALSE(dest.Combine(image, all, 0, 0, {.Mask = none}));
  EXPECT_EQ(Packed(dest), Samples(48, 0));
}

}
}
