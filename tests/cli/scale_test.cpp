#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Scaling : public CommandTest {
 protected:
  /// What `scale` with these options makes of a.png.
  Raster Scaled(Arguments options) {
    options.insert(options.begin(), {"scale", "a.png", "-o", "b.png"});
    Do(options);
    return ReadPNG(At("b.png"));
  }
};

TEST_F(Scaling, TheSizeFollowsTheOptions) {
  WritePNG(At("a.png"), Noise(60, 40, 1));
  const struct {
    Arguments Options;
    int Width, Height;
  } cases[] = {
      {{"--width", "30"}, 30, 20},
      {{"--height", "10"}, 15, 10},
      {{"--width", "7", "--height", "50"}, 7, 50},
      {{"--fit", "33x1000"}, 33, 22},
      {{"--fit", "1000x8"}, 12, 8},
      {{"--percent", "250"}, 150, 100},
      {{"--percent", "0.001"}, 1, 1},
  };
  for (const auto& [options, width, height] : cases) {
    SCOPED_TRACE(options[1]);
    const Raster scaled = Scaled(options);
    EXPECT_EQ(scaled.Width, width);
    EXPECT_EQ(scaled.Height, height);
  }
}

// The mean of four pixels, cut off after each of the two passes, and the first of four.
TEST_F(Scaling, AHalfByBoxAndByNearest) {
  for (int channels = 1; channels <= 4; ++channels) {
    SCOPED_TRACE(channels);
    const Raster picture = Noise(44, 26, channels);
    WritePNG(At("a.png"), picture);
    Raster mean{22, 13, channels, {}}, nearest = mean;
    for (int y = 0; y < 13; ++y)
      for (int x = 0; x < 22; ++x)
        for (int c = 0; c < channels; ++c) {
          const auto at = [&](int dx, int dy) {
            return int(picture.Samples[std::size_t(((2 * y + dy) * 44 + 2 * x + dx) * channels + c)]);
          };
          mean.Samples.push_back(std::uint8_t(((at(0, 0) + at(1, 0)) / 2 + (at(0, 1) + at(1, 1)) / 2) / 2));
          nearest.Samples.push_back(std::uint8_t(at(0, 0)));
        }
    for (const char* store : {"memory", "mapped"})
      for (const char* threads : {"0", "1", "3"}) {
        EXPECT_EQ(Scaled({"--percent", "50", "--kernel", "box", "--store", store, "--threads", threads}),
                  mean);
        EXPECT_EQ(Scaled({"--percent", "50", "--fast", "--store", store, "--threads", threads}), nearest);
      }
  }
}

TEST_F(Scaling, EveryKernelIsAnother) {
  WritePNG(At("a.png"), Noise(40, 30, 3));
  std::vector<Bytes> results;
  for (const char* kernel : {"triangle", "box", "lanczos3", "lanczos8", "mitchell", "poly3", "cubic"})
    results.push_back(Scaled({"--width", "23", "--kernel", kernel}).Samples);
  for (std::size_t i = 0; i < results.size(); ++i)
    for (std::size_t k = 0; k < i; ++k) EXPECT_NE(results[i], results[k]) << i << ' ' << k;
  EXPECT_EQ(Scaled({"--width", "23"}), Scaled({"--width", "23", "--kernel", "lanczos3"}));
}

TEST_F(Scaling, CMYKAndPartsOfIt) {
  const Raster picture = Noise(20, 20, 4);
  WriteTIFF(At("a.tif"), picture, {.CMYK = true});
  Do({"scale", "a.tif", "--width", "20", "--kernel", "box", "-o", "b.tif"});
  EXPECT_EQ(ReadTIFF(At("b.tif")), picture);
  std::filesystem::remove(At("b.tif"));
  Fail({"scale", "a.tif", "--width", "10", "--fast", "-o", "b.tif"}, "a.tif", "--fast");
}

// Twice as large as the result is enough for the reader; PNG has no such way, and half of it isn't twice
// smaller.
TEST_F(Scaling, ADraftIsNearAndOnlyAskedFor) {
  WriteJPEG(At("a.jpg"), Waves(800, 600, 3), {.Orientation = 6});
  WritePNG(At("a.png"), Noise(80, 60, 3));
  const struct {
    const char *In, *Size;
    int Width, Height, Most;
  } cases[] = {{"a.jpg", "--percent=12.5", 75, 100, 12},
               {"a.jpg", "--width=150", 150, 200, 12},
               {"a.jpg", "--height=402", 302, 402, 0},
               {"a.png", "--width=20", 20, 15, 0}};
  for (const auto& [in, size, width, height, most] : cases) {
    SCOPED_TRACE(size);
    Do({"scale", in, size, "-o", "exact.png"});
    Do({"scale", in, size, "--draft", "-o", "draft.png"});
    const Raster exact = ReadPNG(At("exact.png")), draft = ReadPNG(At("draft.png"));
    EXPECT_EQ(draft.Width, width);
    EXPECT_EQ(draft.Height, height);
    EXPECT_LE(Difference(draft, exact), most);
    EXPECT_EQ(Difference(draft, exact) == 0, most == 0);
  }
}

}

}
