#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <functional>

#include "geometry/planes.h"
#include "support/every_target.h"

namespace picturezor {
namespace {

struct Way {
  const char* Name;
  std::function<Picture(const Picture&, const Picture&)> Turn;
  bool Swaps;
  /// Where the pixel (x, y) of the result stands in a source of w x h.
  std::function<int(int x, int y, int w, int h)> Place;
};

const std::vector<Way>& Ways() {
  const auto half = [](int x, int y, int w, int h) { return (h - 1 - y) * w + w - 1 - x; };
  const auto left = [](int x, int y, int w, int) { return x * w + w - 1 - y; };
  const auto right = [](int x, int y, int w, int h) { return (h - 1 - x) * w + y; };
  static const std::vector<Way> ways{
      {"Rotate180", [](auto& p, auto& dest) { return p.Rotate180(dest); }, false, half},
      {"Rotate90", [](auto& p, auto& dest) { return p.Rotate90(dest); }, true, left},
      {"Rotate90slow", [](auto& p, auto& dest) { return p.Rotate90slow(dest); }, true, left},
      {"Rotate270", [](auto& p, auto& dest) { return p.Rotate270(dest); }, true, right},
      {"Rotate270slow", [](auto& p, auto& dest) { return p.Rotate270slow(dest); }, true, right}};
  return ways;
}

Samples Wanted(const Way& way, const Samples& pixels, Samples into, int w, int h, Format format) {
  MovePlanes(pixels, into, way.Swaps ? h : w, way.Swaps ? w : h, format,
             [&](int x, int y) { return way.Place(x, y, w, h); });
  return into;
}

TEST(Turns, FollowTheirCorners) {
  const Picture picture(3, 2, Format::G);
  SetPacked(picture, {1, 2, 3, 4, 5, 6});
  const Samples wanted[] = {
      {6, 5, 4, 3, 2, 1}, {3, 6, 2, 5, 1, 4}, {3, 6, 2, 5, 1, 4}, {4, 1, 5, 2, 6, 3}, {4, 1, 5, 2, 6, 3}};
  for (std::size_t i = 0; i < 5; ++i) {
    const Picture result = Ways()[i].Turn(picture, {});
    EXPECT_EQ(result.Width(), i == 0 ? 3 : 2);
    EXPECT_EQ(Packed(result), wanted[i]) << Ways()[i].Name;
  }
}

// Catches a window that doesn't hold what a tile needs, a wrong edge of a vector's square, and filler bytes
// that are carried along.
TEST(Turns, MovePlanesOnEveryStore) {
  constexpr ImageSize sizes[] = {{5, 6}, {37, 19}};
  for (const Format format : EveryFormat())
    for (const auto& [w, h] : sizes) {
      SCOPED_TRACE(testing::Message() << int(format) << " " << w << " x " << h);
      const Samples pixels = Noise(54).Many(std::size_t(w * h * BytesPerPixel(format)));
      const Samples blank(pixels.size()), old = Noise(55).Many(pixels.size());
      const Picture plain(w, h, format);
      SetPacked(plain, pixels);
      ForEveryStore(w, h, format, [&](const Picture& picture) {
        SetPacked(picture, pixels);
        for (const Way& way : Ways()) {
          const Samples wanted = Wanted(way, pixels, blank, w, h, format);
          ForEveryTarget([&] { EXPECT_EQ(Packed(way.Turn(picture, {})), wanted) << way.Name; });
        }
      });
      for (const bool swaps : {false, true})
        ForEveryStore(swaps ? h : w, swaps ? w : h, format, [&](const Picture& dest) {
          for (const Way& way : Ways()) {
            if (way.Swaps != swaps) continue;
            const Samples wanted = Wanted(way, pixels, old, w, h, format);
            ForEveryTarget([&] {
              SetPacked(dest, old);
              EXPECT_EQ(way.Turn(plain, dest), dest);
              EXPECT_EQ(Packed(dest), wanted) << way.Name;
            });
          }
        });
    }
}

// Both windows move, downwards or upwards.
TEST(Turns, GoFromFileToFile) {
  constexpr int w = 23, h = 41;
  const Samples pixels = Noise(56).Many(w * h * 3);
  for (const Way& way : Ways())
    for (const bool upwards : {false, true}) {
      SCOPED_TRACE(testing::Message() << way.Name << " " << upwards);
      const StoredPicture from(StoredPicture::Mapped, w, h, Format::RGB);
      const StoredPicture into(StoredPicture::Mapped, way.Swaps ? h : w, way.Swaps ? w : h, Format::RGB);
      const Picture source = upwards ? from.Get().MirroredView() : from.Get();
      const Picture dest = upwards ? into.Get().MirroredView() : into.Get();
      SetPacked(source, pixels);
      EXPECT_EQ(way.Turn(source, dest), dest);
      EXPECT_EQ(Packed(dest), Wanted(way, pixels, Samples(pixels.size()), w, h, Format::RGB));
    }
}

// Catches a row taken from elsewhere where more rows are asked for together than a window has.
TEST(Turns, TakeMoreRowsThanAWindow) {
  constexpr int width = 7, height = 26000;
  const Picture plain(width, height, Format::G);
  plain.SetDataStringInFormat(Format::G, Noise(59).Many(std::size_t{width} * height));
  const auto pixels = [](const Picture& picture) { return picture.DataStringInFormat(Format::G); };
  const TemporaryFile tallFile, wideFile;
  const Picture tall = Picture::Mapped(tallFile.Path(), width, height, Format::G);
  const Picture wide = Picture::Mapped(wideFile.Path(), height, width, Format::G);
  tall.SetDataStringInFormat(Format::G, pixels(plain));
  EXPECT_TRUE(tall.Rotate90(wide));
  EXPECT_EQ(pixels(wide), pixels(plain.Rotate90()));
  tall.VMirror();
  EXPECT_EQ(pixels(tall), pixels(plain.MirroredView()));
  EXPECT_TRUE(wide.MirroredView().Rotate90(tall.MirroredView()));
  EXPECT_EQ(pixels(tall), pixels(plain));
  tall.VMirror();
  EXPECT_TRUE(wide.Rotate270(tall));
  EXPECT_EQ(pixels(tall), pixels(plain));
}

// Catches rows that are composed outside the mapping and then written to the wrong place of the file: by more
// than one group of rows, and into the middle of a larger picture.
TEST(Turns, WriteMoreRowsThanAreComposedTogether) {
  if (sizeof(void*) == 4) GTEST_SKIP() << "all rows are mapped";
  constexpr int width = 4050, height = 26000;
  const Picture plain = NoisePicture(width, height, Format::G, 62);
  const TemporaryFile from, into;
  const Picture source = Picture::Mapped(from.Path(), width, height, Format::G);
  const Picture dest = Picture::Mapped(into.Path(), height + 20, width + 9, Format::G);
  ASSERT_TRUE(source.CopyPixels(plain));
  dest.FillRect(77);
  const Picture part = dest.ClipImage({11, 5, height, width});
  EXPECT_TRUE(plain.Rotate90(part));
  EXPECT_EQ(part.CompareImages(plain.Rotate90()), 0);
  EXPECT_TRUE(source.Rotate270(part));
  EXPECT_EQ(part.CompareImages(plain.Rotate270()), 0);
  // The frame keeps what it held.
  dest.FillRect({11, 5, height, width}, 77);
  const Picture filled(height + 20, width + 9, Format::G);
  filled.FillRect(77);
  EXPECT_EQ(dest.CompareImages(filled), 0);
}

TEST(Turns, WriteOtherOrdersAndLargerPictures) {
  for (const Way& way : Ways())
    for (const Format format : {Format::BGRA, Format::XRGB, Format::BGR, Format::RGB}) {
      const Picture source(18, 20, Format::RGB), dest(30, 31, format);
      const Samples pixels = Noise(57).Many(18 * 20 * 3);
      SetPacked(source, pixels);
      FillWithNoise(dest, 58);
      const Samples turned = Wanted(way, pixels, Samples(pixels.size()), 18, 20, Format::RGB);
      std::vector<Samples> wanted = StoredRows(dest);
      const std::size_t width = way.Swaps ? 20 : 18, pixel = LettersOf(format).size();
      for (std::size_t i = 0; i < turned.size(); ++i)
        wanted[i / 3 / width][i / 3 % width * pixel + LettersOf(format).find("RGB"[i % 3])] = turned[i];
      EXPECT_EQ(way.Turn(source, dest), dest);
      EXPECT_EQ(StoredRows(dest), wanted) << way.Name << " " << int(format);
    }
}

// What goes through vectors, in bands, and past the caches against what goes pixel by pixel, at all the edges
// that these have, and from and into the middle of rows.
TEST(Turns, EndAsTheSlowForms) {
  constexpr ImageSize sizes[] = {{6, 16}, {5, 100}, {21, 63}, {40, 64}, {17, 65}, {90, 150}, {1100, 130}};
  constexpr ImageSize large[] = {{2950, 2900}, {1700, 1700}, {1450, 1500}};
  const auto agree = [](const Picture& source, const ImageSize& size, int left) {
    const Picture fast(size.Height + 9, size.Width, source.ImageFormat()), slow = fast.Clone();
    const auto part = [&](const Picture& whole) {
      return whole.ClipImage({left, 0, size.Height, size.Width});
    };
    source.Rotate90slow(part(slow));
    ForEveryTarget([&] { EXPECT_EQ(Packed(source.Rotate90(part(fast))), Packed(part(slow))); });
    source.Rotate270slow(part(slow));
    ForEveryTarget([&] { EXPECT_EQ(Packed(source.Rotate270(part(fast))), Packed(part(slow))); });
    EXPECT_EQ(StoredRows(fast), StoredRows(slow));
  };
  for (std::size_t i = 0; i < 3; ++i) {
    const Format format = std::array{Format::G, Format::RGB, Format::RGBA}[i];
    SCOPED_TRACE(int(format));
    for (const ImageSize& size : sizes)
      for (const int left : {0, 3}) {
        SCOPED_TRACE(testing::Message() << size.Width << " x " << size.Height << " at " << left);
        const Picture source = NoisePicture(size.Width + 5, size.Height, format, 59);
        agree(source.ClipImage({left, 0, size.Width, size.Height}), size, left);
      }
    const Picture source = NoisePicture(large[i].Width, large[i].Height, format, 60);
    agree(source, large[i], 7);
  }
}

// Rows of a caller's block that overlap hold what was written last.
TEST(Turns, WriteOverlappingRowsInTheSlowOrder) {
  const Picture source = NoisePicture(70, 90, Format::RGB, 61);
  const std::pair<Picture (Picture::*)(const Picture&) const, Picture (Picture::*)(const Picture&) const>
      pairs[] = {{&Picture::Rotate90, &Picture::Rotate90slow},
                 {&Picture::Rotate270, &Picture::Rotate270slow}};
  for (const auto& [fast, slow] : pairs) {
    const MemoryBlock blocks[] = {MemoryBlock(100 * 70 + 270), MemoryBlock(100 * 70 + 270)};
    (source.*fast)(Picture(blocks[0], 90, 70, Format::RGB, 100));
    (source.*slow)(Picture(blocks[1], 90, 70, Format::RGB, 100));
    EXPECT_TRUE(std::ranges::equal(blocks[0].Data(), blocks[1].Data()));
  }
}

TEST(Turns, RefuseWhatTheyCantWrite) {
  const Picture source(6, 9, Format::RGBA);
  for (const Way& way : Ways()) {
    SCOPED_TRACE(way.Name);
    const int width = way.Swaps ? 9 : 6, height = way.Swaps ? 6 : 9;
    EXPECT_FALSE(way.Turn(source, source));
    EXPECT_FALSE(way.Turn(source, Picture(width - 1, height, Format::RGBA)));
    EXPECT_FALSE(way.Turn(source, Picture(width, height - 1, Format::RGBA)));
    EXPECT_FALSE(way.Turn(source, Picture(width, height, Format::RGB)));
    EXPECT_FALSE(way.Turn(source, Picture(width, height, Format::CMYKA)));
    const Picture closed(6, 9, Format::G);
    closed.Close();
    EXPECT_FALSE(way.Turn(closed, {}));
    EXPECT_FALSE(way.Turn(source, closed));
    const Picture square(6, 6, Format::G);
    const PictureFactory itself([&](int, int, Format) { return square; });
    square.SetFactory(itself);
    EXPECT_FALSE(way.Turn(square, {}));
    square.SetFactory({});
  }
}

// Where the destination shows the source's samples, the order of the pixels makes the result: squares of
// three rows on files with windows of five, single pixels in memory.
TEST(Turns, KeepTheirOrderOnSharedSamples) {
  constexpr int edge = 7, whole = 10;
  for (const Way& way : Ways())
    for (const auto kind : {StoredPicture::Memory, StoredPicture::Mapped}) {
      SCOPED_TRACE(testing::Message() << way.Name << " " << StoredPicture::NameOf(kind));
      const StoredPicture stored(kind, whole, whole, Format::G);
      Samples wanted = Noise(59).Many(whole * whole);
      SetPacked(stored.Get(), wanted);
      const bool tiled =
          kind == StoredPicture::Mapped && std::string(way.Name).size() == 8 + (way.Name[6] == '2');
      const int tile = tiled ? 3 : edge;
      for (int top = 0; top < edge; top += tile)
        for (int left = 0; left < edge; left += tile)
          for (int y = top; y < std::min(top + tile, edge); ++y)
            for (int i = left; i < std::min(left + tile, edge); ++i) {
              // A half turn goes along the row that it writes, the others along the row that they read.
              const int x = way.Swaps ? i : edge - 1 - i;
              for (int to = 0; to < edge * edge; ++to)
                if (way.Place(to % edge, to / edge, edge, edge) == y * edge + x)
                  wanted[std::size_t((to / edge + 2) * whole + to % edge + 1)] =
                      wanted[std::size_t(y * whole + x)];
            }
      way.Turn(stored.Get().ClipImage({0, 0, edge, edge}), stored.Get().ClipImage({1, 2, edge, edge}));
      EXPECT_EQ(Packed(stored.Get()), wanted);
    }
}

}
}
