#include "scale/horizontal_pass.h"

#include <algorithm>

#include "scale/exact_passes.h"

namespace zor {

HorizontalPass::HorizontalPass(const ScaleContext& context, const ContributionTable& table)
    : Context(context),
      Table(table),
      Fixed(context.Pair, table, context.Source->Width),
      Single(Fixed ? FloatRows() : FloatRows(context.Pair, table, context.Source->Width)),
      Together(BestTogether()) {}

int HorizontalPass::BestTogether() const {
  const int best = Fixed    ? FixedPointRows::RowsTogether
                   : Single ? FloatRows::RowsTogether
                            : zor::RowsTogether(Context.Pair.Channels);
  const std::int32_t inHand = Context.Temp ? std::min(RowsAtOnce(*Context.Source), RowsAtOnce(*Context.Temp))
                                           : RowsAtOnce(*Context.Source);
  return std::clamp(inHand, 1, best);
}

void HorizontalPass::MakeSamples(const RowRun& from, const RowRun& into, int rows, Sample* scratch) const {
  const Columns all{0, Context.ResultWidth};
  const PixelOrder& order = Context.Pair.Temp;
  const Sample* read[MostRowsTogether];
  Sample* written[MostRowsTogether];
  for (int r = 0; r < rows; ++r) {
    read[r] = from[r];
    written[r] = into[r];
  }
  if (Fixed)
    Fixed.Run(read, written, rows, order, all);
  else if (Single)
    Single.Run(read, written, rows, order, all, scratch);
  else
    ExactHorizontal(read, written, rows, Context.Pair, order, Table, all);
}

bool HorizontalPass::Run(std::int32_t first, std::int32_t last, PictureData* yields) const {
  const Buffer scratch = NewBuffer(ScratchBytes() + 1);
  if (!scratch) return false;
  for (std::int32_t y = first; y <= last;) {
    int rows = std::min(Together, last - y + 1);
    const auto make = [&](const RowRun& from, const RowRun& into) {
      MakeSamples(from, into, rows, scratch.get());
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

bool HorizontalPass::MakeFloats(std::int32_t first, int count, const PixelOrder& order, Columns columns,
                                float* const* into, Sample* scratch) const {
  RowRun run;
  if (!RowSpan{*Context.Source, first, count}.Fetch(run)) {
    bool all = count > 1;
    for (int r = 0; r < count && all; ++r) all = MakeFloats(first + r, 1, order, columns, into + r, scratch);
    return all;
  }
  const Sample* from[MostRowsTogether];
  for (int r = 0; r < count; ++r) from[r] = run[r];
  if (Fixed) {
    Fixed.Run(from, into, count, order, columns);
    return true;
  }
  if (Single) {
    Single.Run(from, into, count, order, columns, scratch);
    return true;
  }
  constexpr std::int32_t Tile = 512, MostRows = 8;
  Sample samples[MostRows][Tile * 5];
  Sample* tiles[MostRows];
  for (int r = 0; r < count; ++r) tiles[r] = samples[r];
  for (std::int64_t x = columns.First; x < columns.End; x += Tile) {
    const Columns tile{std::int32_t(x), std::int32_t(std::min<std::int64_t>(x + Tile, columns.End))};
    ExactHorizontal(from, tiles, count, Context.Pair, order, Table, tile);
    for (int r = 0; r < count; ++r)
      std::copy_n(samples[r], tile.Count() * order.Count,
                  into[r] + std::ptrdiff_t(x - columns.First) * order.Count);
  }
  return true;
}

}
