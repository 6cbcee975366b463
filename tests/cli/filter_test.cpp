#include <algorithm>
#include <fstream>

#include "command_test_support.h"

namespace picturezor::tests {

namespace {

using testing::HasSubstr;

class Filter : public CommandTest {
 protected:
  /// The name of a filter with its options, on a file.
  Raster Filtered(const Arguments& filter, const std::string& in, const std::string& store = "memory") {
    Do(Arguments{"filter"} + filter + Arguments{in, "--store", store, "-o", "out.png"});
    return ReadPNG(At("out.png"));
  }
};

/// With every option that a filter has.
const std::vector<Arguments> EveryFilter{
    {"invert"},
    {"auto-level"},
    {"solarize"},
    {"gamma", "--gamma", "2.2"},
    {"gain", "--gain", "0.7", "--bias", "0.4"},
    {"transfer", "--table", "@table.txt"},
    {"matrix", "--weights", "1 2 1, 2 4 2, 1 2 1", "--delta", "3", "--scale", "0.05"},
    {"blur", "--radius", "2", "--iterations", "2", "--only-horizontal"},
    {"soft-blur", "--radius", "0.4"},
    {"stamp", "--radius", "6", "--threshold", "0.4", "--softness", "0.5", "--black", "102030", "--white",
     "f0e0d0"},
    {"unsharp", "--radius", "2", "--amount", "0.5", "--threshold", "3"},
    {"oil", "--range", "2", "--levels", "16"},
    {"diffuse", "--level", "2"},
    {"engrave", "--level", "2"},
    {"neon"},
    {"dither", "--pattern", "cluster3", "--levels", "3"},
};

TEST_F(Filter, EveryOneRunsInBothStoresAndLeavesAlpha) {
  std::ofstream table(At("table.txt"));
  for (int v = 0; v < 256; ++v) table << 255 - v << (v % 16 == 15 ? "\n" : ", ");
  table.close();
  for (const int channels : {1, 2, 3, 4}) {
    const Raster picture = Waves(40, 30, channels);
    WritePNG(At("in.png"), picture);
    for (const Arguments& filter : EveryFilter) {
      SCOPED_TRACE(filter[0] + " of " + std::to_string(channels));
      if (filter[0] == "auto-level" && channels < 3) {
        Fail({"filter", "auto-level", "in.png", "-o", "none.png"}, "in.png", "supports only RGB");
        continue;
      }
      const Raster result = Filtered(filter, "in.png");
      EXPECT_EQ(result.Channels, channels);
      EXPECT_NE(result, picture);
      // Its places are drawn anew each time.
      const Raster other = Filtered(filter, "in.png", "mapped");
      EXPECT_TRUE(filter[0] == "diffuse" || other == result);
      if (channels % 2 == 1) continue;
      for (std::size_t i = std::size_t(channels) - 1; i < result.Samples.size(); i += std::size_t(channels))
        ASSERT_EQ(result.Samples[i], picture.Samples[i]);
    }
  }
  EXPECT_EQ(EveryFilter.size(), 16u);
  const std::string list = Run({"filter", "--list"}).Out;
  EXPECT_EQ(std::count(list.begin(), list.end(), '\n'), 16);
  for (const Arguments& filter : EveryFilter) EXPECT_THAT(list, HasSubstr(filter[0] + " "));
}

TEST_F(Filter, SaysWhatTheOptionsSay) {
  const Raster picture = Noise(20, 10, 3);
  WritePNG(At("in.png"), picture);
  const auto mapped = [&](const Arguments& filter, auto&& wanted) {
    SCOPED_TRACE(testing::PrintToString(filter));
    Raster expected = picture;
    for (std::size_t i = 0; i < expected.Samples.size(); ++i)
      expected.Samples[i] = std::uint8_t(wanted(int(expected.Samples[i]), int(i % 3)));
    EXPECT_EQ(Filtered(filter, "in.png"), expected);
  };
  mapped({"invert"}, [](int v, int) { return 255 - v; });
  mapped({"gamma", "--gamma", "1,1,1e-6"}, [](int v, int c) { return c < 2 || v == 255 ? v : 0; });
  mapped({"transfer", "--table", "9,8,7"}, [](int v, int) { return v < 3 ? 9 - v : 0; });
  mapped({"transfer", "--red", "1", "--green", "0,300", "--blue", "5,-1"}, [](int v, int c) {
    return v == 0 ? (c == 0 ? 1 : c == 1 ? 0 : 5) : v == 1 && c > 0 ? (c == 1 ? 44 : 255) : 0;
  });
  mapped({"matrix", "--weights", "7"}, [](int v, int) { return v; });
  mapped({"matrix", "--weights", "2", "--scale", "1", "--delta", "-10"},
         [](int v, int) { return std::clamp(2 * v - 10, 0, 255); });
  mapped({"stamp", "--radius", "0", "--softness", "0", "--black", "010203", "--white", "a0b0c0"},
         [](int v, int c) { return v < 128 ? 1 + c : 0xA0 + 16 * c; });
  mapped({"unsharp", "--amount", "0"}, [](int v, int) { return v; });
}

TEST_F(Filter, RefusesInkWhereThereIsNoWay) {
  WriteTIFF(At("ink.tif"), Noise(20, 10, 4), {.CMYK = true});
  for (const char* filter : {"stamp", "gain", "diffuse", "engrave", "dither"})
    Fail({"filter", filter, "ink.tif", "-o", "out.tif"}, "ink.tif", "doesn't support CMYK");
  Fail({"filter", "auto-level", "ink.tif", "-o", "out.tif"}, "ink.tif", "supports only RGB");
  Do({"filter", "invert", "ink.tif", "-o", "out.tif"});
  Raster inverted = ReadTIFF(At("ink.tif"));
  for (auto& sample : inverted.Samples) sample = std::uint8_t(255 - sample);
  EXPECT_EQ(ReadTIFF(At("out.tif")), inverted);
}

TEST_F(Filter, NeedsItsTable) {
  WritePNG(At("in.png"), Noise(8, 8, 3));
  Fail({"filter", "transfer", "in.png", "--table", "@nowhere.txt", "-o", "out.png"}, "nowhere.txt",
       "can't be read");
}

}

}
