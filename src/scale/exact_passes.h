#pragma once
#include "scale/contributions.h"
#include "scale/pairs.h"

namespace zor {

// The plain forms of the two passes, which define the result, over rows in hand. They need no memory.

/// The sample that a sum over a line becomes.
Sample ExactQuotient(double sum, float divisor);

/// How many rows the plain first pass makes best together.
int RowsTogether(int channels);

/// Makes one row of temp, or up to RowsTogether of them, from as many rows of the source.
void ExactHorizontal(const Sample* const* from, Sample* const* into, int rows, const ScalePair& pair,
                     const ContributionTable& table);

/// Makes bytes `first` to `first` + count - 1 of a result line out of the same bytes of the rows of temp, at
/// most ExactTile of them.
constexpr int ExactTile = 640;
void ExactVertical(PictureData& temp, const Contribution& line, std::ptrdiff_t first, int count,
                   Sample* into);

}
