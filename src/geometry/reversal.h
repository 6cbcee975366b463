#pragma once
#include "image/groups.h"

namespace zor {

/// Pixels from right to left, from one layout to another or within one.
class Reversal {
 public:
  /// `inOrder` goes pixel by pixel from the destination's left, for pictures that share samples.
  Reversal(const PlaneList& in, const PlaneList& out, bool inOrder = false);

  /// Exchanges count pixels from a on with those from b on, the last of them first; of one layout. The two
  /// don't overlap. What lies toNext bytes further is wanted next.
  void Swap(Sample* a, Sample* b, std::ptrdiff_t count, std::ptrdiff_t toNext = 0) const;
  /// The pixels of a row to those of another.
  void Copy(Sample* from, Sample* into, std::ptrdiff_t count) const;

 private:
  PlaneList In, Out;
  /// Bytes from a row's start to its first pixel.
  std::ptrdiff_t Edge;
  bool InBlocks;
  /// Where the planes are in a block that starts with a pixel, and in one that ends with one.
  Sample FromLow[16], FromHigh[16];
};

}
