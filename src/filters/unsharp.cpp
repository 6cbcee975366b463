#include <algorithm>
#include <cmath>
#include <cstdlib>

#include "filters/filters.h"
#include "filters/unsharp_runs.h"
#include "image/groups.h"
#include "image/stores.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

/// Pushes samples away from those beside them, by the formula itself. Clamped first and truncated then, as
/// vectors have it, which is the same; a sum that is not a number becomes 0 either way.
void PushRun(Sample* samples, const Sample* beside, std::ptrdiff_t count, double factor,
             std::int32_t threshold) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const int a = samples[i], b = beside[i], d = a - b;
    const double v = factor * d + b;
    const int pushed = int(v > 0 ? v < 255 ? v : 255 : 0);
    samples[i] = Sample(std::abs(d) < threshold ? a : pushed);
  }
}

/// The same in whole numbers, for a factor without doubtful differences.
void PushRunWhole(Sample* samples, const Sample* beside, std::ptrdiff_t count, std::int32_t multiplier,
                  std::int32_t shift, std::int32_t threshold) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const int a = samples[i], b = beside[i], d = a - b;
    const int pushed = b + ((multiplier * d + WholeFactor::Bias) >> shift);
    samples[i] = Sample(std::abs(d) < threshold ? a : std::clamp(pushed, 0, 255));
  }
}

/// The formula as a table by both samples, for planes that don't lie side by side and for pictures that share
/// samples: those have to be read one after the other, each after the ones before it have been written.
struct PushTable {
  Sample Cell[256][256];

  PushTable(double factor, std::int32_t threshold) {
    for (int a = 0; a < 256; ++a)
      for (int b = 0; b < 256; ++b) {
        Cell[a][b] = Sample(a);
        const Sample beside = Sample(b);
        PushRun(&Cell[a][b], &beside, 1, factor, threshold);
      }
  }
};

void PushRow(Sample* samples, const Sample* beside, std::ptrdiff_t count, const WholeFactor& factor,
             std::int32_t threshold) {
  if (!factor.Fits) return OnBestTarget<PushRun>(samples, beside, count, factor.Factor, threshold);
  if (CurrentTarget >= Target::AVX512) return PushRunAVX512(samples, beside, count, factor, threshold);
  factor.AnyDoubtful
      ? OnBestTarget<PushRun>(samples, beside, count, factor.Factor, threshold)
      : OnBestTarget<PushRunWhole>(samples, beside, count, factor.Multiplier, factor.Shift, threshold);
}

}

WholeFactor::WholeFactor(double factor) : Factor(factor) {
  const double most = std::abs(factor) * 255;
  while (Shift > 10 && most * (1 << Shift) >= 1 << 30) --Shift;
  Fits = most * (1 << Shift) < 1 << 30;
  if (!Fits) return;
  Multiplier = std::int32_t(std::floor(factor * (1 << Shift) + 0.5));
  for (int d = -255; d <= 255; ++d) {
    // The sum of factor d and b, where it isn't clamped, is rounded to 2^-45 at the finest. So b makes no
    // difference to what lies below the point, unless the product is a hair below a whole number.
    const double product = factor * d, whole = std::floor(product);
    const int step = (Multiplier * d + Bias) >> Shift;
    const bool far = std::abs(product) > 512 && (product > 0 ? step > 255 : step < -255);
    if (far || (step == whole && (product == whole || whole + 1 - product >= 0x1p-44))) continue;
    Doubtful[std::size_t(d + 256) / 32] |= std::uint32_t{1} << (d + 256) % 32;
    AnyDoubtful = true;
  }
}

Boolean UnsharpFilter(PictureZOR* self, PictureZOR* origpixels, Double Amount, Integer Threshold) {
  PictureData& picture = DataOf(self);
  if (!origpixels) return false;
  PictureData& blurred = DataOf(origpixels);
  if (!picture.Valid || !blurred.Valid || picture.Width != blurred.Width ||
      picture.Height != blurred.Height || picture.ImageFormat != blurred.ImageFormat)
    return false;
  if (!Usable(picture)) return false;
  MayYield(picture);
  if (!Usable(blurred)) return false;
  MayYield(blurred);

  const double factor = Amount * 4.0 + 1.0;
  const Group group = GroupOf(picture);
  const PlaneList planes = PlanesOf(group, picture), from = PlanesOf(group, blurred);
  Walk walk(From(blurred), Into(picture));
  if (FillPixelsAlike(planes, from) && !SharePixels(picture, blurred)) {
    const std::int32_t first = FirstOffset(planes), firstBeside = FirstOffset(from);
    const std::ptrdiff_t count = std::ptrdiff_t{picture.Width} * planes.Count;
    const WholeFactor whole(factor);
    return walk.Rows(picture.Height, [&](std::int32_t, Sample* beside, Sample* row) {
      PushRow(row + first, beside + firstBeside, count, whole, Threshold);
    });
  }
  const PushTable pushed(factor, Threshold);
  bool done = true;
  ForPlaneCount(planes.Count, [&](auto n) {
    done = walk.Rows(picture.Height, [&](std::int32_t, Sample* beside, Sample* row) {
      const PlaneRow<n> b(beside, from), sample(row, planes);
      for (std::ptrdiff_t x = 0; x < picture.Width; ++x)
        for (int c = 0; c < n; ++c) sample(c, x) = pushed.Cell[sample(c, x)][b(c, x)];
    });
  });
  return done;
}

}
