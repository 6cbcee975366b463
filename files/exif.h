#pragma once
#include <optional>
#include <span>

#include "image_file.h"

namespace picturezor::files {

/// What of a camera's notes matters here.
struct Exif {
  int Orientation = 1;
  std::optional<Resolution> Density;
};

/// Reads a block of EXIF, from its byte order mark on. What is damaged counts as not there.
Exif ReadExif(std::span<const std::uint8_t> block);

}
