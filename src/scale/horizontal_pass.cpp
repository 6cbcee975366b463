#include "scale/horizontal_pass.h"

#include <algorithm>

#include "scale/exact_passes.h"

namespace zor {

HorizontalPass::HorizontalPass(const ScaleContext& context, const ContributionTable& table)
    : Context(context), Table(table), Fast(context.Pair, table, context.Source->Width) {}

int HorizontalPass::RowsTogether() const {
  // Rows of a mapped picture aren't in hand together.
  if (Context.Source->IsMapping || (Context.Temp && Context.Temp->IsMapping)) return 1;
  return Fast ? FixedPointRows::RowsTogether : zor::RowsTogether(Context.Pair.Channels);
}

bool HorizontalPass::Run(std::int32_t first, std::int32_t last, PictureData* yields) const {
  const int together = RowsTogether();
  const Columns all{0, Context.ResultWidth};
  for (std::int32_t y = first; y <= last;) {
    int rows = last - y + 1 >= together ? together : 1;
    const Sample* from[MostRowsTogether];
    Sample* into[MostRowsTogether];
    for (int r = 0; r < rows; ++r) {
      from[r] = FetchRow(*Context.Source, y + r);
      if (!from[r]) return false;
      into[r] = FetchRow(*Context.Temp, y + r);
      // The rows before one that can't be reached are made one by one.
      if (!into[r]) rows = 1;
    }
    if (into[0] && Fast)
      Fast.Run(from, into, rows, Context.Pair.Temp, all);
    else if (into[0])
      ExactHorizontal(from, into, rows, Context.Pair, Context.Pair.Temp, Table, all);
    for (int r = 0; yields && r < rows; ++r) MayYield(*yields);
    y += rows;
  }
  return true;
}

bool HorizontalPass::MakeFloats(std::int32_t first, int count, const PixelOrder& order, Columns columns,
                                float* const* into) const {
  const Sample* from[MostRowsTogether];
  for (int r = 0; r < count; ++r) {
    from[r] = FetchRow(*Context.Source, first + r);
    if (!from[r]) return false;
  }
  if (Fast) {
    Fast.Run(from, into, count, order, columns);
    return true;
  }
  constexpr std::int32_t Tile = 512;
  Sample samples[MostRowsTogether][Tile * 5];
  Sample* tiles[MostRowsTogether];
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
