#pragma once
#include "scale/slot_loops.h"

namespace zor {

/// The first pass for any processor.
///
/// Some rows are turned on their side: a column of all of them lies in a run of numbers, and a line of the
/// pass is a sum of a few columns, as one of the second pass is a sum of rows. Columns are turned when a line
/// looks at them, and kept while others do.
class TurnedRows {
 public:
  /// None.
  TurnedRows() = default;
  TurnedRows(const ScalePair& pair, const ContributionTable& table, std::int32_t sourceWidth);
  /// False where there is no such form: for luma, where lines look at very many columns, and without memory.
  explicit operator bool() const { return bool(Prepared); }
  /// How many rows are made together.
  int RowsTogether() const { return Prepared.Loops->Width; }
  /// What a run needs to work in.
  std::size_t ScratchBytes() const { return Scratch; }
  /// Makes some columns of up to RowsTogether rows, out of as many rows of the source; into[r] is where the
  /// first pixel goes.
  void Run(const Sample* const* from, Sample* const* into, int rows, const PixelOrder& order, Columns columns,
           Sample* scratch) const;

 private:
  bool Fits();

  const ScalePair* Pair = nullptr;
  const ContributionTable* Table = nullptr;
  PreparedLines Prepared;
  /// From the plane that lies first: bytes of a row.
  std::int64_t RowBytes = 0;
  std::int32_t Lead = 0;
  /// Groups of columns that are kept, and bytes of scratch.
  std::int32_t Kept = 0;
  std::size_t Scratch = 0;
};

}
