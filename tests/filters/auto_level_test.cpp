#include <array>

#include "support/filter_models.h"

namespace picturezor {
namespace {

/// What becomes of a channel's sample, by counting pixels for every level.
std::array<std::uint8_t, 256> Levels(const Picture& picture, const Rect& part) {
  std::vector<int> lumas;
  const Planar planes = PlanesIn(picture, picture.Width(), picture.Height());
  for (int y = part.Y; y < part.Y + part.Height; ++y)
    for (int x = part.X; x < part.X + part.Width; ++x)
      lumas.push_back(int(0.177 * planes(0, x, y) + 0.813 * planes(1, x, y) + 0.01 * planes(2, x, y)));
  const float total = float(lumas.size());
  const auto last = [&](float count) {
    int level = 0;
    for (int i = 0; i < 256; ++i)
      if (std::count_if(lumas.begin(), lumas.end(), [&](int luma) { return luma <= i; }) <= int(count))
        level = i;
    return level;
  };
  const int low = last(total * 0.005f), high = last(total * 0.995f);
  std::array<std::uint8_t, 256> levels{};
  for (int c = 0; c < 256; ++c) {
    const double v = 255.0 / (high - low) * (c - low);
    levels[std::size_t(c)] = c < low ? 0 : c > high ? 255 : v != v ? 0 : std::uint8_t(int(v));
  }
  return levels;
}

TEST(AutoLevel, StretchesTheRectangle) {
  const struct {
    std::optional<Rect> Asked;
    Rect Part;
  } cases[] = {
      {{}, {0, 0, 70, 9}}, {Rect{1, 2, 66, 5}, {1, 2, 66, 5}}, {Rect{69, 8, -60, -20}, {9, 0, 60, 8}}};
  for (const Format format : EveryFormat())
    for (const auto& [asked, part] : cases) {
      SCOPED_TRACE(testing::Message() << int(format) << ' ' << part.X);
      const auto run = [&, part = part](const Picture& picture) {
        Noise noise(72);
        Samples pixels(std::size_t(70 * 9 * picture.PixelSize()));
        for (auto& sample : pixels) sample = std::uint8_t(noise.Between(40, 90) + noise.Between(0, 80));
        SetPacked(picture, pixels);
        const std::vector<Samples> before = StoredRows(picture);
        std::vector<Samples> wanted = before;
        if (picture.IsRGB()) {
          const auto levels = Levels(picture, part);
          wanted = WantedRows({{},
                               [&](Plane plane, std::uint8_t v, int x, int y) -> std::optional<std::uint8_t> {
                                 if (plane == Plane::Alpha || x < part.X || y < part.Y ||
                                     x >= part.X + part.Width || y >= part.Y + part.Height)
                                   return {};
                                 return levels[v];
                               }},
                              picture, picture);
        }
        EXPECT_EQ(asked ? picture.AutoLevel(*asked) : picture.AutoLevel(), picture.IsRGB());
        EXPECT_EQ(StoredRows(picture), wanted);
      };
      ForEveryTarget([&] { run(Picture(70, 9, format)); });
      ForEveryStore(70, 9, format, run);
      if (HasFailure()) return;
    }
}

// Every colour's luma, in doubles as it is defined, against what a fast form makes of it: one colour at a
// time decides where the levels are cut.
TEST(AutoLevel, CutsBesideTheLumaOfEveryGray) {
  for (int v = 0; v < 256; ++v) {
    const Picture picture(200, 1, Format::RGB);
    Samples row(600, std::uint8_t(v));
    picture.SetRowInFormat(0, Format::RGB, row);
    const int luma = int(0.177 * v + 0.813 * v + 0.01 * v);
    ASSERT_TRUE(picture.AutoLevel());
    // Levels below the luma have no pixels and those from it on all, so both cuts lie right below it.
    const int cut = std::max(0, luma - 1);
    const int wanted = v < cut || v == cut ? 0 : 255;
    EXPECT_EQ(picture.RowInFormat(0, Format::RGB), Samples(600, std::uint8_t(wanted))) << v;
  }
}

TEST(AutoLevel, RefusesWhatHasNoPart) {
  const Picture picture = NoisePicture(5, 4, Format::RGBA, 3);
  const std::vector<Samples> before = StoredRows(picture);
  for (const Rect& part : {Rect{5, 0, 3, 3}, Rect{0, 4, 3, 3}, Rect{0, 0, 0, 2}, Rect{-3, -3, 3, 3}})
    EXPECT_FALSE(picture.AutoLevel(part));
  EXPECT_EQ(StoredRows(picture), before);
  picture.Close();
  EXPECT_FALSE(picture.AutoLevel());
  EXPECT_FALSE(Picture(0, 5, Format::RGB).AutoLevel());
}

}
}
