#pragma once
#include <cstddef>

#include "scale/contributions.h"
#include "scale/quotients.h"

namespace zor {

/// A few lines that are summed together, since they look at much the same rows of floats. A row is what the
/// lines' entries stand for: a row between the passes, or a column of a few source rows at once.
struct LineSums {
  static constexpr int Most = 4;
  /// Floats that are summed at a time; a row has room for so many more than it has samples.
  static constexpr int Block = 64;

  /// The rows from FirstRow on, each aligned like a vector.
  const float* const* Rows;
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

/// Makes one of the lines, or one sample of it, by the plain form; a float that was made of a sample is that
/// sample.
void SumPlainLine(const LineSums& sums, int line);
Sample PlainSample(const LineSums& sums, int line, std::ptrdiff_t at);

/// The forms of SumLines for processors with AVX2 and with AVX-512.
void SumLinesAVX2(const LineSums& sums);
void SumLinesAVX512(const LineSums& sums);

}
