#include <cstdlib>

#include "support/plain_picture.h"

namespace picturezor {
namespace {

constexpr int Width = 9, Height = 7;

/// Every format on every store, filled with noise: body(picture, a plain copy, random numbers).
template <class Body>
void OnNoise(unsigned seed, Body&& body) {
  Noise noise(seed);
  for (const Format format : EveryFormat()) {
    SCOPED_TRACE(testing::Message() << "format " << int(format) << ", seed " << seed);
    ForEveryStore(Width, Height, format, [&](const Picture& picture) {
      for (int round = 0; round < 4; ++round) {
        SetPacked(picture, noise.Many(std::size_t(Width * Height * picture.PixelSize())));
        body(picture, PlainPicture(picture), noise);
      }
    });
  }
}

TEST(FillRect, SetsEverySampleOfTheRectangle) {
  OnNoise(1, [](const Picture& picture, PlainPicture plain, Noise& noise) {
    const Rect rect = AnyRect(noise, Width, Height);
    const int value = noise.Between(-300, 300);
    ForPixels(plain, rect, [&](int x, int y) {
      for (char plane : plain.Colours() + (plain.Family() && plain.Has('A') ? "A" : ""))
        plain.At(x, y, plane) = std::uint8_t(value);
    });
    picture.FillRect(rect, value);
    EXPECT_EQ(Packed(picture), plain.Pixels);
  });
}

TEST(FillRectRGB, SetsTheColourAndAlphaIfAsked) {
  OnNoise(2, [](const Picture& picture, PlainPicture plain, Noise& noise) {
    const Rect rect = AnyRect(noise, Width, Height);
    const int red = noise.Between(-300, 300), alpha = noise.Between(0, 2) ? noise.Between(0, 700) : red;
    const Color colour{noise.Byte(), noise.Byte(), noise.Byte()};
    const bool withAlpha = noise.Between(0, 1), asColour = noise.Between(0, 1);
    if (plain.Family() == 'R')
      ForPixels(plain, rect, [&](int x, int y) {
        plain.At(x, y, 'R') = asColour ? colour.Red : std::uint8_t(red);
        plain.At(x, y, 'G') = colour.Green;
        plain.At(x, y, 'B') = colour.Blue;
        if (withAlpha && plain.Has('A')) plain.At(x, y, 'A') = std::uint8_t(alpha);
      });
    if (asColour)
      withAlpha ? picture.FillRectRGB(rect, colour, alpha) : picture.FillRectRGB(rect, colour);
    else
      withAlpha ? picture.FillRectRGB(rect, red, colour.Green, colour.Blue, alpha)
                : picture.FillRectRGB(rect, red, colour.Green, colour.Blue);
    EXPECT_EQ(Packed(picture), plain.Pixels);
  });
}

// Catches a pixel cut in two where blocks of them begin or end, within the caches and past them.
TEST(FillRectRGB, FillsLongRows) {
  constexpr int width = 3000, height = 1000;
  for (const Format format : {Format::BGR, Format::RGBA})
    for (const Rect& rect : {Rect{1, 1, 2990, 990}, {5, 3, 40, 3}, {2, 0, 61, 2}}) {
      const Picture picture(width, height, format);
      PlainPicture plain(picture);
      ForPixels(plain, rect, [&](int x, int y) {
        for (int i = 0; i < 3; ++i) plain.At(x, y, "RGB"[i]) = std::uint8_t(i + 1);
        if (plain.Has('A')) plain.At(x, y, 'A') = 4;
      });
      picture.FillRectRGB(rect, 1, 2, 3, 4);
      EXPECT_TRUE(Packed(picture) == plain.Pixels) << int(format) << " " << rect.Width;
    }
}

// The forms without a rectangle take the same way over the whole picture.
TEST(FillRect, TakesTheWholePicture) {
  const Picture picture(2, 1, Format::ABGR);
  const auto after = [&](auto fill) {
    picture.FillRect(9);
    fill();
    return Packed(picture);
  };
  EXPECT_EQ(after([&] { picture.FillRect(300); }), Samples(8, 44));
  EXPECT_EQ(after([&] { picture.FillRectRGB(1, 2, 3); }), (Samples{9, 3, 2, 1, 9, 3, 2, 1}));
  EXPECT_EQ(after([&] { picture.FillRectRGB(1, 2, 3, -1); }), (Samples{255, 3, 2, 1, 255, 3, 2, 1}));
  EXPECT_EQ(after([&] { picture.FillRectRGB(Color{4, 5, 6}); }), (Samples{9, 6, 5, 4, 9, 6, 5, 4}));
  EXPECT_EQ(after([&] { picture.FillRectRGB(Color{4, 5, 6}, 7); }), (Samples{7, 6, 5, 4, 7, 6, 5, 4}));
  const Picture gray(1, 1, Format::GA), inks(1, 1, Format::CMYKA);
  gray.FillRectRGB(1, 2, 3, 4);
  inks.FillRectRGB(1, 2, 3, 4);
  EXPECT_EQ(Packed(gray), Samples(2, 0));
  EXPECT_EQ(Packed(inks), Samples(5, 0));
}

TEST(FillRectRandom, DrawsInTheOrderOfItsTable) {
  OnNoise(3, [](const Picture& picture, PlainPicture plain, Noise& noise) {
    const Rect rect = AnyRect(noise, Width, Height);
    std::string order = plain.Colours();
    if (plain.Family() && plain.Has('A')) order = order[0] == 'C' ? "A" + order : order + "A";
    if (plain.Family() != 'C' && order.size() == plain.Layout.size()) order = plain.Layout;
    std::srand(7);
    ForPixels(plain, rect, [&](int x, int y) {
      for (char plane : order) plain.At(x, y, plane) = std::uint8_t(std::rand());
    });
    const int next = std::rand();
    std::srand(7);
    picture.FillRectRandom(rect);
    EXPECT_EQ(Packed(picture), plain.Pixels);
    EXPECT_EQ(std::rand(), next) << "as many draws as samples";
  });
}

TEST(ClearRect, ClearsTheBytesOfItsPixels) {
  OnNoise(4, [](const Picture& picture, PlainPicture plain, Noise& noise) {
    const Rect rect = AnyRect(noise, Width, Height);
    ForPixels(plain, rect, [&](int x, int y) {
      std::fill_n(&plain.Pixels[std::size_t(y * Width + x) * plain.Layout.size()], plain.Layout.size(), 0);
    });
    picture.ClearRect(rect);
    EXPECT_EQ(Packed(picture), plain.Pixels);
    // On a view it leaves the surroundings alone, which ForEveryStore looks at.
    if (!picture.Parent()) return;
    picture.ClearRect();
    EXPECT_EQ(Packed(picture), Samples(plain.Pixels.size(), 0));
  });
}

// Catches rows left out between the windows of a mapped picture, which are cleared together.
TEST(ClearRect, TakesThePaddingOfAPictureOfItsOwn) {
  const MemoryBlock block(Samples(40, 5));
  const Picture picture(block, 4, 4, Format::G, 10);
  picture.ClearRect({0, 0, 4, 4});
  EXPECT_EQ(block.Data()[3] + block.Data()[30], 0);
  EXPECT_EQ(block.Data()[4], 5);
  picture.ClearRect();
  EXPECT_EQ(Samples(block.Data().begin(), block.Data().end()), Samples(40, 0));

  const TemporaryFile file;
  const Picture mapped = Picture::Mapped(file.Path(), 5, 23, Format::RGB, 1);
  for (int y = 0; y < 23; ++y) mapped.SetRow(y, Samples(std::size_t(mapped.RowSize()), 5));
  mapped.ClearRect();
  for (int y = 0; y < 23; ++y) EXPECT_EQ(mapped.Row(y), Samples(std::size_t(mapped.RowSize()), 0)) << y;
}

TEST(ClearRect, ClearsOnlyThePlanesOfAViewOfChannels) {
  const auto cleared = [](Format format, auto view) {
    const Picture picture(3, 1, format);
    SetPacked(picture, Samples(std::size_t(3 * BytesPerPixel(format)), 9));
    view(picture);
    return Packed(picture);
  };
  EXPECT_EQ(cleared(Format::RGBA, [](const Picture& p) { p.GreenChannel().ClearRect(); }),
            (Samples{9, 0, 9, 9, 9, 0, 9, 9, 9, 0, 9, 9}));
  EXPECT_EQ(cleared(Format::XRGB,
                    [](const Picture& p) {
                      p.RGBChannels().ClearRect({1, 0, 1, 1});
                    }),
            (Samples{9, 9, 9, 9, 9, 0, 0, 0, 9, 9, 9, 9}));
  EXPECT_EQ(cleared(Format::XRGB,
                    [](const Picture& p) {
                      p.ClipImage({1, 0, 1, 1}).ClearRect();
                    }),
            (Samples{9, 9, 9, 9, 0, 0, 0, 0, 9, 9, 9, 9}));
  EXPECT_EQ(cleared(Format::GA,
                    [](const Picture& p) {
                      p.AlphaChannel().ClipImage({2, 0, 9, 9}).ClearRect();
                    }),
            (Samples{9, 9, 9, 9, 9, 0}));
  EXPECT_EQ(cleared(Format::Scaling2,
                    [](const Picture& p) {
                      p.ClipImage({1, 0, 2, 1}).ClipImage({1, 0, 1, 1}).ClearRect();
                    }),
            (Samples{9, 9, 9, 9, 0, 0}));
  EXPECT_EQ(cleared(Format::TwoOf3, [](const Picture& p) { p.GrayChannel().MirroredView().ClearRect(); }),
            (Samples{9, 0, 9, 9, 0, 9, 9, 0, 9}));
}

}
}
