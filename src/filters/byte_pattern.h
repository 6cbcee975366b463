#pragma once
#include <algorithm>
#include <array>

#include "image/picture_data.h"

namespace zor {

/// Bytes that repeat along a row, as a stretch that is long enough for vectors.
class BytePattern {
 public:
  /// byteAt(i) gives the bytes of one period, of at most 256.
  template <class ByteAt>
  BytePattern(std::ptrdiff_t period, ByteAt&& byteAt) : Length(Most / period * period) {
    for (std::ptrdiff_t i = 0; i < Length; ++i) Bytes[i] = i < period ? Sample(byteAt(i)) : Bytes[i - period];
  }

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

}
