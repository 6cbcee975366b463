#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Combine : public CommandTest {
 protected:
  Raster Combined(const Arguments& options, const char* store = "memory") {
    Do(Arguments{"combine", "base.png", "over.png", "-o", "out.png", "--store", store} + options);
    return ReadPNG(At("out.png"));
  }
};

TEST_F(Combine, LaysTheOverlayWhereItIsAskedTo) {
  const Raster base = Noise(12, 9, 3), over = Noise(5, 4, 3);
  WritePNG(At("base.png"), base);
  WritePNG(At("over.png"), over);
  for (const char* store : {"memory", "mapped"})
    for (const auto& [left, top] : {std::pair(0, 0), {7, 5}, {-2, 3}, {10, -1}}) {
      Raster wanted = base;
      for (int y = 0; y < 4; ++y)
        for (int x = 0; x < 5; ++x)
          for (int c = 0; c < 3; ++c)
            if (x + left >= 0 && x + left < 12 && y + top >= 0 && y + top < 9)
              wanted.Samples[std::size_t(((y + top) * 12 + x + left) * 3 + c)] =
                  over.Samples[std::size_t((y * 5 + x) * 3 + c)];
      EXPECT_EQ(Combined({"--at=" + std::to_string(left) + "," + std::to_string(top)}, store), wanted)
          << left << "," << top << " " << store;
    }
  Fail({"combine", "base.png", "over.png", "--at", "12,0", "-o", "x.png"}, "over.png", "entirely outside");
}

TEST_F(Combine, BlendsByAlphaMaskOrColour) {
  WritePNG(At("mask.png"), {2, 1, 1, {0, 128}});
  WritePNG(At("colours.png"), {2, 1, 3, {0, 255, 128, 255, 255, 255}});
  const Raster rgb{2, 1, 3, {10, 20, 30, 100, 100, 100}}, rgba{2, 1, 4, {10, 20, 30, 40, 100, 100, 100, 255}};
  const Raster over{2, 1, 3, {200, 100, 0, 200, 100, 0}},
      clear{2, 1, 4, {200, 100, 0, 255, 200, 100, 0, 127}};
  const Raster flat{2, 1, 1, {0, 255}}, scaled{2, 1, 4, {90, 80, 70, 255, 50, 25, 0, 127}};
  struct {
    const Raster &Base, &Over;
    Arguments Options;
    Bytes Result;
  } cases[] = {
      // (s (255 - m) + m d) / 255
      {rgb, clear, {}, {200, 100, 0, 149, 100, 50}},
      {rgba, clear, {}, {200, 100, 0, 40, 149, 100, 50, 255}},
      {rgb, over, {"--mask", "mask.png"}, {200, 100, 0, 149, 100, 50}},
      {rgb, over, {"--mask", "colours.png"}, {200, 20, 15, 100, 100, 100}},
      {rgb, over, {"--mask-colour", "ff0080"}, {10, 100, 15, 100, 100, 50}},
      {rgb, flat, {"--fore", "#0a0B0c"}, {10, 11, 12, 100, 100, 100}},
      // s + m d / 255; both alphas together are as opaque as the more opaque one at least.
      {rgb, scaled, {"--premultiplied"}, {90, 80, 70, 100, 75, 50}},
      {rgba, scaled, {"--premultiplied"}, {90, 80, 70, 255, 100, 75, 50, 255}},
  };
  for (const auto& [base, overlay, options, result] : cases) {
    SCOPED_TRACE(testing::PrintToString(options));
    WritePNG(At("base.png"), base);
    WritePNG(At("over.png"), overlay);
    EXPECT_EQ(Combined(options).Samples, result);
  }
}

TEST_F(Combine, RefusesWhatDoesntFit) {
  WritePNG(At("base.png"), Noise(9, 9, 3));
  WritePNG(At("mask.png"), Noise(8, 9, 1));
  WriteTIFF(At("ink.tif"), Noise(9, 9, 4), {.CMYK = true});
  Fail({"combine", "base.png", "base.png", "--mask", "mask.png", "-o", "x.png"}, "mask.png", "as large as");
  Fail({"combine", "base.png", "ink.tif", "-o", "x.png"}, "ink.tif", "CMYK can't be converted to RGB");
}

class Compare : public CommandTest {};

TEST_F(Compare, TellsTotalMeanAndShare) {
  const Raster a = Noise(20, 5, 4);
  Raster b = a;
  b.Samples[0] = std::uint8_t(a.Samples[0] ^ 128);
  b.Samples[2] = std::uint8_t(a.Samples[2] ^ 1);
  b.Samples[399] = std::uint8_t(a.Samples[399] ^ 16);  // alpha
  WritePNG(At("a.png"), a);
  WriteTIFF(At("same.tif"), a);
  WritePNG(At("b.png"), b);
  for (const char* store : {"memory", "mapped"}) {
    const Outcome same = Run({"compare", "a.png", "same.tif", "--store", store});
    EXPECT_EQ(same.Code, 0);
    EXPECT_EQ(same.Out,
              "total difference:  0\nmean per sample:   0.000000\ndiffering pixels:  0 of 100 (0.0000 %)\n");
    const Outcome other = Run({"compare", "a.png", "b.png", "--store", store});
    EXPECT_EQ(other.Code, 1);
    EXPECT_EQ(
        other.Out,
        "total difference:  145\nmean per sample:   0.362500\ndiffering pixels:  2 of 100 (2.0000 %)\n");
  }
}

TEST_F(Compare, RefusesOtherSizesAndFormats) {
  WritePNG(At("a.png"), Noise(20, 5, 3));
  WritePNG(At("alpha.png"), Noise(20, 5, 4));
  WritePNG(At("small.png"), Noise(19, 5, 3));
  for (const char* other : {"alpha.png", "small.png"}) {
    Fail({"compare", "a.png", other}, other, "can't be compared with 20 x 5 RGB");
    EXPECT_EQ(Run({"compare", "a.png", other}).Code, 2);
  }
}

}

}
