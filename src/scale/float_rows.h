#pragma once
#include "image/walk.h"
#include "scale/exact_passes.h"
#include "scale/quotients.h"

namespace zor {

/// The first pass in single precision, for any processor.
///
/// Some rows are turned on their side: a column of all of them lies in a run of floats, and a line of the
/// pass is a sum of a few columns, as one of the second pass is a sum of rows. Columns are turned when a line
/// looks at them, and kept while others do.
class FloatRows {
 public:
  /// How many rows are made together.
  static constexpr int RowsTogether = 32;

  /// None.
  FloatRows() = default;
  FloatRows(const ScalePair& pair, const ContributionTable& table, std::int32_t sourceWidth);
  /// False where there is no such form: for luma, where lines look at very many columns, and without memory.
  explicit operator bool() const { return Lines != nullptr; }
  /// What a run needs to work in.
  std::size_t ScratchBytes() const { return Scratch; }
  /// Makes some columns of up to RowsTogether rows, out of as many rows of the source. into[r] is where the
  /// first pixel goes; as floats, 16 of them more have to fit.
  void Run(const Sample* const* from, Sample* const* into, int rows, const PixelOrder& order, Columns columns,
           Sample* scratch) const;
  void Run(const Sample* const* from, float* const* into, int rows, const PixelOrder& order, Columns columns,
           Sample* scratch) const;

 private:
  template <class Value>
  class Runner;
  struct Line;

  bool Build();

  const ScalePair* Pair = nullptr;
  const ContributionTable* Table = nullptr;
  /// From the plane that lies first: bytes of a row.
  std::int64_t RowBytes = 0;
  std::int32_t Lead = 0;
  /// Groups of columns that are kept, and bytes of scratch.
  std::int32_t Kept = 0;
  std::size_t Scratch = 0;
  Buffer LineMemory, ShareMemory;
  Line* Lines = nullptr;
};

}
