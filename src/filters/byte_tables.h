#pragma once
#include <array>

#include "image/groups.h"

namespace zor {

/// A row as plain bytes: each place in the pixel has a table, or none and is left alone. This is for planes
/// that lie alike in both pictures.
struct ByteTables {
  /// For planes with a table each, counted from the one that lies first.
  ByteTables(const PlaneList& planes, const std::array<const SampleTable*, 5>& tables, std::int32_t width);

  /// Bytes of a row from its first mapped sample to its last one.
  std::ptrdiff_t Bytes;
  /// Bytes of a pixel, 1 to 8.
  int Step;
  /// Whether every byte is mapped, by one table.
  bool Uniform;
  /// The different tables, at most one each for red, green, blue and alpha.
  int Count = 0;
  std::array<const SampleTable*, 4> Table{};
  /// Which table each place of a pixel has, from the first mapped one on; -1 for none.
  std::array<int, 8> At;
  /// Of 64 bytes that start at some place in a pixel: which have a table, and which have table t.
  std::array<std::uint64_t, 8> Mapped{};
  std::array<std::array<std::uint64_t, 4>, 8> Of{};
};

/// Sends the bytes of a row through their tables, as far as there is a fast form for them: gives how many
/// pixels from the left are done. The rows are one and the same or don't overlap.
std::ptrdiff_t MapBytes(const ByteTables& tables, const Sample* in, Sample* out);

// The forms that look bytes up in registers, each for its instruction set; those that give a number
// have done so many bytes, whole pixels unless the tables are Uniform.
std::ptrdiff_t MapBytesAVX2(const ByteTables& tables, const Sample* in, Sample* out);
std::ptrdiff_t MapBytesNEON(const ByteTables& tables, const Sample* in, Sample* out);
void MapBytesVBMI(const ByteTables& tables, const Sample* in, Sample* out);

}
