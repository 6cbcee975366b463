#include <algorithm>
#include <cstdlib>

#include "composition/composition.h"
#include "composition/in_layout.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

constexpr FamilyPair ComparePairs[] = {
    Pair<Family::Gray, Family::Gray, Same<1>>,
    Pair<Family::RGB, Family::RGB, Same<3>>,
    Pair<Family::CMYK, Family::CMYK, Same<4>>,
};

/// Adds to the total in pieces whose sum fits 32 bits, which vector code can add up fast.
void AddDifferences(const Sample* a, const Sample* b, std::ptrdiff_t count, std::int64_t* total) {
  constexpr std::ptrdiff_t piece = 1 << 22;
  for (std::ptrdiff_t done = 0; done < count; done += piece) {
    const std::ptrdiff_t end = std::min(count, done + piece);
    std::uint32_t sum = 0;
    for (std::ptrdiff_t i = done; i < end; ++i) sum += std::uint32_t(std::abs(a[i] - b[i]));
    *total += sum;
  }
}

bool SameKind(const PictureData& a, const PictureData& b) {
  return a.Width == b.Width && a.Height == b.Height && a.HasAlpha == b.HasAlpha && a.IsRGB == b.IsRGB &&
         a.IsCMYK == b.IsCMYK && a.IsGray == b.IsGray;
}

/// The planes of a group without anything else in the pixel.
PlaneList Packed(int count) { return {count, count, {0, 1, 2, 3, 4}}; }

}

Int64 CompareImages(PictureZOR* self, PictureZOR* other) {
  if (!other) return -1;
  PictureData &a = DataOf(self), &b = DataOf(other);
  if (!a.Valid || !b.Valid || !SameKind(a, b) || !Usable(a)) return -1;
  MayYield(a);
  if (!Usable(b)) return -1;
  MayYield(b);
  const Group group = GroupOf(a);
  if (group == Group::None) return -1;

  const PlaneList planesOfA = PlanesOf(group, a), planesOfB = PlanesOf(group, b);
  const PlaneList packed =
      FillPixelsAlike(planesOfA, planesOfB) ? InPixel(planesOfA) : Packed(planesOfA.Count);
  const AlphaRule rule = a.HasAlpha ? AlphaRule::Copy : AlphaRule::None;
  static constexpr Sample Pixel[8] = {};  // written whole
  const auto pixelsOf = [&](const PictureData& picture, const PlaneList& planes) {
    return InLayout(Find(ComparePairs, FamilyOf(picture), planes, FamilyOf(picture), packed, rule), planes,
                    packed.Step, Pixel);
  };
  InLayout pixelsOfA = pixelsOf(a, planesOfA), pixelsOfB = pixelsOf(b, planesOfB);
  const std::int32_t most = InLayout::Most / packed.Step;
  std::int64_t total = 0;
  const bool reached =
      Walk(From(a), From(b)).Rows(a.Height, [&](std::int32_t, Sample* rowOfA, Sample* rowOfB) {
        for (std::int32_t x = 0; x < a.Width; x += most) {
          const std::int32_t count = std::min(most, a.Width - x);
          OnBestTarget<AddDifferences>(pixelsOfA(rowOfA, x, count), pixelsOfB(rowOfB, x, count),
                                       std::ptrdiff_t{count} * packed.Step, &total);
        }
      });
  return reached ? total : -1;
}

}
