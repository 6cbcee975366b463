#include "support/filter_models.h"

namespace picturezor {
namespace {

/// The complement of each sample of a part.
PointFilter Complement(const Rect& part) {
  return {{},
          [part](Plane, std::uint8_t v, int x, int y) -> std::optional<std::uint8_t> {
            if (x < part.X || y < part.Y || x >= part.X + part.Width || y >= part.Y + part.Height) return {};
            return std::uint8_t(255 - v);
          },
          true};
}

TEST(Invert, ComplementsTheRectangle) {
  const struct {
    std::optional<Rect> Asked;
    Rect Part;
  } cases[] = {{{}, {0, 0, 70, 7}},
               {Rect{1, 2, 66, 3}, {1, 2, 66, 3}},
               {Rect{5, 5, -3, -3}, {2, 2, 3, 3}},
               {Rect{60, 6, 100, 100}, {60, 6, 10, 1}},
               {Rect{-5, -1, 2147483647, 2}, {0, 0, 70, 1}},
               {Rect{70, 0, 5, 5}, {}},
               {Rect{0, 7, 5, 5}, {}},
               {Rect{3, 3, 0, 2}, {}}};
  for (const Format format : EveryFormat())
    for (const auto& [asked, part] : cases) {
      SCOPED_TRACE(testing::Message() << int(format) << ' ' << part.X << ' ' << part.Width);
      const auto run = [&](const Picture& picture) {
        SetPacked(picture, Noise(71).Many(std::size_t(70 * 7 * picture.PixelSize())));
        const std::vector<Samples> before = StoredRows(picture);
        const std::vector<Samples> wanted = WantedRows(Complement(part), picture, picture);
        const auto invert = [&] { asked ? picture.Invert(*asked) : picture.Invert(); };
        invert();
        EXPECT_EQ(StoredRows(picture), wanted);
        invert();
        EXPECT_EQ(StoredRows(picture), before);
      };
      ForEveryTarget([&] { run(Picture(70, 7, format)); });
      if (part.X == 1) ForEveryStore(70, 7, format, run);
      if (HasFailure()) return;
    }
}

}
}
