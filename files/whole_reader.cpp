#include "whole_reader.h"

#include <cstring>

namespace picturezor::files {

bool WholeReader::Select(const Rect& part) {
  if (WholeWidth == 0) {
    WholeWidth = About.Width;
    WholeHeight = About.Height;
  }
  About.Width = part.Width;
  About.Height = part.Height;
  Left = part.X;
  Next = part.Y;
  return true;
}

void WholeReader::ReadRow(std::uint8_t* row) {
  const auto channels = std::int64_t{ChannelsOf(About.Pixels)};
  if (WholeWidth == 0) Select({0, 0, About.Width, About.Height});
  if (Pixels.empty()) {
    const std::int64_t size = channels * WholeWidth * WholeHeight;
    RequireWithinLimit(From.Name(), size, Options.MemoryLimit, std::string("a picture in ") + Type().Name);
    Pixels.resize(std::size_t(size));
    Decode(Pixels.data());
  }
  std::memcpy(row, &Pixels[std::size_t((std::int64_t{Next++} * WholeWidth + Left) * channels)],
              std::size_t(About.Width * channels));
}

}
