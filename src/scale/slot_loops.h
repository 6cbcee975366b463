#pragma once
#include "image/arithmetic.h"
#include "image/byte_blocks.h"
#include "image/targets.h"
#include "scale/exact_passes.h"
#include "scale/slot_lines.h"

namespace zor {

// The sums of both passes. Rows between the passes, and columns of some source rows that are turned on their
// side, stand in slots: two neighbours side by side as numbers of 16 bits, which one instruction multiplies
// by their two digits and adds up. A unit of a slot, which has as many samples of a source line as a vector
// has bytes, takes four vectors; how its numbers lie is the processor's affair.

/// Some units of a line.
struct SlotSums {
  const SlotLine* Line;
  const Contribution* Of;
  /// The slots, from the line's first one on.
  const Sample* const* Slots;
  std::ptrdiff_t FirstUnit, UnitCount;
  /// How many samples there are from the first unit of the slots on, and where the first of them goes.
  std::ptrdiff_t Samples;
  Sample* Into;
};

/// Columns of a few rows that are made together by the first pass.
struct RowsToMake {
  const SlotTable& Lines;
  const ContributionTable& Table;
  /// Rows of the source, from the plane on that lies first, how many bytes each has, and of a pixel where the
  /// channels are.
  const Sample* const* From;
  std::int64_t RowBytes;
  int Step, Channels;
  std::array<std::int32_t, 5> Offset;
  /// What is made, and where the first pixel of each row goes.
  Columns Of;
  const PixelOrder& Order;
  Sample* const* Into;
  int Rows;
  /// Groups of columns that are kept, and memory for them.
  std::int32_t Kept;
  Sample* Scratch;
};

/// The loops for a processor.
struct SlotLoops {
  /// Samples of a unit, and rows that are made together.
  int Width;
  /// Makes units of a slot out of one row or two, which have room for whole units.
  void (*Widen)(const Sample* even, const Sample* odd, std::ptrdiff_t units, Sample* slot);
  /// Makes at most MostUnits units.
  void (*Sum)(const SlotSums& sums);
  void (*MakeRows)(const RowsToMake& rows);

  static constexpr int MostUnits = 8, MostWidth = 64;
  /// Bytes of a slot for each sample of a source line.
  static constexpr int SampleBytes = 4;
};

/// Columns that are turned together.
inline constexpr int GroupPixels = 16;
/// The most bytes of a pixel that are turned.
inline constexpr int MostStep = 8;

extern const SlotLoops PlainLoops, AVX2Loops, AVX512Loops, VNNILoops;
const SlotLoops& LoopsFor(Target target);

/// The lines of a table, and the loops that make them on this processor.
struct PreparedLines {
  PreparedLines() = default;
  explicit PreparedLines(const ContributionTable& table);
  explicit operator bool() const { return bool(Lines); }

  const SlotLoops* Loops = nullptr;
  SlotTable Lines;
};

}
