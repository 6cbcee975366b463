#pragma once
#include "scale/contributions.h"
#include "scale/pairs.h"

namespace zor {

// The plain forms of the two passes, which define the result. They need no memory.

/// The sample that a sum over a line becomes.
Sample ExactQuotient(double sum, float divisor);

/// Columns of a result, first to last - 1.
struct Columns {
  std::int32_t First, End;
  std::int32_t Count() const { return End - First; }
};

/// How many rows the plain first pass makes best together.
int RowsTogether(int channels);

/// Makes the pixels of some columns in one row, or in up to RowsTogether of them, out of as many rows of the
/// source; into[r] is where the first of them goes.
void ExactHorizontal(const Sample* const* from, Sample* const* into, int rows, const ScalePair& pair,
                     const PixelOrder& order, const ContributionTable& table, Columns columns);

/// Sums of a line, at most ExactTile of them side by side, which rows are added to in the order of its
/// entries.
constexpr int ExactTile = 640;
class ExactSums {
 public:
  explicit ExactSums(int count) : Count(count) {}
  void Add(const Sample* row, float weight);
  void Store(float divisor, Sample* into) const;

 private:
  int Count;
  double Sums[ExactTile] = {};
};

}
