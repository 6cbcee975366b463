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

/// Transposes a rectangle without common samples between its sides, in an order that is easy on the caches.
void Transpose(const Transposition& pixels, const PlaneList& in, const PlaneList& out);

}
