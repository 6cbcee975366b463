#pragma once
#include "image/conversion.h"

namespace zor {

/// A picture's pixels as they stand in another layout, a stretch of a row at a time.
class InLayout {
 public:
  /// Bytes of the longest stretch.
  static constexpr std::int32_t Most = 8192;

  /// For pixels of `step` bytes. Samples that the conversion doesn't write are those of `rest`, 8 bytes or as
  /// many as a pixel has. Without a conversion all are.
  InLayout(const RowConversion& convert, const PlaneList& in, std::int32_t step, const Sample* rest)
      : Convert(convert), Left(LeftOf(in)), FromStep(in.Step) {
    for (std::int32_t x = 0; x + step <= Most; x += step)
      for (std::int32_t b = 0; b < step; ++b) Pixels[x + b] = rest[b];
  }
  /// The pixels from column x on. They may be those of the row itself, unless `copied`.
  const Sample* operator()(const Sample* row, std::int32_t x, std::int32_t count, bool copied = false) {
    if (!Convert) return Pixels;
    row += std::ptrdiff_t(x) * FromStep;
    if (Convert.Copies() && !copied) return row + Left;
    Convert(row, Pixels, count);
    return Pixels;
  }

 private:
  RowConversion Convert;
  std::int32_t Left, FromStep;
  Sample Pixels[Most];
};

/// The planes as they stand from the left edge of their pixel.
inline PlaneList InPixel(PlaneList planes) {
  const std::int32_t left = LeftOf(planes);
  for (int c = 0; c < planes.Count; ++c) planes.Offset[std::size_t(c)] -= left;
  return planes;
}

}
