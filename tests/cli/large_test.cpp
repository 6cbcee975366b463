#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Large : public CommandTest {};

TEST_F(Large, ChannelsAndComparisonsComeInRows) {
  WriteTIFF(At("a.tif"), Noise(400, 500, 4), {.Compression = 5, .Tile = 64});
  Raster other = Noise(400, 500, 4);
  other.Samples[700'000] ^= 64;
  other.Samples[700'009] ^= 1;
  WritePNG(At("b.png"), other);
  Do({"channels", "a.tif", "--memory-limit", "500K", "--temp-dir", "nowhere", "-o", "a-{}.png"});
  for (int c = 0; c < 4; ++c) {
    const char* const names[] = {"red", "green", "blue", "alpha"};
    const Raster channel = ReadPNG(At(std::string("a-") + names[c] + ".png")), all = Noise(400, 500, 4);
    ASSERT_EQ(channel.Samples.size(), 200'000u);
    for (std::size_t i = 0; i < channel.Samples.size(); ++i)
      ASSERT_EQ(channel.Samples[i], all.Samples[4 * i + std::size_t(c)]) << c << ' ' << i;
  }
  const Outcome compared =
      Run({"compare", "a.tif", "b.png", "--memory-limit", "500K", "--temp-dir", "nowhere"});
  EXPECT_EQ(compared.Code, 1);
  EXPECT_EQ(compared.Out,
            "total difference:  65\n"
            "mean per sample:   0.000081\n"
            "differing pixels:  2 of 200000 (0.0010 %)\n");
}

// Catches offsets and sizes of 32 bits: all that is white stands beyond the first 2 GiB.
TEST_F(Large, AnImageOfGigabytesThatTakeNoRoom) {
  WriteEmptyTIFF(At("large.tif"), 70'000, 32'000, 31'360);
  Do({"scale", "large.tif", "--width", "100", "--height", "50", "--kernel", "box", "--memory-limit", "64M",
      "--temp-dir", "nowhere", "-o", "small.png"});
  const Raster small = ReadPNG(At("small.png"));
  ASSERT_EQ(small.Samples.size(), 5000u);
  for (std::size_t i = 0; i < 5000; ++i) ASSERT_EQ(int(small.Samples[i]), i < 4900 ? 0 : 255) << i;
}

}

}
