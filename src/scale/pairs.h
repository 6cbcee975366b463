#pragma once
#include <array>

#include "image/groups.h"

namespace zor {

/// What the first pass writes for a pixel: by place, the channel that stands there, or that it is always 0.
struct PixelOrder {
  static constexpr int Zero = -1;
  int Count = 0;
  std::array<int, 5> Channel{};
};

/// What goes where between two pictures of a pair of families.
///
/// The first pass makes channels of the source's planes: one of each, in the order that dest's pixel has
/// them, or with `Luma` one of the first three. The second pass gives each plane of dest one of the channels.
struct ScalePair {
  PlaneList Source;
  bool Luma = false;
  int Channels = 0;
  PlaneList Dest;
  std::array<int, 5> ChannelOfPlane{};
  /// A pixel of a temporary picture, whose bytes are the channels or 0, and its format.
  PixelOrder Temp;
  std::int32_t TempFormat = 0;
};

/// The pair of two pictures. Alpha takes part where both have it. False where there is none: between RGB and
/// CMYK, and for a picture without a family.
bool FindScalePair(const PictureData& source, const PictureData& dest, ScalePair& pair);

/// The channels in the order in which dest's pixel has them.
PixelOrder OrderOfDest(const ScalePair& pair);

/// Where the samples of a pixel go: by plane of dest, the place in a `PixelOrder`.
struct PixelScatter {
  PixelOrder Order;
  PlaneList Planes;
  std::array<int, 5> PlaceOfPlane{};
  /// Whether a pixel of samples is dest's pixel, so that a run of them can be copied.
  bool Direct = false;

  PixelScatter(const ScalePair& pair, const PixelOrder& order);
  /// The first sample of a run that is copied to pixel x of a row.
  Sample* Place(Sample* row, std::int32_t x) const;
  /// Stores the samples of `count` pixels, the first at pixel x.
  void Store(const Sample* samples, Sample* row, std::int32_t x, std::int32_t count) const;
};

}
