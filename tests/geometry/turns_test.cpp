#include <gtest/gtest.h>

#include <algorithm>
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

TEST(Turns, WriteOtherOrdersAndLargerPictures) {
  for (const Way& way : Ways())
    for (const Format format : {Format::BGRA, Format::XRGB, Format::BGR, Format::RGB}) {
      const Picture source(18, 20, Format::RGB), dest(30, 31, format);
      const Samples pixels = Noise(57).Many(18 * 20 * 3);
      SetPacked(source, pixels);
      FillWithNoise(dest, 58);
      Picture wanted = dest.Clone();
      const int width = way.Swaps ? 20 : 18, height = way.Swaps ? 18 : 20;
      const Picture part = wanted.ClipImage({0, 0, width, height});
      const Samples turned = Wanted(way, pixels, Samples(pixels.size()), 18, 20, Format::RGB);
      for (int c = 0; c < 3; ++c) {
        Samples plane;
        for (std::size_t i = std::size_t(c); i < turned.size(); i += 3) plane.push_back(turned[i]);
        const Picture views[] = {part.RedChannel(), part.GreenChannel(), part.BlueChannel()};
        views[c].SetDataStringInFormat(Format::G, plane);
      }
      EXPECT_EQ(way.Turn(source, dest), dest);
      EXPECT_EQ(StoredRows(dest), StoredRows(wanted)) << way.Name << " " << int(format);
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
