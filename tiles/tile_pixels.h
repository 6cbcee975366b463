#pragma once
#include "image_file.h"
#include "picturezor/picture.h"

namespace picturezor::tiles {

/// From the pixels of a level to those of its tiles.
class TilePixels {
 public:
  /// Both formats of files; `to` may lack the alpha of `from`, and be RGB where `from` is gray.
  TilePixels(Format from, Format to, Color background);

  bool Same() const { return From == To; }
  /// A pixel of a tile where there is no picture: without colour where it has alpha.
  std::span<const std::uint8_t> Outside() const { return OutsidePixel; }
  void Convert(const std::uint8_t* row, std::int32_t count, std::uint8_t* into) const;
  /// Whether pixels of a level show the background alone, or nothing.
  bool AreBlank(const std::uint8_t* row, std::int32_t count) const;

 private:
  Format From, To;
  int Colours, FromChannels, ToChannels;
  bool Blends;
  /// As colours of a level, and as a pixel of a tile.
  Bytes Background, OutsidePixel;
};

}
