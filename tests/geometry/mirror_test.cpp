#include <gtest/gtest.h>

#include <functional>

#include "geometry/planes.h"
#include "support/every_target.h"

namespace picturezor {
namespace {

constexpr ImageSize Sizes[] = {{1, 1}, {1, 6}, {6, 1}, {5, 7}, {16, 5}, {33, 6}, {67, 9}};

// Catches a middle that is lost, a filler byte that moves, and a vector that takes too much or too little.
TEST(Mirror, MovesPlanesInPlace) {
  const struct {
    const char* Name;
    void (Picture::*Move)() const;
    bool Left, Top;
  } ways[] = {{"HMirror", &Picture::HMirror, true, false},
              {"VMirror", &Picture::VMirror, false, true},
              {"Rotate180", static_cast<void (Picture::*)() const>(&Picture::Rotate180), true, true}};
  for (const Format format : EveryFormat())
    for (const auto& [w, h] : Sizes)
      ForEveryStore(w, h, format, [&](const Picture& picture) {
        const Samples pixels = Noise(51).Many(std::size_t(w * h * BytesPerPixel(format)));
        for (const auto& way : ways) {
          Samples wanted = pixels;
          MovePlanes(pixels, wanted, w, h, format, [&](int x, int y) {
            return (way.Top ? h - 1 - y : y) * w + (way.Left ? w - 1 - x : x);
          });
          ForEveryTarget([&] {
            SetPacked(picture, pixels);
            (picture.*way.Move)();
            EXPECT_EQ(Packed(picture), wanted) << way.Name << " " << int(format) << " " << w << " x " << h;
          });
        }
      });
}

// A channel by itself leaves its neighbours alone.
TEST(Mirror, MovesOnePlaneOfAView) {
  ForEveryTarget([] {
    const Picture picture(40, 4, Format::ARGB);
    const Samples pixels = Noise(52).Many(640);
    SetPacked(picture, pixels);
    picture.GreenChannel().Rotate180();
    Samples wanted = pixels;
    for (std::size_t i = 0; i < 160; ++i) wanted[i * 4 + 2] = pixels[(159 - i) * 4 + 2];
    EXPECT_EQ(Packed(picture), wanted);
  });
}

// The rows of a caller's block may overlap. Each pair is read whole and then written, the upper row first.
TEST(Mirror, ReadsOverlappingRowsBeforeItWrites) {
  for (const bool turned : {false, true}) {
    const MemoryBlock block(Noise(53).Many(4 * 5 + 9));
    Samples wanted(block.Data().begin(), block.Data().end());
    for (std::ptrdiff_t top = 0; top < 3; ++top) {
      const auto upper = wanted.begin() + top * 4, lower = wanted.begin() + (5 - top) * 4;
      const Samples a(upper, upper + 9), b(lower, lower + 9);
      const auto pixel = [&](const Samples& row, int i) {
        return row[std::size_t(turned ? 6 - i / 3 * 3 + i % 3 : i)];
      };
      for (int i = 0; i < 9; ++i) upper[i] = pixel(b, i);
      for (int i = 0; i < 9; ++i) lower[i] = pixel(a, i);
    }
    const Picture picture(block, 3, 6, Format::RGB, 4);
    turned ? picture.Rotate180() : picture.VMirror();
    EXPECT_EQ(Samples(block.Data().begin(), block.Data().end()), wanted) << turned;
  }
}

}
}
