#pragma once
#include <vector>

#include "image/picture_data.h"
#include "support/every_store.h"

namespace picturezor {

/// The bytes of a pixel that belong to a plane; none where a format has no colours.
inline std::vector<int> PlaneBytes(Format format) {
  const Picture pixel(1, 1, format);
  if (!pixel.IsGray() && !pixel.IsRGB() && !pixel.IsCMYK()) return {};
  const auto& data = DataOf(pixel);
  return {data.ChannelOffsets.begin(), data.ChannelOffsets.begin() + data.ChannelCount};
}

/// Moves the planes of all pixels of packed pixels: pixel (x, y) of `into`, which is `width` wide, comes from
/// the pixel of `from` that place(x, y) counts.
template <class Place>
void MovePlanes(const Samples& from, Samples& into, int width, int height, Format format, Place&& place) {
  const auto step = std::size_t(BytesPerPixel(format));
  for (int y = 0; y < height; ++y)
    for (int x = 0; x < width; ++x)
      for (const int plane : PlaneBytes(format))
        into[std::size_t(y * width + x) * step + std::size_t(plane)] =
            from[std::size_t(place(x, y)) * step + std::size_t(plane)];
}

struct ImageSize {
  int Width, Height;
};

}
