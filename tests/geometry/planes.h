#pragma once
#include "support/every_store.h"

namespace picturezor {

/// Moves the planes of all pixels of packed pixels: pixel (x, y) of `into`, which is `width` wide, comes from
/// the pixel of `from` that place(x, y) counts.
template <class Place>
void MovePlanes(const Samples& from, Samples& into, int width, int height, Format format, Place&& place) {
  const std::string& letters = LettersOf(format);
  const std::size_t step = letters.size();
  for (int y = 0; y < height; ++y)
    for (int x = 0; x < width; ++x)
      for (std::size_t at = 0; at < step; ++at)
        if (letters[at] != '-')
          into[std::size_t(y * width + x) * step + at] = from[std::size_t(place(x, y)) * step + at];
}

struct ImageSize {
  int Width, Height;
};

}
