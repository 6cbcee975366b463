#pragma once
#include "image/arithmetic.h"

namespace zor {

/// What a sample gives away: the part of it, truncated.
inline Sample PartOf(double part, Sample sample) { return Sample(Truncate(part * sample)); }

/// The same for all samples.
SampleTable PartsOf(double part);

/// A multiplication by whole numbers that gives the same for all samples: 256ths, and 256ths of these.
struct Multiplier {
  std::uint16_t High, Low;

  /// (High * 256 + Low) * sample / 65536 without passing 16 bits.
  std::uint16_t operator()(std::uint16_t sample) const {
    return std::uint16_t(std::uint16_t(sample * High + (std::uint16_t(sample * Low) >> 8)) >> 8);
  }
};

/// Finds the multiplier of a table of parts. The fractions that agree with a table fill an interval between
/// neighbours among those with denominators up to 255, which is wider than 1/65536 and so holds a whole
/// number of these. False for a part of 1, and where the rounding of a product put the table beside every
/// fraction.
bool FindMultiplier(double part, const SampleTable& table, Multiplier& multiplier);

}
