#include "support/area_filter.h"

#include "support/every_target.h"

namespace picturezor {
namespace {

std::vector<int> OffsetsOf(const Picture& picture) {
  if (picture.IsGray()) {
    std::vector<int> offsets{picture.GrayOffset()};
    if (picture.HasAlpha()) offsets.push_back(picture.AlphaOffset());
    return offsets;
  }
  std::vector<int> offsets{picture.RedOffset(), picture.GreenOffset(), picture.BlueOffset()};
  if (picture.IsCMYK())
    offsets = {picture.CyanOffset(), picture.MagentaOffset(), picture.YellowOffset(), picture.BlackOffset()};
  if (picture.HasAlpha()) offsets.push_back(picture.AlphaOffset());
  return offsets;
}

/// A format of the same group with another order of planes, or with more of them.
Format OtherOrder(Format format) {
  switch (format) {
    case Format::RGB:
    case Format::BGRX: return Format::XBGR;
    case Format::RGBA: return Format::ABGR;
    case Format::ARGB: return Format::RGBA;
    case Format::BGR: return Format::RGBA;
    case Format::G: return Format::GA;
    case Format::GA: return Format::AG;
    case Format::CMYK: return Format::XKYMC;
    case Format::KYMCX: return Format::CMYK;
    case Format::CMYKA: return Format::AKYMC;
    default: return format;
  }
}

/// The stored rows with the planes written into the top left of the picture.
std::vector<Samples> With(std::vector<Samples> rows, const Picture& picture, const Planar& planes) {
  const std::vector<int> offsets = OffsetsOf(picture);
  for (int c = 0; c < planes.Count; ++c)
    for (int y = 0; y < planes.Height; ++y)
      for (int x = 0; x < planes.Width; ++x)
        rows[std::size_t(y)][std::size_t(offsets[std::size_t(c)] + x * picture.PixelSize())] =
            planes(c, x, y);
  return rows;
}

bool Served(const AreaFilter& filter, Format format) {
  const Picture picture(1, 1, format);
  return picture.IsGray() || picture.IsRGB() || (picture.IsCMYK() && filter.ServesCMYK);
}

void ExpectInPlaceLikeModel(const AreaFilter& filter, const Picture& picture) {
  const Planar source = PlanesIn(picture, picture.Width(), picture.Height());
  const std::vector<Samples> before = StoredRows(picture);
  Planar wanted = source;
  filter.Model(filter.InPlace == AreaFilter::ReadsWhatItWrote ? wanted : source, wanted);
  const Picture result = filter.Run(picture, picture);
  if (filter.InPlace == AreaFilter::Refused) {
    EXPECT_FALSE(result);
    EXPECT_EQ(StoredRows(picture), before);
  } else {
    EXPECT_TRUE(result == picture);
    EXPECT_EQ(StoredRows(picture), With(before, picture, wanted)) << "in place";
  }
}

void ExpectLikeModel(const AreaFilter& filter, const Picture& picture, Noise& noise) {
  const int width = picture.Width(), height = picture.Height();
  const Format format = picture.ImageFormat();
  SetPacked(picture, noise.Many(Packed(picture).size()));
  const Planar source = PlanesIn(picture, width, height);
  Planar wanted(width, height, source.Count);
  filter.Model(source, wanted);

  const Picture made = filter.Run(picture, {});
  ASSERT_TRUE(made);
  EXPECT_EQ(made.ImageFormat(), format);
  EXPECT_EQ(PlanesIn(made, width, height).Of, wanted.Of) << "into a new picture";
  EXPECT_EQ(PlanesIn(picture, width, height).Of, source.Of) << "the source must stay";

  const Format other = OtherOrder(format);
  const bool fits = filter.AnyPixelSize || BytesPerPixel(other) == BytesPerPixel(format);
  ForEveryStore(width + 2, height + 5, fits ? other : format, [&](const Picture& larger) {
    SetPacked(larger, noise.Many(Packed(larger).size()));
    const std::vector<Samples> before = StoredRows(larger);
    EXPECT_TRUE(filter.Run(picture, larger) == larger);
    EXPECT_EQ(StoredRows(larger), With(before, larger, wanted)) << "into a larger picture";
  });
  ExpectInPlaceLikeModel(filter, picture);
}

}

Planar PlanesIn(const Picture& picture, int width, int height) {
  const std::vector<int> offsets = OffsetsOf(picture);
  Planar planes(width, height, int(offsets.size()));
  for (int y = 0; y < height; ++y) {
    const Samples row = picture.Row(y);
    for (int c = 0; c < planes.Count; ++c)
      for (int x = 0; x < width; ++x)
        planes(c, x, y) = row[std::size_t(offsets[std::size_t(c)] + x * picture.PixelSize())];
  }
  return planes;
}

void ExpectLikeModel(const AreaFilter& filter, std::initializer_list<std::pair<int, int>> sizes) {
  const unsigned seed = std::random_device{}();
  SCOPED_TRACE("seed " + std::to_string(seed));
  Noise noise(seed);
  for (const Format format : EveryFormat()) {
    if (!Served(filter, format)) continue;
    SCOPED_TRACE("format " + std::to_string(int(format)));
    for (const auto& [width, height] : sizes)
      ForEveryStore(width, height, format, [&](const Picture& picture) {
        SCOPED_TRACE(std::to_string(picture.Width()) + " x " + std::to_string(picture.Height()));
        ExpectLikeModel(filter, picture, noise);
      });
  }
}

void ExpectUntouched(const Picture& source,
                     const std::function<Picture(const Picture& source, const Picture& dest)>& run) {
  const int width = source.Width(), height = source.Height();
  const Picture fitting(width, height, Format::BGRA), small(1, 1, Format::RGB),
      gray(width, height, Format::G);
  for (const Picture& dest : {source, fitting, small, gray}) {
    SCOPED_TRACE(testing::Message() << dest.Width() << " wide, format " << int(dest.ImageFormat()));
    FillWithNoise(dest, 61);
    const auto before = StoredRows(dest);
    EXPECT_EQ(run(source, dest), dest);
    EXPECT_EQ(StoredRows(dest), before);
  }
  EXPECT_FALSE(run(source, Picture(0, 1, Format::RGB)));
  EXPECT_EQ(Packed(run(source, {})), Samples(std::size_t(width * height * source.PixelSize())));
}

void ExpectLikeModelOnEveryTarget(const AreaFilter& filter, Format format,
                                  std::initializer_list<std::pair<int, int>> sizes) {
  const unsigned seed = std::random_device{}();
  for (const auto& [width, height] : sizes) {
    SCOPED_TRACE(testing::Message() << width << " x " << height << ", seed " << seed);
    const Picture picture(width, height, format);
    FillWithNoise(picture, seed);
    const Planar source = PlanesIn(picture, width, height);
    Planar wanted = source;
    filter.Model(source, wanted);
    ForEveryTarget(
        [&, w = width, h = height] { EXPECT_EQ(PlanesIn(filter.Run(picture, {}), w, h).Of, wanted.Of); });
  }
}

}
