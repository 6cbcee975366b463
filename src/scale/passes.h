#pragma once
#include "scale/contributions.h"
#include "scale/fixed_point_rows.h"
#include "scale/pairs.h"

namespace zor {

// A scale is two passes: along the rows from the source into a temporary picture of 8 bits, then along the
// columns from there into dest.
//
// What a sample becomes is defined by the plain form: a sum in double of weight times sample over the entries
// of its line, in their order; the quotient of that and the line's `Sum`, cut off toward zero, kept within 0
// and 255, and 0 where there is nothing to divide by. A float times a byte is exact in double, so it doesn't
// matter whether a processor rounds the product. Luma is the one channel with three terms an entry: the
// weight times (red times 0.3), then (green times 0.59), then (blue times 0.11).
//
// The fast forms give the same bytes; quotients.h says why.

/// The pictures of a scale, and how large the result is. A row of temp or dest that can't be reached is
/// passed over, and one of temp counts as black.
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

 private:
  static constexpr int MostRowsTogether = 8;

  void MakeRows(const Sample* const* from, Sample* const* into, int rows) const;

  const ScaleContext& Context;
  const ContributionTable& Table;
  FixedPointRows Fast;
};

/// The second pass: makes the rows first to last of dest.
void VerticalPass(const ScaleContext& context, const ContributionTable& table, std::int32_t first,
                  std::int32_t last, PictureData* yields);

}
