#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Parts : public CommandTest {};

TEST_F(Parts, ACropHasThePixelsOfItsRectangle) {
  for (int channels = 1; channels <= 4; ++channels)
    for (const char* store : {"memory", "mapped"}) {
      SCOPED_TRACE(testing::Message() << channels << ' ' << store);
      const Raster picture = Noise(40, 30, channels);
      WritePNG(At("a.png"), picture);
      Do({"crop", "a.png", "--rect", "7,11,20,6", "--store", store, "-o", "b.png"});
      Raster part{20, 6, channels, {}};
      for (int y = 11; y < 17; ++y) {
        const auto row = picture.Samples.begin() + (y * 40 + 7) * channels;
        part.Samples.insert(part.Samples.end(), row, row + 20 * channels);
      }
      EXPECT_EQ(ReadPNG(At("b.png")), part);
    }
  std::filesystem::remove(At("b.png"));
  for (const char* outside : {"0,0,41,30", "0,0,40,31", "-1,0,5,5", "39,29,2,2"})
    Fail({"crop", "a.png", "--rect", outside, "-o", "b.png"}, "a.png", "doesn't lie within 40 x 30");
}

TEST_F(Parts, EveryChannelBecomesAFile) {
  const struct {
    int Channels;
    std::vector<std::string> Names;
  } cases[] = {{1, {"gray"}},
               {2, {"gray", "alpha"}},
               {3, {"red", "green", "blue"}},
               {4, {"red", "green", "blue", "alpha"}},
               {0, {"cyan", "magenta", "yellow", "black"}}};
  for (const auto& [channels, names] : cases) {
    SCOPED_TRACE(channels);
    const Raster picture = Noise(17, 13, int(names.size()));
    WriteTIFF(At("a.tif"), picture, {.CMYK = channels == 0});
    Do({"channels", "a.tif", "-o", "{}-of.png"});
    EXPECT_EQ(Files().size(), names.size() + 1);
    for (std::size_t c = 0; c < names.size(); ++c) {
      Raster channel{17, 13, 1, {}};
      for (std::size_t i = c; i < picture.Samples.size(); i += names.size())
        channel.Samples.push_back(picture.Samples[i]);
      EXPECT_EQ(ReadPNG(At(names[c] + "-of.png")), channel) << names[c];
      std::filesystem::remove(At(names[c] + "-of.png"));
    }
  }
}

}

}
