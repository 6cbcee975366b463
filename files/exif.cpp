#include "exif.h"

namespace picturezor::files {

namespace {

/// Numbers at places in a block; 0 beyond its end.
class Block {
 public:
  explicit Block(std::span<const std::uint8_t> bytes)
      : At(bytes), Little(bytes.size() > 1 && bytes[0] == 'I' && bytes[1] == 'I') {}

  std::uint32_t Number(std::size_t place, std::size_t size) const {
    if (place > At.size() || size > At.size() - place) return 0;
    std::uint32_t number = 0;
    for (std::size_t i = 0; i < size; ++i) number = number << 8 | At[place + (Little ? size - 1 - i : i)];
    return number;
  }

  double Ratio(std::size_t place) const {
    const std::uint32_t divisor = Number(place + 4, 4);
    return divisor ? double(Number(place, 4)) / divisor : 0;
  }

 private:
  std::span<const std::uint8_t> At;
  bool Little;
};

}

Exif ReadExif(std::span<const std::uint8_t> bytes) {
  enum : std::uint32_t { Orientation = 0x112, XResolution = 0x11A, YResolution = 0x11B, Unit = 0x128 };
  Exif exif;
  const Block block(bytes);
  if (block.Number(2, 2) != 42) return exif;
  const std::size_t directory = block.Number(4, 4);
  const std::uint32_t count = block.Number(directory, 2);
  Resolution density;
  double inches = 1;
  for (std::uint32_t i = 0; i < count; ++i) {
    const std::size_t entry = directory + 2 + std::size_t{12} * i;
    const std::uint32_t value = block.Number(entry + 8, 2);
    switch (block.Number(entry, 2)) {
      case Orientation:
        if (value >= 1 && value <= 8) exif.Orientation = int(value);
        break;
      case XResolution: density.X = block.Ratio(block.Number(entry + 8, 4)); break;
      case YResolution: density.Y = block.Ratio(block.Number(entry + 8, 4)); break;
      case Unit: inches = value == 3 ? 2.54 : 1; break;
    }
  }
  if (density.X > 0 && density.Y > 0) exif.Density = {density.X * inches, density.Y * inches};
  return exif;
}

}
