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
  PackedRows(const PlaneList& in, const PlaneList& out, std::int32_t width);
  explicit PackedRows(const FilterCall& call) : PackedRows(call.In, call.Out, call.Source.Width) {}

  int Count() const { return In.Count; }
  /// The planes of the source in the order of packed rows.
  const PlaneList& SourcePlanes() const { return In; }
  /// Samples of a packed row.
  std::ptrdiff_t Samples() const { return std::ptrdiff_t{Width} * In.Count; }

  /// The samples of a source row, copied into buffer where they don't lie packed.
  const Sample* Packed(Sample* sourceRow, Sample* buffer) const;
  /// Copies a source row into a packed one.
  void Load(Sample* sourceRow, Sample* packed) const;
  /// Copies a row of the destination into a packed one.
  void LoadDest(Sample* destRow, Sample* packed) const;
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

/// Packed copies of the source's rows around y, the edge rows repeated beyond the edges, and the first and
/// last pixel of each repeated to both sides. Each row is fetched once.
class PackedBand {
 public:
  /// Holds rows y - before .. y + after, with `margin` pixels to both sides.
  PackedBand(PictureData& source, const PackedRows& packing, std::int32_t before, std::int32_t after,
             std::int32_t margin)
      : Of(source),
        Packing(packing),
        Before(before),
        After(after),
        Margin(std::ptrdiff_t{margin} * packing.Count()),
        RowBytes(std::size_t(packing.Samples()) + 2 * std::size_t(Margin)),
        Memory(NewBuffer(std::int64_t{before} + after + 1, std::int64_t(RowBytes))) {}
  explicit operator bool() const { return Memory != nullptr; }

  /// Makes the rows around y available; y is 0 first, then one more each time. False when a row can't be
  /// reached.
  bool MoveTo(std::int32_t y);
  /// The first sample of row y, counted in the picture; any of those around.
  Sample* operator[](std::int32_t y) const {
    const std::size_t rows = std::size_t(Before) + std::size_t(After) + 1;
    return Memory.get() + std::size_t(y + Before) % rows * RowBytes + Margin;
  }

 private:
  PictureData& Of;
  const PackedRows& Packing;
  std::int32_t Before, After;
  std::ptrdiff_t Margin;
  std::size_t RowBytes;
  Buffer Memory;
};

}
