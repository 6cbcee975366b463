#pragma once
#include <algorithm>
#include <array>

#include "image/groups.h"

namespace zor {

/// Bytes that repeat along a row, as a stretch that is long enough for vectors.
class BytePattern {
 public:
  /// byteAt(i) gives the bytes of one period, of at most 256.
  template <class ByteAt>
  BytePattern(std::ptrdiff_t period, ByteAt&& byteAt) : Length(Most / period * period) {
    for (std::ptrdiff_t i = 0; i < Length; ++i) Bytes[i] = i < period ? Sample(byteAt(i)) : Bytes[i - period];
  }

  /// The bytes of a stretch.
  const Sample* First() const { return Bytes.data(); }
  /// Calls work(first, count, bytes) for one stretch of a row's bytes after the other.
  template <class Work>
  void Along(std::ptrdiff_t rowBytes, Work&& work) const {
    for (std::ptrdiff_t at = 0; at < rowBytes; at += Length)
      work(at, std::min(Length, rowBytes - at), Bytes.data());
  }

 private:
  static constexpr std::ptrdiff_t Most = 1536;
  std::ptrdiff_t Length;
  std::array<Sample, Most> Bytes;
};

/// A row of planes as plain bytes, from the sample that lies first to the one that lies last; there may be
/// bytes between the planes that are none of theirs.
class RowBytes {
 public:
  RowBytes(const PlaneList& planes, std::int32_t width)
      : First(FirstOffset(planes)),
        Count(std::ptrdiff_t{width - 1} * planes.Step + 1 - First +
              *std::max_element(planes.Offset.begin(), planes.Offset.begin() + planes.Count)),
        Planes(planes) {}
  bool IsSample(std::ptrdiff_t i) const {
    const auto end = Planes.Offset.begin() + Planes.Count;
    return std::find(Planes.Offset.begin(), end, First + i % Planes.Step) != end;
  }
  /// 255 where there is a sample, else 0.
  BytePattern Mask() const {
    return {Planes.Step, [this](std::ptrdiff_t i) { return IsSample(i) ? 255 : 0; }};
  }

  std::int32_t First;
  std::ptrdiff_t Count;

 private:
  PlaneList Planes;
};

}
