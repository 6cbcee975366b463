#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Turns : public CommandTest {};

/// The pixel that comes to (x, y).
using From = std::pair<int, int> (*)(int x, int y);

constexpr int Width = 23, Height = 14;

// Which pixel goes where, by files, in memory and in temporary files.
TEST_F(Turns, MovePixels) {
  const struct {
    Arguments Options;
    bool Turned;
    From Source;
  } cases[] = {
      {{"mirror", "--horizontal"}, false, [](int x, int y) { return std::pair(Width - 1 - x, y); }},
      {{"mirror", "--vertical"}, false, [](int x, int y) { return std::pair(x, Height - 1 - y); }},
      {{"mirror", "--vertical", "--horizontal"},
       false,
       [](int x, int y) { return std::pair(Width - 1 - x, Height - 1 - y); }},
      {{"rotate", "--angle", "0"}, false, [](int x, int y) { return std::pair(x, y); }},
      {{"rotate", "--angle", "90"}, true, [](int x, int y) { return std::pair(Width - 1 - y, x); }},
      {{"rotate", "--angle", "-90"}, true, [](int x, int y) { return std::pair(y, Height - 1 - x); }},
      {{"rotate", "--angle", "540"},
       false,
       [](int x, int y) { return std::pair(Width - 1 - x, Height - 1 - y); }},
  };
  for (int channels = 1; channels <= 4; ++channels) {
    const Raster picture = Noise(Width, Height, channels);
    WritePNG(At("a.png"), picture);
    for (const auto& [options, turned, source] : cases) {
      SCOPED_TRACE(testing::Message() << channels << ' ' << options[0] << ' ' << options.back());
      Raster wanted{turned ? Height : Width, turned ? Width : Height, channels, {}};
      for (int y = 0; y < wanted.Height; ++y)
        for (int x = 0; x < wanted.Width; ++x) {
          const auto [fromX, fromY] = source(x, y);
          const auto pixel = picture.Samples.begin() + (fromY * Width + fromX) * channels;
          wanted.Samples.insert(wanted.Samples.end(), pixel, pixel + channels);
        }
      for (const char* store : {"memory", "mapped"}) {
        Do(options + Arguments{"a.png", "-o", "b.png", "--store", store});
        EXPECT_EQ(ReadPNG(At("b.png")), wanted) << store;
      }
    }
  }
}

// A white square on its point: the corners are the background, the middle is the square.
TEST_F(Turns, FillTheCorners) {
  for (const int channels : {1, 2, 3, 4}) {
    SCOPED_TRACE(channels);
    WritePNG(At("a.png"), {100, 100, channels, Bytes(std::size_t(10000 * channels), 255)});
    for (const char* store : {"memory", "mapped"}) {
      Do({"rotate", "a.png", "--angle", "45", "--background", "102030", "-o", "b.png", "--store", store});
      const Raster turned = ReadPNG(At("b.png"));
      EXPECT_EQ(turned.Width, 142);
      EXPECT_EQ(turned.Height, 142);
      const Bytes gray = {28}, colour = {0x10, 0x20, 0x30};
      Bytes corner = channels < 3 ? gray : colour;
      if (channels % 2 == 0) corner.push_back(0);
      EXPECT_EQ(Bytes(turned.Samples.begin(), turned.Samples.begin() + channels), corner);
      const auto middle = turned.Samples.begin() + (71 * 142 + 71) * channels;
      EXPECT_EQ(Bytes(middle, middle + channels), Bytes(std::size_t(channels), 255));
    }
  }
}

}

}
