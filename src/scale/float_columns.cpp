#include "scale/float_columns.h"

#include <algorithm>
#include <limits>

#include "image/targets.h"

namespace zor {
namespace {

constexpr int Block = LineSums::Block;
/// Bytes of the rows that are kept: they stay in the second-level cache, unless a line looks at very many.
constexpr std::size_t CacheRoom = 384 << 10, MostRoom = 3 << 20;
constexpr std::size_t NarrowStripe = 16 * Block, NarrowestStripe = 4 * Block;

void Widen(const Sample* from, std::ptrdiff_t count, float* into) {
  for (std::ptrdiff_t i = 0; i < count; ++i) into[i] = float(from[i]);
}

std::ptrdiff_t WholeBlocks(std::ptrdiff_t count) { return (count + Block - 1) / Block * Block; }

/// Lines that look at much the same rows are worth making together; the share of a line in the others' rows
/// is 0, which is work for nothing.
int WorthTogether(const ScaleContext& context, std::int32_t longest) {
  if (context.ResultHeight >= 3 * std::int64_t{context.Source->Height}) return 4;
  const double rowsALine = double(context.Source->Height) / context.ResultHeight;
  return longest >= 5.0 * rowsALine ? 2 : 1;
}

}

ColumnPlan::ColumnPlan(const ScaleContext& context, const ContributionTable& table,
                       const HorizontalPass* pass)
    : Context(context),
      Table(table),
      Pass(pass),
      Samples(context.Pair, pass ? OrderOfDest(context.Pair) : context.Pair.Temp) {
  std::int32_t longest = 1;
  for (std::int32_t y = 0; y < table.Count(); ++y) longest = std::max(longest, table[y].Count);
  Together = WorthTogether(context, longest);
  for (std::int32_t y = 0; y < table.Count(); ++y) {
    const RowRange range = RowsOf(y, std::min(Together, table.Count() - y));
    Reach = std::max(Reach, range.Last - range.First + 1);
  }
  Slots = Reach + (pass ? pass->RowsTogether() : 1) - 1;
}

std::optional<ColumnPlan> ColumnPlan::Make(const ScaleContext& context, const ContributionTable& table,
                                           const HorizontalPass* pass) {
  ColumnPlan plan(context, table, pass);
  if (!plan.ChooseStripe()) return {};
  return plan;
}

bool ColumnPlan::ChooseStripe() {
  const auto fits = [&](std::size_t room) { return room / sizeof(float) / std::size_t(Slots); };
  // Every stripe walks the whole source again, which a mapped one has to be read for.
  std::size_t samples = fits(Pass && Context.Source->IsMapping ? MostRoom : CacheRoom);
  if (samples < NarrowStripe) samples = std::min(NarrowStripe, fits(MostRoom));
  if (samples < NarrowestStripe) return false;
  const std::int32_t unit = Pass ? Pass->ColumnUnit() : 1;
  // A row that fits is one stripe, its last group of columns included.
  const std::int64_t units = (std::int64_t{Context.ResultWidth} + unit - 1) / unit;
  const auto unitsThatFit = std::max<std::int64_t>(std::int64_t(samples) / Samples.Order.Count / unit, 1);
  Stripe = std::int32_t(std::min(units, unitsThatFit)) * unit;
  Room = WholeBlocks(std::ptrdiff_t{Stripe} * Samples.Order.Count) + Block;
  return true;
}

ColumnPlan::RowRange ColumnPlan::RowsOf(std::int32_t y, int count) const {
  RowRange range{std::numeric_limits<std::int32_t>::max(), -1};
  for (std::int32_t i = y; i < y + count; ++i) {
    const Contribution& line = Table[i];
    if (line.Count == 0) continue;
    range.First = std::min(range.First, line.First);
    range.Last = std::max(range.Last, line.Last());
  }
  return range.Last < 0 ? RowRange{0, -1} : range;
}

FloatColumns::FloatColumns(const ColumnPlan& plan) : Plan(plan) {
  // One allocation, its rows aligned like vectors.
  const auto room = std::size_t(plan.Room), reach = std::size_t(plan.Reach);
  const std::size_t rowBytes = room * sizeof(float) * std::size_t(plan.Slots);
  const std::size_t lookedBytes = reach * sizeof(float*), shareBytes = reach * LineSums::Most * sizeof(float);
  Memory = NewBuffer(Block + rowBytes + lookedBytes + shareBytes + room * std::size_t(plan.Together));
  if (plan.Pass) PassScratch = NewBuffer(plan.Pass->ScratchBytes() + 1);
  if (plan.Pass && !PassScratch) Memory.reset();
  if (!Memory) return;
  const auto address = reinterpret_cast<Word>(Memory.get());
  Sample* aligned = Memory.get() + (Block - address % Block) % Block;
  Rows = reinterpret_cast<float*>(aligned);
  Looked = reinterpret_cast<const float**>(aligned + rowBytes);
  Shares = reinterpret_cast<float*>(aligned + rowBytes + lookedBytes);
  ScratchMemory = aligned + rowBytes + lookedBytes + shareBytes;
}

void FloatColumns::Begin(Columns columns) {
  Of = columns;
  NextRow = 0;
}

bool FloatColumns::Need(ColumnPlan::RowRange range) {
  NextRow = std::max(NextRow, range.First);
  const int together = Plan.Pass ? Plan.Pass->RowsTogether() : 1;
  while (NextRow <= range.Last) {
    const int count = std::min(together, Plan.Context.Source->Height - NextRow);
    if (!Fill(NextRow, count)) return false;
    NextRow += count;
  }
  return true;
}

bool FloatColumns::Fill(std::int32_t row, int count) {
  if (Plan.Pass) {
    float* into[FloatRows::RowsTogether];
    for (int r = 0; r < count; ++r) into[r] = RowAt(row + r);
    return Plan.Pass->MakeFloats(row, count, Plan.Samples.Order, Of, into, PassScratch.get());
  }
  const std::ptrdiff_t bytes = Plan.Samples.Order.Count;
  const bool reached = WithRow(*Plan.Context.Temp, row, [&](const Sample* samples) {
    OnBestTarget<Widen>(samples + Of.First * bytes, Of.Count() * bytes, RowAt(row));
  });
  if (!reached) std::fill_n(RowAt(row), Plan.Room, 0.0F);
  return true;
}

bool FloatColumns::Make(std::int32_t y, int count, Sample* const* into) {
  if (!Need(Plan.RowsOf(y, count))) return false;
  LineSums sums{};
  sums.Rows = Looked;
  sums.Shares = Shares;
  sums.Samples = std::ptrdiff_t{Of.Count()} * Plan.Samples.Order.Count;
  if (count == Plan.Together)
    MakeTogether(y, count, into, sums);
  else
    for (int i = 0; i < count; ++i) MakeTogether(y + i, 1, into + i, sums);
  return true;
}

void FloatColumns::MakeTogether(std::int32_t y, int count, Sample* const* into, LineSums& sums) {
  const ColumnPlan::RowRange range = Plan.RowsOf(y, count);
  sums.FirstRow = range.First;
  sums.RowCount = range.Last - range.First + 1;
  sums.LineCount = count;
  for (std::int32_t row = range.First; row <= range.Last; ++row) Looked[row - range.First] = RowAt(row);
  std::fill_n(Shares, std::ptrdiff_t{sums.RowCount} * count, 0.0F);
  for (int i = 0; i < count; ++i) {
    const Contribution& line = Plan.Table[y + i];
    sums.Of[i] = &line;
    sums.Into[i] = into[i];
    if (MakeFloat(line, Shares + i, range.First, count, sums.Lines[i])) continue;
    // A line that is always in doubt is made by the plain form, and the others each by itself.
    if (count == 1) return SumPlainLine(sums, 0);
    for (int k = 0; k < count; ++k) MakeTogether(y + k, 1, into + k, sums);
    return;
  }
  SumLines(sums);
}

}
