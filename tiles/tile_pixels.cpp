#include "tile_pixels.h"

#include <algorithm>

namespace picturezor::tiles {

namespace {

using files::HasAlpha;

Bytes ColoursOf(Format format, Color c) {
  switch (files::WithoutAlpha(format)) {
    // The weights add up to 256.
    case Format::G: return {std::uint8_t((c.Red * 77 + c.Green * 151 + c.Blue * 28) >> 8)};
    case Format::RGB: return {c.Red, c.Green, c.Blue};
    default: return {std::uint8_t(255 - c.Red), std::uint8_t(255 - c.Green), std::uint8_t(255 - c.Blue), 0};
  }
}

}

TilePixels::TilePixels(Format from, Format to, Color background)
    : From(from),
      To(to),
      Colours(files::ChannelsOf(files::WithoutAlpha(from))),
      FromChannels(files::ChannelsOf(from)),
      ToChannels(files::ChannelsOf(to)),
      Blends(HasAlpha(from) && !HasAlpha(to)),
      Background(ColoursOf(from, background)),
      OutsidePixel(ColoursOf(to, background)) {
  if (HasAlpha(to)) OutsidePixel.assign(std::size_t(ToChannels), 0);
}

void TilePixels::Convert(const std::uint8_t* row, std::int32_t count, std::uint8_t* into) const {
  const int colours = ToChannels - (HasAlpha(To) ? 1 : 0);
  for (; count > 0; --count, row += FromChannels, into += ToChannels) {
    for (int c = 0; c < colours; ++c) {
      const int own = std::min(c, Colours - 1), sample = row[own];
      if (!Blends) {
        into[c] = std::uint8_t(sample);
        continue;
      }
      const int alpha = row[FromChannels - 1];
      into[c] = std::uint8_t((sample * alpha + Background[std::size_t(own)] * (255 - alpha) + 127) / 255);
    }
    if (HasAlpha(To)) into[ToChannels - 1] = HasAlpha(From) ? row[FromChannels - 1] : 255;
  }
}

bool TilePixels::AreBlank(const std::uint8_t* row, std::int32_t count) const {
  for (; count > 0; --count, row += FromChannels) {
    if (HasAlpha(From) && row[FromChannels - 1] == 0) continue;
    if ((HasAlpha(From) && row[FromChannels - 1] != 255) ||
        !std::equal(Background.begin(), Background.end(), row))
      return false;
  }
  return true;
}

}
