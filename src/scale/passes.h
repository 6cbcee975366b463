#pragma once
#include "scale/contributions.h"
#include "scale/fixed_point_rows.h"
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

/// The first pass, prepared for all its rows. Its rows may then be made in any order and on several threads.
class HorizontalPass {
 public:
  HorizontalPass(const ScaleContext& context, const ContributionTable& table);
  /// Makes the rows first to last of temp; `yields` may yield after each if it is given. False when a row of
  /// the source can't be reached.
  bool Run(std::int32_t first, std::int32_t last, PictureData* yields) const;

  /// How many rows are made best together.
  int RowsTogether() const;
  /// A run of columns begins with a multiple of this.
  int ColumnUnit() const { return Fast ? Fast.GroupPixels() : 1; }
  /// Makes some columns of `count` rows from `first` on, as floats, at most RowsTogether of them; into[r] has
  /// room for 64 floats more. False when a row of the source can't be reached.
  bool MakeFloats(std::int32_t first, int count, const PixelOrder& order, Columns columns,
                  float* const* into) const;

 private:
  static constexpr int MostRowsTogether = 8;

  const ScaleContext& Context;
  const ContributionTable& Table;
  FixedPointRows Fast;
};

/// The second pass over the lines first to last of dest. The rows between the passes stand in temp, or are
/// made by `rows` where there is no temp. False, and the lines made in part, without memory for the rows,
/// which only happens with `rows`, or when a row of the source can't be reached.
bool VerticalPass(const ScaleContext& context, const ContributionTable& table, const HorizontalPass* rows,
                  std::int32_t first, std::int32_t last, PictureData* yields);

}
