#pragma once
#include <cstdint>
#include <span>
#include <string_view>

namespace picturezor::files {

// Boxes as JPEG 2000 and JPEG XL have them: a size that counts itself, four letters, the content.

using Span = std::span<const std::uint8_t>;

/// Of `size` bytes from `at` on, the first one highest; bytes beyond the end don't count.
inline std::uint64_t Number(Span bytes, std::size_t at, std::size_t size) {
  std::uint64_t number = 0;
  for (std::size_t i = at; i < at + size && i < bytes.size(); ++i) number = number << 8 | bytes[i];
  return number;
}

/// Calls `look` with the name and the content of each box, and the place where it begins. False where the
/// last one is cut off.
template <class Look>
bool ForBoxes(Span bytes, Look&& look) {
  for (std::size_t at = 0; at < bytes.size();) {
    std::uint64_t size = Number(bytes, at, 4);
    std::size_t header = 8;
    if (size == 1) {
      size = Number(bytes, at + 8, 8);
      header = 16;
    }
    if (size == 0) size = bytes.size() - at;
    if (size < header || size > bytes.size() - at) return false;
    look(std::string_view(reinterpret_cast<const char*>(&bytes[at + 4]), 4),
         bytes.subspan(at + header, std::size_t(size) - header), at);
    at += std::size_t(size);
  }
  return true;
}

}
