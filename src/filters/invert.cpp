#include "filters/byte_pattern.h"
#include "filters/filters.h"
#include "image/clip.h"
#include "image/groups.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

void Flip(Sample* bytes, const Sample* bits, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) bytes[i] = Sample(bytes[i] ^ bits[i]);
}
/// From the start of a cache line on, so that no vector lies in two.
void FlipAll(Sample* bytes, std::ptrdiff_t count) {
  constexpr Word line = 64;
  const std::ptrdiff_t before = std::min(std::ptrdiff_t(-reinterpret_cast<Word>(bytes) % line), count);
  for (std::ptrdiff_t i = 0; i < before; ++i) bytes[i] = Sample(~bytes[i]);
  for (std::ptrdiff_t i = before; i < count; ++i) bytes[i] = Sample(~bytes[i]);
}

}

void Invert(PictureZOR* self, Integer x, Integer y, Integer w, Integer h) {
  PictureData& picture = DataOf(self);
  const Rectangle part = FilterRect(picture, {x, y, w, h});
  if (part.Empty() || !Usable(picture)) return;
  MayYield(picture);

  const PlaneList planes = PlanesOf(GroupOf(picture), picture, part.X);
  if (planes.Count == 0) return;
  const RowBytes bytes(planes, part.Width);
  const bool all = FillPixels(planes);
  // 255 - v is v with all bits flipped; the bytes between the planes have none flipped.
  const BytePattern bits = bytes.Mask();
  Walk(Yielding(Into(picture, part.Y))).Rows(part.Height, [&](std::int32_t, Sample* row) {
    Sample* const first = row + bytes.First;
    if (all) return OnBestTarget<FlipAll>(first, bytes.Count);
    bits.Along(bytes.Count, [&](std::ptrdiff_t at, std::ptrdiff_t count, const Sample* flipped) {
      OnBestTarget<Flip>(first + at, flipped, count);
    });
  });
}

void Invert(PictureZOR* self) {
  const PictureData& picture = DataOf(self);
  Invert(self, 0, 0, picture.Width, picture.Height);
}

}
