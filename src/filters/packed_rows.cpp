#include "filters/packed_rows.h"

namespace zor {
namespace {

void Gather(Sample* row, const PlaneList& planes, std::ptrdiff_t width, Sample* packed) {
  ForPlaneCount(planes.Count, [&](auto n) {
    const PlaneRow<n> in(row, planes);
    for (std::ptrdiff_t x = 0; x < width; ++x)
      for (int c = 0; c < n; ++c) packed[x * n + c] = in(c, x);
  });
}

}

PackedRows::PackedRows(const PlaneList& in, const PlaneList& out, std::int32_t width)
    : In(in),
      Out(out),
      Width(width),
      FirstIn(FirstOffset(In)),
      FirstOut(FirstOffset(Out)),
      Whole(FillPixelsAlike(In, Out)) {
  if (!Whole) return;
  for (int c = 0; c < In.Count; ++c) {
    In.Offset[c] = FirstIn + c;
    Out.Offset[c] = FirstOut + c;
  }
}

void PackedRows::Load(Sample* sourceRow, Sample* packed) const {
  if (Whole) return void(std::memcpy(packed, sourceRow + FirstIn, std::size_t(Samples())));
  Gather(sourceRow, In, Width, packed);
}

void PackedRows::LoadDest(Sample* destRow, Sample* packed) const {
  if (Whole) return void(std::memcpy(packed, destRow + FirstOut, std::size_t(Samples())));
  Gather(destRow, Out, Width, packed);
}

const Sample* PackedRows::Packed(Sample* sourceRow, Sample* buffer) const {
  if (Whole) return sourceRow + FirstIn;
  Load(sourceRow, buffer);
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

bool PackedBand::MoveTo(std::int32_t y) {
  bool reached = true;
  for (std::int32_t r = y == 0 ? -Before : y + After; reached && r <= y + After; ++r) {
    Sample *first = (*this)[r], *end = first + Packing.Samples();
    const int pixel = Packing.Count();
    reached = WithRow(Of, std::clamp(r, 0, Of.Height - 1), [&](Sample* row) { Packing.Load(row, first); });
    for (std::ptrdiff_t i = pixel; i <= Margin; i += pixel) {
      std::copy_n(first, pixel, first - i);
      std::copy_n(end - pixel, pixel, end + i - pixel);
    }
  }
  return reached;
}

}
