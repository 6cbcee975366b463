#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Large : public CommandTest {
 protected:
  /// What a command makes of a file, and how it ended.
  std::pair<Outcome, Bytes> Made(Arguments command, const std::string& in, const Arguments& more,
                                 const std::string& out) {
    // Groups and their commands come first, files behind them.
    const std::ptrdiff_t names = command[0] == "filter" ? 2 : 1;
    command.insert(command.begin() + names, in);
    command.insert(command.end(), more.begin(), more.end());
    command.insert(command.end(), {"-q", "-o", out});
    std::filesystem::remove(At(out));
    const Outcome outcome = Run(command);
    return {outcome, ReadBytes(At(out))};
  }
};

// Catches pixels that depend on the way that a picture takes through the program: whole in memory, row by
// row, or through temporary files. And a temporary file where none is needed: there is no place for one.
TEST_F(Large, EveryWayGivesTheSameBytes) {
  const struct {
    Arguments Command;
    bool InRows = true;
  } cases[] = {
      {{"scale", "--width", "97"}},
      {{"scale", "--percent", "130", "--kernel", "cubic"}, false},
      {{"scale", "--height", "40", "--kernel", "box"}},
      {{"scale", "--fit", "77x300", "--fast"}},
      {{"crop", "--rect", "11,7,120,90"}},
      {{"convert"}},
      {{"convert", "--format", "gray"}},
      {{"mirror", "--horizontal"}},
      {{"mirror", "--vertical"}, false},
      {{"mirror", "--horizontal", "--vertical"}, false},
      {{"rotate", "--angle", "90"}, false},
      {{"rotate", "--angle", "180"}, false},
      {{"rotate", "--angle", "-90"}, false},
      {{"rotate", "--angle", "0"}},
      {{"rotate", "--angle", "33.3", "--background", "204060"}, false},
      {{"combine", "overlay.png", "--at", "100,70"}},
      {{"combine", "overlay.png", "--at", "-9,-12", "--premultiplied"}},
      {{"combine", "overlay.png", "--mask-colour", "808080"}},
      {{"combine", "overlay.png", "--fore", "ff8000", "--at", "30,150"}},
      {{"combine", "overlay.png", "--mask", "mask.png", "--at", "3,1"}},
      {{"filter", "invert"}},
      {{"filter", "solarize"}},
      {{"filter", "gamma", "--gamma", "2.2"}},
      {{"filter", "gain", "--gain", "0.7", "--bias", "0.4"}},
      {{"filter", "transfer", "--table", "9,8,7"}},
      {{"filter", "matrix", "--weights", "1 2 1, 2 4 2, 1 2 1", "--scale", "0.06"}},
      {{"filter", "blur", "--radius", "3", "--iterations", "2"}, false},
      {{"filter", "soft-blur", "--radius", "0.4"}},
      {{"filter", "stamp", "--radius", "6", "--threshold", "0.4"}, false},
      {{"filter", "unsharp", "--radius", "2"}, false},
      {{"filter", "oil", "--range", "2", "--levels", "16"}},
      {{"filter", "engrave", "--level", "2"}},
      {{"filter", "neon"}},
      {{"filter", "dither", "--pattern", "cluster3", "--levels", "3"}},
      {{"filter", "auto-level"}, false},
  };
  WritePNG(At("overlay.png"), Noise(90, 80, 4));
  WritePNG(At("mask.png"), Noise(90, 80, 1));
  WritePNG(At("rows.png"), Noise(301, 280, 3));
  WriteJPEG(At("turned.jpg"), Waves(301, 280, 3), {.Orientation = 6});
  WriteTIFF(At("tiles.tif"), Noise(290, 300, 4), {.Compression = 5, .Tile = 64, .CMYK = true});
  WriteTIFF(At("strips.tif"), Noise(260, 310, 2), {.Compression = 5, .RowsPerStrip = 9});
  for (const std::string file : {"rows.png", "turned.jpg", "tiles.tif", "strips.tif"})
    for (const auto& [command, inRows] : cases) {
      SCOPED_TRACE(file + testing::PrintToString(command));
      const auto [whole, expected] = Made(command, file, {"--store", "memory"}, "whole.tif");
      const auto [little, bytes] = Made(command, file, {"--memory-limit", "120K"}, "little.tif");
      EXPECT_EQ(little.Code, whole.Code) << little.Error;
      EXPECT_TRUE(bytes == expected);
      if (!inRows || file == "turned.jpg" || whole.Code != 0) continue;
      const auto [without, same] =
          Made(command, file, {"--memory-limit", "120K", "--temp-dir", "nowhere"}, "little.tif");
      EXPECT_EQ(without.Error, "");
      EXPECT_TRUE(same == expected);
    }
}

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
