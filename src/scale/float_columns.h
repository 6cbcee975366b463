#pragma once
#include <optional>

#include "image/walk.h"
#include "scale/horizontal_pass.h"
#include "scale/line_sums.h"

namespace zor {

/// How the second pass goes over a table in single precision: a stripe of columns at a time, whose rows
/// between the passes are kept as floats while lines look at them. The same for all threads.
struct ColumnPlan {
  /// None where a line looks at so many rows that stripes become too narrow.
  static std::optional<ColumnPlan> Make(const ScaleContext& context, const ContributionTable& table,
                                        const HorizontalPass* pass);

  /// The rows that some lines look at, first to last; empty where they look at none.
  struct RowRange {
    std::int32_t First, Last;
  };
  RowRange RowsOf(std::int32_t y, int count) const;

  const ScaleContext& Context;
  const ContributionTable& Table;
  const HorizontalPass* Pass;
  PixelScatter Samples;
  /// How many lines are made best together, and the most rows that they look at.
  int Together = 1;
  std::int32_t Reach = 1;
  /// Rows that are there at a time, pixels of a stripe at most, and floats of a row's room.
  std::int32_t Slots = 1, Stripe = 0;
  std::ptrdiff_t Room = 0;

 private:
  ColumnPlan(const ScaleContext& context, const ContributionTable& table, const HorizontalPass* pass);
  bool ChooseStripe();
};

/// The rows of a plan's stripes, and the lines that are sums of a few of them.
class FloatColumns {
 public:
  explicit FloatColumns(const ColumnPlan& plan);
  /// False without memory.
  explicit operator bool() const { return Memory != nullptr; }
  /// Goes on with a stripe.
  void Begin(Columns columns);
  /// Makes the samples of `count` lines from y on, into[i] being where those of line y + i go; lines come in
  /// rising order. False when a row of the source can't be reached.
  bool Make(std::int32_t y, int count, Sample* const* into);
  /// Room for a line of the stripe, one of the plan's Together.
  Sample* Scratch(int line) const { return ScratchMemory + line * Plan.Room; }

 private:
  bool Need(ColumnPlan::RowRange range);
  bool Fill(std::int32_t row, int count);
  void MakeTogether(std::int32_t y, int count, Sample* const* into, LineSums& sums);
  float* RowAt(std::int32_t row) const { return Rows + row % Plan.Slots * Plan.Room; }

  const ColumnPlan& Plan;
  Columns Of{};
  /// The first row that isn't there yet.
  std::int32_t NextRow = 0;
  Buffer Memory, PassScratch;
  /// A ring of rows, and those that lines look at.
  float* Rows = nullptr;
  const float** Looked = nullptr;
  float* Shares = nullptr;
  Sample* ScratchMemory = nullptr;
};

}
