#include "support/point_filter.h"

namespace picturezor {
namespace {

void ExpectRun(const PointFilter& filter, const Picture& source, const Picture& dest) {
  const std::vector<Samples> before = dest ? StoredRows(dest) : std::vector<Samples>();
  const Picture blank(source.Width(), source.Height(), source.ImageFormat());
  const std::vector<Samples> wanted =
      WantedRows(filter, source, dest ? dest : blank, dest ? before : StoredRows(blank));
  const Picture result = filter.Run(source, dest);
  ASSERT_TRUE(bool(result));
  EXPECT_TRUE(!dest || result == dest);
  ASSERT_EQ(StoredRows(result), wanted);
}

/// The formats with the planes of this one in another order, or with more of them.
std::vector<Format> Relatives(Format format) {
  const std::vector<PlacedPlane> planes = PlanesOf(Picture(1, 1, format));
  std::vector<Format> relatives;
  for (const Format other : EveryFormat()) {
    const std::vector<PlacedPlane> others = PlanesOf(Picture(1, 1, other));
    if (!planes.empty() && others.size() >= planes.size() && others[0].Of == planes[0].Of &&
        (planes.back().Of != Plane::Alpha || others.back().Of == Plane::Alpha))
      relatives.push_back(other);
  }
  return relatives;
}

}

std::vector<PlacedPlane> PlanesOf(const Picture& picture) {
  std::vector<PlacedPlane> planes;
  if (picture.IsGray()) planes = {{Plane::Gray, picture.GrayOffset()}};
  if (picture.IsRGB())
    planes = {{Plane::Red, picture.RedOffset()},
              {Plane::Green, picture.GreenOffset()},
              {Plane::Blue, picture.BlueOffset()}};
  if (picture.IsCMYK())
    planes = {{Plane::Cyan, picture.CyanOffset()},
              {Plane::Magenta, picture.MagentaOffset()},
              {Plane::Yellow, picture.YellowOffset()},
              {Plane::Black, picture.BlackOffset()}};
  if (!planes.empty() && picture.HasAlpha()) planes.push_back({Plane::Alpha, picture.AlphaOffset()});
  return planes;
}

std::vector<Samples> WantedRows(const PointFilter& filter, const Picture& source, const Picture& dest,
                                std::vector<Samples> before) {
  if (source.IsCMYK() && !filter.ServesCMYK) return before;
  const std::vector<PlacedPlane> in = PlanesOf(source), out = PlanesOf(dest);
  for (int y = 0; y < source.Height(); ++y) {
    const Samples row = source.Row(y);
    for (std::size_t c = 0; c < in.size(); ++c) {
      // A destination may have alpha where the source has none.
      const int from = in[c].Offset, into = out.size() > c ? out[c].Offset : 0;
      for (int x = 0; x < source.Width(); ++x)
        if (const auto value = filter.Wanted(in[c].Of, row[std::size_t(x * source.PixelSize() + from)], x, y))
          before[std::size_t(y)][std::size_t(x * dest.PixelSize() + into)] = *value;
    }
  }
  return before;
}

void ExpectPointFilter(const PointFilter& filter) {
  for (const Format format : EveryFormat()) {
    SCOPED_TRACE(testing::PrintToString(format));
    ForEveryStore(23, 7, format, [&](const Picture& picture) {
      SetPacked(picture, Noise(unsigned(format)).Many(std::size_t(23 * 7 * picture.PixelSize())));
      ExpectRun(filter, picture, {});
      ExpectRun(filter, picture, picture);
    });
    ForEveryTarget([&] {
      for (const int width : {1, 12, 63, 64, 65, 257}) {
        const Picture picture(width, 2, format);
        FillWithNoise(picture, unsigned(width));
        ExpectRun(filter, picture, {});
      }
    });
    const Picture source(23, 7, format);
    FillWithNoise(source, 5);
    const std::vector<Format> relatives = Relatives(format);
    for (std::size_t i = 0; i < relatives.size(); ++i) {
      SCOPED_TRACE(testing::PrintToString(relatives[i]));
      const auto kind = StoredPicture::Kinds[(i + std::size_t(format)) % std::size(StoredPicture::Kinds)];
      const StoredPicture dest(kind, 25, 8, relatives[i]);
      ExpectRun(filter, source, dest.Get());
      EXPECT_TRUE(dest.SurroundingsIntact());
    }
    if (testing::Test::HasFailure()) return;
  }
}

}
