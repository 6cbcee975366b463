#include <cmath>

#include "support/filter_models.h"

namespace picturezor {
namespace {

std::uint8_t Stamped(int v, double threshold, double softness, int black, int white) {
  const double lower = (threshold - 0.5 * softness) * 255.0, upper = (threshold + 0.5 * softness) * 255.0;
  const double t = (v - lower) / (upper - lower);
  const double s = v < lower ? 0 : v >= upper ? 1 : t * t * (3.0 - 2.0 * t);
  return std::uint8_t(int(s * (white - black) + black));
}

TEST(StampFilter, StepsBetweenTwoColours) {
  const Color black{200, 10, 0}, white{30, 250, 255};
  const struct {
    double Radius, Threshold, Softness;
  } cases[] = {{0, 0.5, 0},  {2.9, 0.5, 1}, {3, 0.4, 0.2}, {9, 0.5, 0.3},
               {6, -1, 0.5}, {6, 2, 0.5},   {6, 0.5, -0.4}};
  for (const Format format : EveryFormat())
    ForEveryStore(19, 9, format, [&](const Picture& picture) {
      SetPacked(picture, Noise(51).Many(std::size_t(19 * 9 * picture.PixelSize())));
      for (const auto& [radius, threshold, softness] : cases) {
        SCOPED_TRACE(testing::Message()
                     << int(format) << ' ' << radius << ' ' << threshold << ' ' << softness);
        const Picture blurred = picture.BoxBlurFilter({}, radius / 3, 3);
        const Picture blank(19, 9, format);
        const auto wanted =
            WantedRows({{},
                        [&, threshold = threshold, softness = softness](Plane plane, std::uint8_t v, int,
                                                                        int) -> std::optional<std::uint8_t> {
                          if (plane == Plane::Alpha) return {};
                          if (plane == Plane::Red)
                            return Stamped(v, threshold, softness, black.Red, white.Red);
                          if (plane == Plane::Blue)
                            return Stamped(v, threshold, softness, black.Blue, white.Blue);
                          return Stamped(v, threshold, softness, black.Green, white.Green);
                        }},
                       blurred, blank);
        const Picture result = picture.StampFilter({}, radius, threshold, softness, black, white);
        ASSERT_TRUE(bool(result));
        ASSERT_EQ(StoredRows(result), wanted);
      }
    });
}

TEST(StampFilter, HasTheseNumbers) {
  const Picture ramp(256, 1, Format::G);
  SetPacked(ramp, Ramp());
  const auto stamped = [&](double softness, Color black, Color white) {
    return ramp.StampFilter({}, 0, 0.5, softness, black, white).RowInFormat(0, Format::G);
  };
  // Hard: 127 lies below 127.5.
  const Samples hard = stamped(0, {1, 2, 3}, {4, 5, 6});
  EXPECT_EQ((Samples{hard[0], hard[127], hard[128], hard[255]}), (Samples{2, 2, 5, 5}));
  // Over the whole range: t is 0.2 at 51, so s is 0.104 and 26.52 is truncated; and the same downwards.
  const Samples soft = stamped(1, {}, {255, 255, 255}), down = stamped(1, {255, 255, 255}, {});
  EXPECT_EQ((Samples{soft[0], soft[51], soft[255]}), (Samples{0, 26, 255}));
  EXPECT_EQ((Samples{down[0], down[51], down[255]}), (Samples{255, 228, 0}));
  for (std::size_t v = 1; v < 256; ++v) EXPECT_LE(soft[v - 1], soft[v]);
}

TEST(StampFilter, LeavesTheFirstPassInItsDestination) {
  const Picture picture(12, 8, Format::RGB), dest(12, 8, Format::RGB);
  FillWithNoise(picture, 52);
  const Picture result = picture.StampFilter(dest, 9, 0.5, 0.5, {}, {255, 255, 255});
  EXPECT_NE(result, dest);
  EXPECT_EQ(Packed(dest), Packed(picture.BoxBlurFilter({}, 3)));
  EXPECT_EQ(Packed(result), Packed(picture.StampFilter({}, 9, 0.5, 0.5, {}, {255, 255, 255})));
  EXPECT_EQ(dest.References(), 1);
  EXPECT_EQ(result.References(), 1);
  EXPECT_FALSE(picture.StampFilter(picture, 9, 0.5, 0.5, {}, {}));
  EXPECT_FALSE(picture.StampFilter(Picture(11, 8, Format::RGB), 9, 0.5, 0.5, {}, {}));
  picture.Close();
  EXPECT_FALSE(picture.StampFilter({}, 9, 0.5, 0.5, {}, {}));
}

}
}
