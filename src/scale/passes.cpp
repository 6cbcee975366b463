#include "scale/passes.h"

#include <algorithm>

#include "scale/exact_passes.h"
#include "scale/float_columns.h"

namespace zor {
namespace {

/// Gives the planes of dest their samples, for `pixels` pixels from `firstPixel` on.
void StoreSamples(const Sample* samples, const SampleOrder& order, const PlaneList& planes, Sample* row,
                  std::int32_t firstPixel, std::int32_t pixels) {
  Sample* first = row + std::ptrdiff_t{firstPixel} * planes.Step;
  if (order.Direct) {
    const auto offset = *std::min_element(planes.Offset.begin(), planes.Offset.begin() + planes.Count);
    std::memcpy(first + offset, samples, std::size_t(pixels) * std::size_t(order.Count));
    return;
  }
  ForPlaneCount(planes.Count, [&](auto n) {
    const PlaneRow<n> dest(first, planes);
    for (std::ptrdiff_t x = 0; x < pixels; ++x)
      for (int p = 0; p < n; ++p) dest(p, x) = samples[x * order.Count + order.OfPlane[p]];
  });
}

/// The plain form's order: a temporary pixel as it is.
SampleOrder PlainOrder(const ScalePair& pair) {
  SampleOrder order;
  order.Count = pair.TempBytes;
  order.OfPlane = pair.ByteOfPlane;
  return order;
}

/// One line of a stripe by the plain form, a tile at a time.
void ExactLine(const ScaleContext& context, const Contribution& line, std::int32_t y, std::int32_t firstPixel,
               std::int32_t pixels) {
  const SampleOrder order = PlainOrder(context.Pair);
  const std::int32_t tile = ExactTile / order.Count;
  for (std::int32_t x = firstPixel; x < firstPixel + pixels; x += tile) {
    const std::int32_t count = std::min(tile, firstPixel + pixels - x);
    Sample samples[ExactTile];
    ExactVertical(*context.Temp, line, std::ptrdiff_t{x} * order.Count, count * order.Count, samples);
    WithRow(*context.Dest, y,
            [&](Sample* row) { StoreSamples(samples, order, context.Pair.Dest, row, x, count); });
  }
}

}

HorizontalPass::HorizontalPass(const ScaleContext& context, const ContributionTable& table)
    : Context(context), Table(table), Fast(context.Pair, table, context.Source->Width) {}

void HorizontalPass::MakeRows(const Sample* const* from, Sample* const* into, int rows) const {
  if (Fast)
    Fast.Run(from, into, rows);
  else
    ExactHorizontal(from, into, rows, Context.Pair, Table);
}

bool HorizontalPass::Run(std::int32_t first, std::int32_t last, PictureData* yields) const {
  PictureData &source = *Context.Source, &temp = *Context.Temp;
  // Rows of a mapped picture aren't in hand together.
  const int together = source.IsMapping || temp.IsMapping ? 1
                       : Fast                             ? FixedPointRows::RowsTogether
                                                          : RowsTogether(Context.Pair.Channels);
  for (std::int32_t y = first; y <= last;) {
    const int rows = last - y + 1 >= together ? together : 1;
    const Sample* from[MostRowsTogether];
    Sample* into[MostRowsTogether];
    bool reached = true;
    for (int r = 0; r < rows; ++r) {
      from[r] = FetchRow(source, y + r);
      if (!from[r]) return false;
      into[r] = FetchRow(temp, y + r);
      reached = reached && into[r];
    }
    if (reached) MakeRows(from, into, rows);
    for (int r = 0; yields && r < rows; ++r) MayYield(*yields);
    y += rows;
  }
  return true;
}

void VerticalPass(const ScaleContext& context, const ContributionTable& table, std::int32_t first,
                  std::int32_t last, PictureData* yields) {
  FloatColumns columns(*context.Temp, context.Pair, table);
  const std::int32_t stripe = columns ? columns.StripePixels() : context.ResultWidth;
  for (std::int32_t x = 0; x < context.ResultWidth; x += stripe) {
    const std::int32_t pixels = std::min(stripe, context.ResultWidth - x);
    if (columns) columns.Begin(x, pixels);
    for (std::int32_t y = first; y <= last; ++y) {
      if (const Sample* samples = columns ? columns.Line(table[y]) : nullptr)
        WithRow(*context.Dest, y, [&](Sample* row) {
          StoreSamples(samples, columns.Order(), context.Pair.Dest, row, x, pixels);
        });
      else
        ExactLine(context, table[y], y, x, pixels);
      if (yields) MayYield(*yields);
    }
  }
}

}
