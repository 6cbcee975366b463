#include "scale/passes.h"

#include <algorithm>

#include "scale/exact_passes.h"
#include "scale/float_columns.h"

namespace zor {
namespace {

/// A run of a line by the plain form, a tile at a time.
void PlainLine(const ScaleContext& context, const Contribution& line, std::int32_t y) {
  const PixelScatter scatter(context.Pair, context.Pair.Temp);
  const std::int32_t bytes = scatter.Order.Count, tile = ExactTile / bytes;
  for (std::int32_t x = 0; x < context.ResultWidth; x += tile) {
    const std::int32_t count = std::min(tile, context.ResultWidth - x);
    ExactSums sums(count * bytes);
    for (std::int32_t t = 0; t < line.Count; ++t)
      WithRow(*context.Temp, line.Entries[t].Pixel,
              [&](const Sample* row) { sums.Add(row + std::ptrdiff_t{x} * bytes, line.Entries[t].Weight); });
    Sample samples[ExactTile];
    sums.Store(line.Sum, samples);
    WithRow(*context.Dest, y, [&](Sample* row) { scatter.Store(samples, row, x, count); });
  }
}

/// Makes the lines from y on that are made together, in one stripe.
bool MakeLines(FloatColumns& columns, PictureData& dest, std::int32_t y, int count, Columns of) {
  const PixelScatter& scatter = columns.Scatter();
  Sample* into[LineSums::Most];
  bool direct[LineSums::Most];
  for (int i = 0; i < count; ++i) {
    // Rows of a mapped picture aren't in hand together, and none while others are fetched.
    Sample* row = scatter.Direct && !dest.IsMapping ? FetchRow(dest, y + i) : nullptr;
    direct[i] = row != nullptr;
    into[i] = row ? scatter.Place(row, of.First) : columns.Scratch(i);
  }
  if (!columns.Make(y, count, into)) return false;
  for (int i = 0; i < count; ++i)
    if (!direct[i])
      WithRow(dest, y + i, [&](Sample* row) { scatter.Store(into[i], row, of.First, of.Count()); });
  return true;
}

}

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
  const PixelOrder& order = Context.Pair.Temp;
  for (std::int32_t y = first; y <= last;) {
    const int rows = last - y + 1 >= together ? together : 1;
    const Sample* from[MostRowsTogether];
    Sample* into[MostRowsTogether];
    bool reached = true;
    for (int r = 0; r < rows; ++r) {
      from[r] = FetchRow(*Context.Source, y + r);
      if (!from[r]) return false;
      into[r] = FetchRow(*Context.Temp, y + r);
      reached = reached && into[r];
    }
    if (reached && Fast)
      Fast.Run(from, into, rows, order, all);
    else if (reached)
      ExactHorizontal(from, into, rows, Context.Pair, order, Table, all);
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
  for (std::int32_t x = columns.First; x < columns.End; x += Tile) {
    const Columns tile{x, std::min(x + Tile, columns.End)};
    ExactHorizontal(from, tiles, count, Context.Pair, order, Table, tile);
    for (int r = 0; r < count; ++r)
      std::copy_n(samples[r], tile.Count() * order.Count,
                  into[r] + std::ptrdiff_t{x - columns.First} * order.Count);
  }
  return true;
}

bool VerticalPass(const ScaleContext& context, const ContributionTable& table, const HorizontalPass* rows,
                  std::int32_t first, std::int32_t last, PictureData* yields) {
  FloatColumns columns(context, table, rows);
  if (!columns && rows) return false;
  if (!columns) {
    for (std::int32_t y = first; y <= last; ++y) {
      PlainLine(context, table[y], y);
      if (yields) MayYield(*yields);
    }
    return true;
  }
  for (std::int32_t x = 0; x < context.ResultWidth; x += columns.StripePixels()) {
    const Columns of{x, std::min(x + columns.StripePixels(), context.ResultWidth)};
    columns.Begin(of);
    for (std::int32_t y = first; y <= last;) {
      const int count = std::min(columns.LinesTogether(), last - y + 1);
      if (!MakeLines(columns, *context.Dest, y, count, of)) return false;
      for (int i = 0; yields && i < count; ++i) MayYield(*yields);
      y += count;
    }
  }
  return true;
}

}
