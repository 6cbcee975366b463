#pragma once
#include "scale/pairs.h"

namespace zor {

// A scale is two passes: along the rows from the source into a temporary picture of 8 bits, then along the
// columns from there into dest.
//
// What a sample becomes is defined by the plain form (exact_passes.h): a sum in double of weight times sample
// over the entries of its line, in their order; the quotient of that and the line's `Sum`, cut off toward
// zero, kept within 0 and 255, and 0 where there is nothing to divide by. A float times a byte is exact in
// double, so it doesn't matter whether a processor rounds the product. Luma is the one channel with three
// terms an entry: the weight times (red times 0.3), then (green times 0.59), then (blue times 0.11).
//
// The fast forms give the same bytes; quotients.h says why. Nor does the result tell whether the rows between
// the passes all stood in a picture or were made when they were wanted, which takes no more memory than the
// rows that a few lines of the result look at.

/// The pictures of a scale, and how large the result is. Temp is null where no picture stands between the
/// passes. A row of temp or dest that can't be reached is passed over, and one of temp counts as black.
struct ScaleContext {
  PictureData *Source, *Dest, *Temp;
  std::int32_t ResultWidth, ResultHeight;
  ScalePair Pair;
};

}
