#include <gtest/gtest.h>

#include <cstdlib>
#include <utility>

#include "image/walk.h"
#include "support/every_store.h"

// What all filters that look around have in common.

namespace picturezor {
namespace {

using Filter = std::function<Picture(const Picture& source, const Picture& dest)>;

Picture Sharpened(const Picture& source, const Picture& dest) {
  return source.ApplyMatrix(dest, 3, IntegerArray({0, -1, 0, -1, 5, -1, 0, -1, 0}));
}
Picture Oiled(const Picture& source, const Picture& dest) { return source.OilFilter(dest, 20, 2); }
Picture OiledFar(const Picture& source, const Picture& dest) { return source.OilFilter(dest, 20, 9); }
Picture Diffused(const Picture& source, const Picture& dest) {
  std::srand(3);
  return source.DiffuseFilter(dest, 2);
}
Picture Engraved(const Picture& source, const Picture& dest) { return source.EngraveFilter(dest, 1); }
Picture Neon(const Picture& source, const Picture& dest) { return source.NeonFilter(dest); }
Picture Blurred(const Picture& source, const Picture& dest) { return source.BoxBlurFilter(dest, 1); }
Picture BlurredDown(const Picture& source, const Picture& dest) {
  return source.BoxBlurFilter(dest, 1, true, false);
}
Picture BlurredAlong(const Picture& source, const Picture& dest) {
  return source.BoxBlurFilter(dest, 1, false, true);
}
Picture BlurredALittle(const Picture& source, const Picture& dest) {
  return source.BoxBlurFractionalFilter(dest, 0.5);
}
/// With so exact a weight a single column goes along unchanged.
Picture BlurredALittleDown(const Picture& source, const Picture&) {
  const Picture result(source.Width(), source.Height(), source.ImageFormat());
  for (int x = 0; x < source.Width(); ++x) {
    const Rect column{x, 0, 1, source.Height()};
    BlurredALittle(source.ClipImage(column), result.ClipImage(column));
  }
  return result;
}

// Rows of 18 bytes, 8 bytes from one to the next. What is written later stays; a blur in two directions reads
// what the first has left.
TEST(AreaFilters, WriteRowsThatOverlapInTheirOrder) {
  const struct {
    Filter Whole, Down, Along;
  } cases[] = {{Sharpened, Sharpened, {}},
               {Oiled, Oiled, {}},
               {OiledFar, OiledFar, {}},
               {Diffused, Diffused, {}},
               {Engraved, Engraved, {}},
               {Neon, Neon, {}},
               {BlurredDown, BlurredDown, {}},
               {BlurredAlong, BlurredAlong, {}},
               {Blurred, BlurredDown, BlurredAlong},
               {BlurredALittle, BlurredALittleDown, BlurredALittle}};
  const int width = 6, height = 7, rowBytes = width * 3, rowSize = 8;
  const Picture source = NoisePicture(width, height, Format::RGB, 71);
  for (std::size_t i = 0; i < std::size(cases); ++i) {
    Samples wanted(std::size_t(rowSize) * (height - 1) + rowBytes);
    const Samples down = Packed(cases[i].Down(source, {}));
    for (int y = 0; y < height; ++y)
      std::copy_n(down.begin() + y * rowBytes, rowBytes, wanted.begin() + y * rowSize);
    for (int y = 0; cases[i].Along && y < height; ++y) {
      const Picture row(width, 1, Format::RGB);
      const auto place = wanted.begin() + y * rowSize;
      SetPacked(row, Samples(place, place + rowBytes));
      std::ranges::copy(Packed(cases[i].Along(row, {})), place);
    }
    const MemoryBlock block(Samples(wanted.size()));
    const Picture dest(block, width, height, Format::RGB, rowSize);
    EXPECT_TRUE(cases[i].Whole(source, dest) == dest);
    EXPECT_EQ(Samples(block.Data().begin(), block.Data().end()), wanted) << "case " << i;
  }
}

// Of a mapped picture with twelve rows the first five are in the window, and no other can be mapped.
TEST(AreaFilters, GiveNilWhereARowCantBeReached) {
  const Filter filters[] = {Sharpened, Oiled,   OiledFar,    Diffused,     Engraved,
                            Neon,      Blurred, BlurredDown, BlurredAlong, BlurredALittle};
  for (std::size_t i = 0; i < std::size(filters); ++i)
    for (const bool source : {true, false}) {
      const StoredPicture stored(StoredPicture::Mapped, 4, 12, Format::G);
      const Picture &mapped = stored.Get(), other(4, 12, Format::G);
      auto& data = DataOf(mapped);
      ASSERT_TRUE(zor::WithRow(data, 0, [](std::uint8_t*) {}));
      const int rows = std::exchange(data.RowsPerBlock, 100);
      EXPECT_FALSE(filters[i](source ? mapped : other, source ? other : mapped)) << i << source;
      EXPECT_FALSE(source && filters[i](mapped, mapped)) << i << " in place";
      data.RowsPerBlock = rows;
    }
}

TEST(AreaFilters, LeaveRawPixelsAlone) {
  const Picture picture = NoisePicture(3, 3, Format::Scaling5, 65);
  for (const auto filter : {Sharpened, Oiled, Diffused, Engraved, Neon, Blurred})
    EXPECT_EQ(Packed(filter(picture, {})), Samples(45, 0));
  EXPECT_FALSE(BlurredALittle(picture, {}));
  EXPECT_FALSE(BlurredALittle(picture, Picture(3, 3, Format::Scaling5)));
  const Picture inks = NoisePicture(2, 2, Format::CMYK, 66);
  EXPECT_EQ(Packed(inks.DiffuseFilter({}, 1)), Samples(16, 0));
  const Picture small(1, 1, Format::G);
  EXPECT_EQ(inks.DiffuseFilter(small, 1), small) << "nothing is written, so any picture will do";
  EXPECT_EQ(Packed(inks.EngraveFilter({}, 1)), Samples(16, 0));
}

}
}
