#include "image/walk.h"

#include <gtest/gtest.h>

#include <utility>

#include "support/every_store.h"

namespace picturezor {
namespace {

// A walk that reads what it has written gives the same on a window that moves as in memory.
TEST(Walk, ReadsAndWritesOnePicture) {
  for (const int down : {1, 2, 6})
    ForEveryStore(2, 12, Format::G, [&](const Picture& picture) {
      const Samples pixels = Noise(22).Many(24);
      SetPacked(picture, pixels);
      const int left = picture.GrayOffset();
      auto& data = DataOf(picture);
      EXPECT_TRUE(zor::Walk(zor::From(data), zor::Into(data, down))
                      .Rows(12 - down, [&](std::int32_t, const std::uint8_t* source, std::uint8_t* dest) {
                        std::copy_n(source + left, 2, dest + left);
                      }));
      Samples wanted = pixels;
      for (std::size_t i = std::size_t(down) * 2; i < 24; ++i) wanted[i] = wanted[i - std::size_t(down) * 2];
      EXPECT_EQ(Packed(picture), wanted);
    });
}

TEST(Walk, EndsAtARowThatCantBeReached) {
  const StoredPicture stored(StoredPicture::Mapped, 2, 12, Format::G);
  auto& data = DataOf(stored.Get());
  ASSERT_TRUE(zor::WithRow(data, 0, [](std::uint8_t*) {}));
  const int rows = std::exchange(data.RowsPerBlock, 100);  // no further window fits the file
  int done = 0;
  EXPECT_FALSE(zor::Walk(zor::From(data)).Rows(12, [&](std::int32_t, std::uint8_t*) { ++done; }));
  EXPECT_EQ(done, 5);
  EXPECT_FALSE(zor::WithRow(data, 11, [&](std::uint8_t*) { ++done; }));
  EXPECT_EQ(done, 5);
  data.RowsPerBlock = rows;
  EXPECT_TRUE(zor::WithRow(data, 11, [](std::uint8_t*) {})) << "the next call tries again";
}

}
}
