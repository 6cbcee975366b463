#include "support/filter_models.h"

namespace picturezor {
namespace {

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

bool Served(const AreaFilter& filter, Format format) {
  const Picture picture(1, 1, format);
  return !PlanesOf(picture).empty() && (filter.ServesCMYK || !picture.IsCMYK());
}

/// Compares what a filter writes into a picture, into a new one where `dest` is nil, with its model.
void ExpectRun(const AreaFilter& filter, const Picture& source, const Picture& dest) {
  const int width = source.Width(), height = source.Height();
  const bool inPlace = dest == source;
  const Picture into = dest ? dest : Picture(width, height, source.ImageFormat());
  const std::vector<Samples> before = StoredRows(into);
  const Planar from = PlanesIn(source, width, height);
  Planar wanted = PlanesIn(into, width, height);
  filter.Model(inPlace && filter.InPlace == AreaFilter::ReadsWhatItWrote ? wanted : from, wanted);
  const Picture result = filter.Run(source, dest);
  if (inPlace && filter.InPlace == AreaFilter::Refused) {
    EXPECT_FALSE(result);
    EXPECT_EQ(StoredRows(source), before);
    return;
  }
  SCOPED_TRACE(inPlace ? "in place" : dest ? "into another picture" : "into a new picture");
  ASSERT_TRUE(bool(result));
  EXPECT_TRUE(!dest || result == dest);
  EXPECT_EQ(result.ImageFormat(), into.ImageFormat());
  ASSERT_EQ(StoredRows(result), With(before, into, wanted));
  EXPECT_TRUE(inPlace || PlanesIn(source, width, height).Of == from.Of) << "the source must stay";
}

void ExpectLikeModel(const AreaFilter& filter, const Picture& picture, Noise& noise) {
  const int width = picture.Width(), height = picture.Height();
  const Format format = picture.ImageFormat(), other = OtherOrder(format);
  SetPacked(picture, noise.Many(Packed(picture).size()));
  ExpectRun(filter, picture, {});
  const bool fits = filter.AnyPixelSize || BytesPerPixel(other) == BytesPerPixel(format);
  if (const Picture unfit(width, height, other); !fits) {
    EXPECT_FALSE(filter.Run(picture, unfit));
    EXPECT_EQ(Packed(unfit), Samples(Packed(unfit).size()));
  }
  ForEveryStore(width + 2, height + 5, fits ? other : format, [&](const Picture& larger) {
    SetPacked(larger, noise.Many(Packed(larger).size()));
    ExpectRun(filter, picture, larger);
  });
  ExpectRun(filter, picture, picture);
}

std::function<void(const Planar& source, Planar& dest)> ModelOf(const PointFilter& filter) {
  return [=](const Planar& source, Planar& dest) {
    if (source.Count > 0 && source.Names[0] == Plane::Cyan && !filter.ServesCMYK) return;
    for (int c = 0; c < source.Count; ++c)
      for (int y = 0; y < source.Height; ++y)
        for (int x = 0; x < source.Width; ++x)
          if (const auto value = filter.Wanted(source.Names[std::size_t(c)], source(c, x, y), x, y))
            dest(c, x, y) = *value;
  };
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

Planar PlanesIn(const Picture& picture, int width, int height) {
  const std::vector<PlacedPlane> places = PlanesOf(picture);
  Planar planes(width, height, int(places.size()));
  for (const PlacedPlane& place : places) planes.Names.push_back(place.Of);
  for (int y = 0; y < height; ++y) {
    const Samples row = picture.Row(y);
    for (int c = 0; c < planes.Count; ++c)
      for (int x = 0; x < width; ++x)
        planes(c, x, y) = row[std::size_t(places[std::size_t(c)].Offset + x * picture.PixelSize())];
  }
  return planes;
}

std::vector<Samples> With(std::vector<Samples> rows, const Picture& picture, const Planar& planes) {
  const std::vector<PlacedPlane> places = PlanesOf(picture);
  for (int c = 0; c < planes.Count; ++c)
    for (int y = 0; y < planes.Height; ++y)
      for (int x = 0; x < planes.Width; ++x)
        rows[std::size_t(y)][std::size_t(places[std::size_t(c)].Offset + x * picture.PixelSize())] =
            planes(c, x, y);
  return rows;
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

std::vector<Samples> WantedRows(const PointFilter& filter, const Picture& source, const Picture& dest) {
  Planar planes = PlanesIn(dest, source.Width(), source.Height());
  ModelOf(filter)(PlanesIn(source, source.Width(), source.Height()), planes);
  return With(StoredRows(dest), dest, planes);
}

void ExpectPointFilter(const PointFilter& point) {
  const AreaFilter filter{point.Run, ModelOf(point)};
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
