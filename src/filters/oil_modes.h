#pragma once
#include <cstddef>

#include "image/picture_data.h"

namespace zor {

/// Columns of samples with their classes counted: `Classes` bytes a sample, `Pixel` samples a pixel; no
/// samples in the one at `None`. `Around` has the counts of the 2 Range + 1 columns before `First`, for each
/// plane of the pixel. All of them start at multiples of 64.
struct CountedColumns {
  const Sample* Of;
  Sample* Around;
  const Sample* None;
  std::ptrdiff_t Classes, Pixel, Range;
  /// The pixels that enter the neighbourhoods.
  std::ptrdiff_t First, End;

  const Sample* Entering(std::ptrdiff_t x, std::ptrdiff_t plane) const {
    return Of + (x * Pixel + plane) * Classes;
  }
  const Sample* Leaving(std::ptrdiff_t x, std::ptrdiff_t plane) const {
    return x > 2 * Range ? Entering(x - 2 * Range - 1, plane) : None;
  }
};

/// Brings `Around` up to date. For each pixel that completes 2 Range + 1 columns: the class with the most
/// samples in them, the lowest of those on a tie, and how many it has, which are no more than 255. Written to
/// the place of the first of the columns.
void FindModes(const CountedColumns& columns, Sample* modes, Sample* counts);

/// The same with all counts of a neighbourhood in registers, where a sample counts `UnitInRegisters`. For
/// Target::AVX2 or better, 64, 128, 192 or 256 classes, and up to 63 samples in a neighbourhood.
constexpr int UnitInRegisters = 4;
void FindModesAVX2(const CountedColumns& columns, Sample* modes, Sample* counts);

}
