#include "scale/horizontal_pass.h"

#include <algorithm>

#include "scale/exact_passes.h"

namespace zor {

HorizontalPass::HorizontalPass(const ScaleContext& context, const ContributionTable& table)
    : Context(context),
      Table(table),
      Fixed(context.Pair, table, context.Source->Width),
      Turned(Fixed ? TurnedRows() : TurnedRows(context.Pair, table, context.Source->Width)),
      Together(BestTogether()) {}

int HorizontalPass::BestTogether() const {
  const int best = Fixed    ? FixedPointRows::RowsTogether
                   : Turned ? Turned.RowsTogether()
                            : RowsTogether(Context.Pair.Channels);
  const std::int32_t inHand = Context.Temp ? std::min(RowsAtOnce(*Context.Source), RowsAtOnce(*Context.Temp))
                                           : RowsAtOnce(*Context.Source);
  return std::clamp(inHand, 1, best);
}

void HorizontalPass::MakeSamples(const RowRun& from, Sample* const* into, int rows, const PixelOrder& order,
                                 Columns columns, Sample* scratch) const {
  const Sample* read[MostRowsTogether];
  for (int r = 0; r < rows; ++r) read[r] = from[r];
  if (Fixed)
    Fixed.Run(read, into, rows, order, columns);
  else if (Turned)
    Turned.Run(read, into, rows, order, columns, scratch);
  else
    ExactHorizontal(read, into, rows, Context.Pair, order, Table, columns);
}

bool HorizontalPass::Run(std::int32_t first, std::int32_t last, PictureData* yields) const {
  const Buffer scratch = NewBuffer(ScratchBytes() + 1);
  if (!scratch) return false;
  for (std::int32_t y = first; y <= last;) {
    int rows = std::min(Together, last - y + 1);
    const auto make = [&](const RowRun& from, const RowRun& into) {
      Sample* written[MostRowsTogether];
      for (int r = 0; r < rows; ++r) written[r] = into[r];
      MakeSamples(from, written, rows, Context.Pair.Temp, {0, Context.ResultWidth}, scratch.get());
    };
    const auto made = [&] { return WithRows({*Context.Source, y, rows}, {*Context.Temp, y, rows}, make); };
    if (!made() && rows > 1) {
      // Perhaps they can be reached one by one.
      rows = 1;
      made();
    }
    if (!FetchRow(*Context.Source, y)) return false;
    for (int r = 0; yields && r < rows; ++r) MayYield(*yields);
    y += rows;
  }
  return true;
}

bool HorizontalPass::MakeRows(std::int32_t first, int count, const PixelOrder& order, Columns columns,
                              Sample* const* into, Sample* scratch) const {
  for (int made = 0; made < count;) {
    int rows = std::min(Together, count - made);
    const auto make = [&](const RowRun& from) {
      MakeSamples(from, into + made, rows, order, columns, scratch);
    };
    const auto reached = [&] { return WithRows({*Context.Source, first + made, rows}, make); };
    if (!reached()) {
      // Perhaps they can be reached one by one.
      rows = 1;
      if (!reached()) return false;
    }
    made += rows;
  }
  return true;
}

}
