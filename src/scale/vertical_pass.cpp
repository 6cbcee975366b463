#include "scale/vertical_pass.h"

#include <algorithm>

#include "scale/exact_passes.h"

namespace zor {
namespace {

/// A run of a line by the plain form, a tile at a time.
void PlainLine(const ScaleContext& context, const Contribution& line, std::int32_t y) {
  const PixelScatter scatter(context.Pair, context.Pair.Temp);
  const std::int32_t bytes = scatter.Order.Count, tile = ExactTile / bytes;
  for (std::int64_t left = context.ResultWidth; left > 0; left -= tile) {
    const auto x = std::int32_t(context.ResultWidth - left),
               count = std::int32_t(std::min<std::int64_t>(tile, left));
    ExactSums sums(count * bytes);
    for (std::int32_t t = 0; t < line.Count; ++t)
      WithRow(*context.Temp, line.PixelAt(t),
              [&](const Sample* row) { sums.Add(row + std::ptrdiff_t{x} * bytes, line.Entries[t].Weight); });
    Sample samples[ExactTile];
    sums.Store(line.Sum, samples);
    WithRow(*context.Dest, y, [&](Sample* row) { scatter.Store(samples, row, x, count); });
  }
}

}

bool VerticalPass::MakeLines(std::int32_t y, int count, Columns stripe, SlotColumns& columns) const {
  const PixelScatter& scatter = Plan->Samples;
  Sample* into[ColumnPlan::MostTogether] = {};
  bool direct[ColumnPlan::MostTogether];
  for (int i = 0; i < count; ++i) {
    // Rows of a mapped picture aren't in hand together, and none while others are fetched.
    Sample* row = scatter.Direct && !Context.Dest->IsMapping ? FetchRow(*Context.Dest, y + i) : nullptr;
    direct[i] = row != nullptr;
    into[i] = row ? scatter.Place(row, stripe.First) : columns.Scratch(i);
  }
  if (!columns.Make(y, count, into)) return false;
  for (int i = 0; i < count; ++i)
    if (!direct[i])
      WithRow(*Context.Dest, y + i,
              [&](Sample* row) { scatter.Store(into[i], row, stripe.First, stripe.Count()); });
  return true;
}

void VerticalPass::MakePlainLines(std::int32_t first, std::int32_t last, PictureData* yields) const {
  for (std::int32_t y = first; y <= last; ++y) {
    PlainLine(Context, Table[y], y);
    if (yields) MayYield(*yields);
  }
}

bool VerticalPass::Run(std::int32_t first, std::int32_t last, PictureData* yields) const {
  std::optional<SlotColumns> columns;
  if (Plan) columns.emplace(*Plan);
  if (!columns || !*columns) {
    if (!Context.Temp) return false;
    MakePlainLines(first, last, yields);
    return true;
  }
  for (std::int64_t x = 0; x < Context.ResultWidth; x += Plan->Stripe) {
    const Columns stripe{std::int32_t(x),
                         std::int32_t(std::min<std::int64_t>(x + Plan->Stripe, Context.ResultWidth))};
    columns->Begin(stripe);
    for (std::int32_t y = first; y <= last;) {
      const int count = std::min(Plan->Together, last - y + 1);
      if (!MakeLines(y, count, stripe, *columns)) return false;
      for (int i = 0; yields && i < count; ++i) MayYield(*yields);
      y += count;
    }
  }
  return true;
}

}
