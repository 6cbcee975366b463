#pragma once
#include <cstddef>

#include "scale/contributions.h"
#include "scale/quotients.h"

namespace zor {

/// Rows between the passes as floats, of which the last few are there.
struct RowRing {
  float* Memory;
  std::ptrdiff_t Room;
  std::int32_t Slots;
  float* operator[](std::int32_t row) const { return Memory + row % Slots * Room; }
};

/// A few lines of the result that are summed together, since they look at much the same rows.
struct LineSums {
  static constexpr int Most = 4;

  RowRing Rows;
  std::int32_t FirstRow, RowCount;
  int LineCount;
  const Contribution* Of[Most];
  FloatLine Lines[Most];
  /// The lines' shares in a row, LineCount of them a row.
  const float* Shares;
  std::ptrdiff_t Samples;
  Sample* Into[Most];
};

/// Makes the lines, of which there are 1, 2 or 4.
void SumLines(const LineSums& sums);

/// A sample by the plain form; a float that was made of a sample is that sample.
Sample PlainSample(const Contribution& line, const RowRing& rows, std::ptrdiff_t at);

/// The form of SumLines for processors with AVX-512.
void SumLinesAVX512(const LineSums& sums);

}
