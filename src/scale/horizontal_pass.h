#pragma once
#include "scale/contributions.h"
#include "scale/fixed_point_rows.h"
#include "scale/scale_context.h"
#include "scale/turned_rows.h"

namespace zor {

/// The first pass, prepared for all its rows. Its rows may then be made in any order and on several threads.
class HorizontalPass {
 public:
  HorizontalPass(const ScaleContext& context, const ContributionTable& table);
  /// Makes the rows first to last of temp; `yields` may yield after each if it is given. False when a row of
  /// the source can't be reached, and without memory.
  bool Run(std::int32_t first, std::int32_t last, PictureData* yields) const;

  /// A run of columns begins with a multiple of this.
  int ColumnUnit() const { return Fixed ? Fixed.GroupPixels() : 1; }
  /// What MakeRows needs to work in.
  std::size_t ScratchBytes() const { return Fixed ? 0 : Turned.ScratchBytes(); }
  /// Makes some columns of `count` rows from `first` on; into[r] is where the first pixel of a row goes.
  /// False when a row of the source can't be reached.
  bool MakeRows(std::int32_t first, int count, const PixelOrder& order, Columns columns, Sample* const* into,
                Sample* scratch) const;

 private:
  static constexpr int MostRowsTogether = SlotLoops::MostWidth;

  int BestTogether() const;
  void MakeSamples(const RowRun& from, Sample* const* into, int rows, const PixelOrder& order,
                   Columns columns, Sample* scratch) const;

  const ScaleContext& Context;
  const ContributionTable& Table;
  FixedPointRows Fixed;
  /// Where the other form isn't served.
  TurnedRows Turned;
  /// How many rows are made best together.
  int Together;
};

}
