#pragma once
#include <optional>

#include "image/walk.h"
#include "scale/horizontal_pass.h"
#include "scale/slot_loops.h"

namespace zor {

/// How the second pass goes over a table: a stripe of columns at a time, whose rows between the passes are
/// kept in slots while lines look at them. The same for all threads.
struct ColumnPlan {
  /// None where a line looks at so many rows that stripes become too narrow, and without memory.
  static std::optional<ColumnPlan> Make(const ScaleContext& context, const ContributionTable& table,
                                        const HorizontalPass* pass);

  const ScaleContext& Context;
  const ContributionTable& Table;
  const HorizontalPass* Pass;
  PreparedLines Prepared;
  PixelScatter Samples;
  /// How many lines are made best together, and the slots that they look at.
  int Together = 1;
  std::int32_t Span = 1;
  static constexpr int MostTogether = 8;
  /// Slots that are there at a time, pixels of a stripe at most, and samples of a row's room.
  std::int32_t SlotCount = 1, Stripe = 0;
  std::ptrdiff_t Room = 0;

 private:
  ColumnPlan(const ScaleContext& context, const ContributionTable& table, const HorizontalPass* pass);
  bool ChooseStripe();
};

/// The rows of a plan's stripes, and the lines that are sums of a few of them.
class SlotColumns {
 public:
  explicit SlotColumns(const ColumnPlan& plan);
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
  bool Need(std::int32_t y, int count);
  bool MakeRows(std::int32_t first, int count);

  const ColumnPlan& Plan;
  Columns Of{};
  /// The first slot that isn't there yet.
  std::int32_t NextSlot = 0;
  Buffer Memory, PassScratch;
  /// A ring of slots, twice over, and the rows that they are made of.
  const Sample** Slots = nullptr;
  Sample *Ring = nullptr, *RowMemory = nullptr, *ScratchMemory = nullptr;
};

}
