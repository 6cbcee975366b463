#pragma once
#include "image/walk.h"
#include "scale/line_sums.h"
#include "scale/passes.h"

namespace zor {

/// The second pass in single precision, over a stripe of columns. The rows between the passes are kept as
/// floats while lines look at them; a line is then a sum of a few rows, many samples at a time.
class FloatColumns {
 public:
  FloatColumns(const ScaleContext& context, const ContributionTable& table, const HorizontalPass* pass);
  /// False without memory, and where a line looks at so many rows that stripes become too narrow.
  explicit operator bool() const { return Memory != nullptr; }
  const PixelScatter& Scatter() const { return Samples; }
  /// Pixels of a stripe at most.
  std::int32_t StripePixels() const { return Stripe; }
  /// How many lines are made best together.
  int LinesTogether() const { return Together; }
  /// Goes on with a stripe.
  void Begin(Columns columns);
  /// Makes the samples of `count` lines from y on, into[i] being where those of line y + i go; lines come in
  /// rising order. False when a row of the source can't be reached.
  bool Make(std::int32_t y, int count, Sample* const* into);
  /// Room for a line of the stripe, one of LinesTogether.
  Sample* Scratch(int line) const { return ScratchMemory + line * Rows.Room; }

 private:
  /// The rows that some lines look at, first to last; empty where they look at none.
  struct RowRange {
    std::int32_t First, Last;
  };
  RowRange RowsOf(std::int32_t y, int count) const;
  bool Need(RowRange range);
  bool Fill(std::int32_t row, int count);
  void MakeTogether(std::int32_t y, int count, Sample* const* into, LineSums& sums);
  void MakePlain(const Contribution& line, Sample* into) const;

  const ScaleContext& Context;
  const ContributionTable& Table;
  const HorizontalPass* Pass;
  PixelScatter Samples;
  int Together = 1;
  std::int32_t Stripe = 0;
  Columns Of{};
  /// The first row that isn't there yet.
  std::int32_t NextRow = 0;
  RowRing Rows{};
  Buffer Memory;
  float* Shares = nullptr;
  Sample* ScratchMemory = nullptr;
};

}
