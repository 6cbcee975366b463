#include "whole_reader.h"

#include <cstring>

namespace picturezor::files {

bool WholeReader::Select(const Rect& part) {
  if (Whole.Width == 0) Whole = {About.Width, About.Height};
  About.Width = part.Width;
  About.Height = part.Height;
  Left = part.X;
  Next = part.Y;
  return true;
}

void WholeReader::ReadRow(std::uint8_t* row) {
  const auto channels = std::int64_t{ChannelsOf(About.Pixels)};
  if (Whole.Width == 0) Whole = {About.Width, About.Height};
  if (Pixels.empty()) {
    const std::int64_t size = channels * Whole.Width * Whole.Height;
    RequireWithinLimit(From.Name(), size * Needs, Options.MemoryLimit,
                       std::string("a picture in ") + About.Type->Name);
    Pixels.resize(std::size_t(size));
    Decode(Pixels.data(), Whole);
  }
  std::memcpy(row, &Pixels[std::size_t((std::int64_t{Next++} * Whole.Width + Left) * channels)],
              std::size_t(About.Width * channels));
}

}
