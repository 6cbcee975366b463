#pragma once
#include <algorithm>

#include "image/filter.h"
#include "image/walk.h"

namespace zor {

/// Rows for work that treats the planes of a call alike: their samples side by side, `Count` a pixel, the
/// same planes in the same order for both pictures. Where the planes fill the pixels of both and lie in the
/// same order, as in most calls, that is how the rows lie anyway, and nothing is copied.
class PackedRows {
 public:
  explicit PackedRows(const FilterCall& call);

  int Count() const { return In.Count; }
  /// Samples of a packed row.
  std::ptrdiff_t Samples() const { return std::ptrdiff_t{Width} * In.Count; }

  /// The samples of a source row, copied into buffer where they don't lie packed.
  const Sample* Packed(Sample* sourceRow, Sample* buffer) const;
  /// Brings a packed row into a row of the destination.
  void Store(const Sample* packed, Sample* destRow) const;
  /// Calls work(out), which writes a packed row: right into the row of the destination, or by way of buffer.
  template <class Work>
  void Write(Sample* destRow, Sample* buffer, Work&& work) const {
    if (Whole) return work(destRow + FirstOut);
    work(buffer);
    Store(buffer, destRow);
  }

 private:
  PlaneList In, Out;
  std::int32_t Width, FirstIn, FirstOut;
  bool Whole;
};

}
