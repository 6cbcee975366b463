#include "scale/slot_columns.h"

#include <algorithm>

#include "image/stores.h"

namespace zor {
namespace {

constexpr std::ptrdiff_t Alignment = 64;
/// Bytes of the rows that are kept: they stay in the second-level cache, unless a line looks at very many.
constexpr std::size_t CacheRoom = 384 << 10, MostRoom = 3 << 20;
constexpr std::size_t NarrowStripe = 1024, NarrowestStripe = 256;
/// The same where the source may come from afar, which a large one on a caller's block does.
constexpr std::size_t FarRoom = 48 << 20;
constexpr std::int64_t LargeSource = 16 << 20;
/// Bytes of the slots that a few lines look at, a run of units of each: they stay in the first-level cache.
constexpr std::ptrdiff_t RunRoom = 24 << 10;

std::ptrdiff_t RoundedUp(std::ptrdiff_t count, std::ptrdiff_t unit) {
  return (count + unit - 1) / unit * unit;
}

/// Every stripe walks the whole source again, which has to be read for it anew where it isn't in our memory.
std::size_t RoomFor(const PictureData& source) {
  if (source.IsMapping) return MostRoom;
  // A source that was closed meanwhile has no samples.
  return source.Samples && !source.Samples->Memory && source.TotalSize >= LargeSource ? FarRoom : CacheRoom;
}

}

ColumnPlan::ColumnPlan(const ScaleContext& context, const ContributionTable& table,
                       const HorizontalPass* pass)
    : Context(context),
      Table(table),
      Pass(pass),
      Prepared(table),
      Samples(context.Pair, pass ? OrderOfDest(context.Pair) : context.Pair.Temp) {
  // Rows are made so many at a time, and all lines that look at no others should be made then.
  const double rowsALine = double(context.Source->Height) / context.ResultHeight;
  if (!Prepared) return;
  Together = int(std::clamp(Prepared.Loops->Width / 2 / rowsALine, 1.0, double{MostTogether}));
}

std::optional<ColumnPlan> ColumnPlan::Make(const ScaleContext& context, const ContributionTable& table,
                                           const HorizontalPass* pass) {
  std::optional<ColumnPlan> plan(ColumnPlan(context, table, pass));
  if (!plan->Prepared || !plan->ChooseStripe()) plan.reset();
  return plan;
}

bool ColumnPlan::ChooseStripe() {
  const SlotLoops& loops = *Prepared.Loops;
  Span = Prepared.Lines.MostSlots(Together);
  SlotCount = Span + loops.Width / LinesInSlot - 1;
  const auto fits = [&](std::size_t room) {
    return room / (SlotLoops::SampleBytes * std::size_t(SlotCount) + std::size_t(loops.Width));
  };
  std::size_t samples = fits(Pass ? RoomFor(*Context.Source) : CacheRoom);
  if (samples < NarrowStripe) samples = std::min(NarrowStripe, fits(MostRoom));
  if (samples < NarrowestStripe) return false;
  const std::int32_t unit = Pass ? Pass->ColumnUnit() : 1;
  // A row that fits is one stripe, its last group of columns included.
  const std::int64_t units = (std::int64_t{Context.ResultWidth} + unit - 1) / unit;
  const auto unitsThatFit = std::max<std::int64_t>(std::int64_t(samples) / Samples.Order.Count / unit, 1);
  Stripe = std::int32_t(std::min(units, unitsThatFit)) * unit;
  Room = RoundedUp(std::ptrdiff_t{Stripe} * Samples.Order.Count, Alignment);
  return true;
}

SlotColumns::SlotColumns(const ColumnPlan& plan) : Plan(plan) {
  // One allocation, its rows aligned like vectors.
  const auto room = std::size_t(plan.Room), slots = std::size_t(plan.SlotCount);
  const std::size_t ringBytes = slots * room * SlotLoops::SampleBytes,
                    rowBytes = room * std::size_t(plan.Prepared.Loops->Width),
                    scratchBytes = room * std::size_t(plan.Together);
  Memory = NewBuffer(Alignment + ringBytes + rowBytes + scratchBytes + 2 * slots * sizeof(*Slots));
  if (plan.Pass) PassScratch = NewBuffer(plan.Pass->ScratchBytes() + 1);
  if (plan.Pass && !PassScratch) Memory.reset();
  if (!Memory) return;
  const auto address = std::ptrdiff_t(reinterpret_cast<Word>(Memory.get()) % Word(Alignment));
  Sample* aligned = Memory.get() + (Alignment - address) % Alignment;
  Ring = aligned;
  RowMemory = aligned + ringBytes;
  ScratchMemory = RowMemory + rowBytes;
  Slots = reinterpret_cast<const Sample**>(ScratchMemory + scratchBytes);
  for (std::int32_t s = 0; s < 2 * plan.SlotCount; ++s)
    Slots[s] = Ring + s % plan.SlotCount * plan.Room * SlotLoops::SampleBytes;
}

void SlotColumns::Begin(Columns columns) {
  Of = columns;
  NextSlot = 0;
}

bool SlotColumns::MakeRows(std::int32_t first, int count) {
  if (Plan.Pass) {
    Sample* into[SlotLoops::MostWidth];
    for (int r = 0; r < count; ++r) into[r] = RowMemory + r * Plan.Room;
    return Plan.Pass->MakeRows(first, count, Plan.Samples.Order, Of, into, PassScratch.get());
  }
  const std::ptrdiff_t bytes = Plan.Samples.Order.Count;
  for (int r = 0; r < count; ++r) {
    Sample* into = RowMemory + r * Plan.Room;
    const bool reached = WithRow(*Plan.Context.Temp, first + r, [&](const Sample* row) {
      std::copy_n(row + Of.First * bytes, Of.Count() * bytes, into);
    });
    if (!reached) std::fill_n(into, Plan.Room, Sample(0));
  }
  return true;
}

bool SlotColumns::Need(std::int32_t y, int count) {
  NextSlot = std::max(NextSlot, Plan.Prepared.Lines[y].Least);
  std::int32_t end = 0;
  for (std::int32_t i = y; i < y + count; ++i)
    if (const SlotLine& line = Plan.Prepared.Lines[i]; line.Count > 0)
      end = std::max(end, line.First + line.Count);
  const std::ptrdiff_t units =
      RoundedUp(std::ptrdiff_t{Of.Count()} * Plan.Samples.Order.Count, Plan.Prepared.Loops->Width) /
      Plan.Prepared.Loops->Width;
  while (NextSlot < end) {
    const int rows =
        std::min(Plan.Prepared.Loops->Width, Plan.Context.Source->Height - LinesInSlot * NextSlot);
    if (!MakeRows(LinesInSlot * NextSlot, rows)) return false;
    for (int r = 0; r < rows; r += LinesInSlot, ++NextSlot) {
      const Sample* even = RowMemory + r * Plan.Room;
      // Nobody looks at what isn't there.
      const Sample* odd = r + 1 < rows ? even + Plan.Room : even;
      Plan.Prepared.Loops->Widen(even, odd, units,
                                 Ring + NextSlot % Plan.SlotCount * Plan.Room * SlotLoops::SampleBytes);
    }
  }
  return true;
}

bool SlotColumns::Make(std::int32_t y, int count, Sample* const* into) {
  if (!Need(y, count)) return false;
  const std::ptrdiff_t width = Plan.Prepared.Loops->Width,
                       samples = std::ptrdiff_t{Of.Count()} * Plan.Samples.Order.Count;
  const std::ptrdiff_t units = (samples + width - 1) / width;
  const std::ptrdiff_t unitBytes = Plan.Span * width * SlotLoops::SampleBytes;
  const auto run = std::clamp<std::ptrdiff_t>(RunRoom / unitBytes / 2 * 2, 2, SlotLoops::MostUnits);
  for (std::ptrdiff_t unit = 0; unit < units; unit += run)
    for (int i = 0; i < count; ++i) {
      const SlotLine& line = Plan.Prepared.Lines[y + i];
      Plan.Prepared.Loops->Sum({&line, &Plan.Table[y + i], Slots + line.First % Plan.SlotCount, unit,
                                std::min(run, units - unit), samples, into[i]});
    }
  return true;
}

}
