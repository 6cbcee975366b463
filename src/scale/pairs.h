#pragma once
#include <array>

#include "image/groups.h"

namespace zor {

/// What goes where between two pictures of a pair of families, by way of a temporary picture.
///
/// The first pass makes channels of the source's planes: one of each, or with `Luma` one of the first three.
/// A pixel of the temporary picture is `TempBytes` bytes, each of them a channel or always 0; the second pass
/// gives each plane of dest one of these bytes.
struct ScalePair {
  static constexpr int Zero = -1;

  PlaneList Source;
  bool Luma = false;
  int Channels = 0;
  std::int32_t TempFormat = 0;
  int TempBytes = 0;
  std::array<int, 5> ChannelOfByte{};
  PlaneList Dest;
  std::array<int, 5> ByteOfPlane{};
};

/// The pair of two pictures. Alpha takes part where both have it. False where there is none: between RGB and
/// CMYK, and for a picture without a family.
bool FindScalePair(const PictureData& source, const PictureData& dest, ScalePair& pair);

}
