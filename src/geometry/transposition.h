#pragma once
#include "image/groups.h"

namespace zor {

/// A rectangle of pixels whose rows become columns: pixel x of row y goes to pixel y of row x. The strides
/// are bytes from a row to the next one and may be negative.
struct Transposition {
  Sample* From;
  std::ptrdiff_t FromStride;
  Sample* Into;
  std::ptrdiff_t IntoStride;
  std::ptrdiff_t Width, Height;
};

/// Transposes a rectangle in an order that is easy on the caches. Its sides have no samples in common, and
/// neither have the rows that are written.
void Transpose(const Transposition& pixels, const PlaneList& in, const PlaneList& out);

}
