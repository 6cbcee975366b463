#include "filters/packed_rows.h"

namespace zor {
namespace {

std::int32_t FirstOffset(const PlaneList& planes) {
  return *std::min_element(planes.Offset.begin(), planes.Offset.begin() + planes.Count);
}

}

PackedRows::PackedRows(const FilterCall& call)
    : In(call.In),
      Out(call.Out),
      Width(call.Source.Width),
      FirstIn(FirstOffset(In)),
      FirstOut(FirstOffset(Out)),
      Whole(In.Step == In.Count && Out.Step == Out.Count) {
  for (int c = 0; c < In.Count; ++c) Whole = Whole && In.Offset[c] - FirstIn == Out.Offset[c] - FirstOut;
}

const Sample* PackedRows::Packed(Sample* sourceRow, Sample* buffer) const {
  if (Whole) return sourceRow + FirstIn;
  ForPlaneCount(In.Count, [&](auto n) {
    const PlaneRow<n> in(sourceRow, In);
    const std::ptrdiff_t width = Width;
    for (std::ptrdiff_t x = 0; x < width; ++x)
      for (int c = 0; c < n; ++c) buffer[x * n + c] = in(c, x);
  });
  return buffer;
}

void PackedRows::Store(const Sample* packed, Sample* destRow) const {
  if (Whole) return void(std::memcpy(destRow + FirstOut, packed, std::size_t(Samples())));
  ForPlaneCount(Out.Count, [&](auto n) {
    const PlaneRow<n> out(destRow, Out);
    const std::ptrdiff_t width = Width;
    for (std::ptrdiff_t x = 0; x < width; ++x)
      for (int c = 0; c < n; ++c) out(c, x) = packed[x * n + c];
  });
}

}
