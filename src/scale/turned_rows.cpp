#include "scale/turned_rows.h"

#include <algorithm>

namespace zor {
namespace {

/// Columns that are kept have to stay in a cache, or it isn't worth it.
constexpr std::size_t MostScratch = 3 << 20;

}

TurnedRows::TurnedRows(const ScalePair& pair, const ContributionTable& table, std::int32_t sourceWidth)
    : Pair(&pair), Table(&table) {
  const auto [least, most] =
      std::minmax_element(Pair->Source.Offset.begin(), Pair->Source.Offset.begin() + Pair->Source.Count);
  Lead = *least;
  RowBytes = (std::int64_t{sourceWidth} - 1) * Pair->Source.Step + (*most - *least) + 1;
  if (Pair->Luma || Pair->Source.Step > MostStep || *most - *least >= Pair->Source.Step) return;
  Prepared = PreparedLines(table);
  if (Prepared && !Fits()) Prepared = PreparedLines();
}

bool TurnedRows::Fits() {
  constexpr std::int32_t groupSlots = GroupPixels / LinesInSlot;
  Kept = (Prepared.Lines.MostSlots(1) + groupSlots - 1) / groupSlots + 1;
  const auto slotBytes = std::size_t(Pair->Channels * Prepared.Loops->Width * SlotLoops::SampleBytes);
  constexpr std::size_t alignment = 64;
  Scratch = std::size_t(Kept) * std::size_t(groupSlots) * (slotBytes + 2 * sizeof(Sample*)) + alignment;
  return Scratch <= MostScratch;
}

void TurnedRows::Run(const Sample* const* from, Sample* const* into, int rows, const PixelOrder& order,
                     Columns columns, Sample* scratch) const {
  const Sample* read[SlotLoops::MostWidth];
  for (int r = 0; r < rows; ++r) read[r] = from[r] + Lead;
  RowsToMake work{Prepared.Lines,
                  *Table,
                  read,
                  RowBytes,
                  Pair->Source.Step,
                  Pair->Channels,
                  Pair->Source.Offset,
                  columns,
                  order,
                  into,
                  rows,
                  Kept,
                  scratch};
  for (int c = 0; c < Pair->Channels; ++c) work.Offset[c] -= Lead;
  Prepared.Loops->MakeRows(work);
}

}
