#include <algorithm>

#include "filters/byte_pattern.h"
#include "filters/dither_matrices.h"
#include "filters/filters.h"
#include "image/filter.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

/// What becomes of a sample: the level above it where the threshold lies below its rest, else the level at or
/// below it.
struct Dither {
  /// Levels above the lowest one, 1 to 255.
  std::int32_t Steps;
  /// In whose units a rest is counted.
  std::int32_t Units;
  /// 255 i / Steps is i Share >> 16: Share is too large by 1 at most, so the product by i at most, and i
  /// Steps is below 2^16.
  std::int32_t Share;

  Dither(std::int32_t side, std::int32_t levels)
      : Steps(levels - 1), Units(side * side + 1), Share((255 << 16) / Steps + 1) {}

  Sample operator()(std::int32_t v, std::int32_t threshold) const {
    const std::int32_t above = threshold < (Units * v >> 8) ? 1 : 0;
    return Sample(((Steps * v >> 8) + above) * Share >> 16);
  }
};

/// `mask` has 255 for samples and 0 for what lies between them; without Gaps it isn't looked at.
template <bool Gaps>
void DitherRun(const Sample* in, Sample* out, const Sample* thresholds, const Sample* mask,
               std::ptrdiff_t count, Dither dither) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const Sample level = dither(in[i], thresholds[i]);
    out[i] = Gaps ? Sample((level & mask[i]) | (out[i] & ~mask[i])) : level;
  }
}

/// Rows whose planes lie in the pixels of both pictures in the same way, as runs of bytes.
template <bool Gaps>
bool DitherRuns(const FilterCall& call, const DitherMatrix& matrix, const Dither& dither) {
  const RowBytes bytes(call.In, call.Source.Width);
  const std::int32_t out = FirstOffset(call.Out), step = call.In.Step;
  const std::ptrdiff_t period = std::ptrdiff_t{matrix.Side} * step;
  const BytePattern mask(period, [&](std::ptrdiff_t i) { return bytes.IsSample(i) ? 255 : 0; });
  return Walk(From(call.Source), Into(call.Dest))
      .Rows(call.Source.Height, [&](std::int32_t y, Sample* source, Sample* dest) {
        const Sample* cells = matrix.Cells + y % matrix.Side * matrix.Side;
        const BytePattern thresholds(period, [&](std::ptrdiff_t i) { return cells[i / step]; });
        thresholds.Along(bytes.Count, [&](std::ptrdiff_t at, std::ptrdiff_t count, const Sample* units) {
          OnBestTarget<DitherRun<Gaps>>(static_cast<const Sample*>(source + bytes.First + at),
                                        dest + out + at, units, mask.First(), count, dither);
        });
      });
}

bool DitherSamples(const FilterCall& call, const DitherMatrix& matrix, const Dither& dither) {
  bool done = true;
  ForPlaneCount(call.In.Count, [&](auto n) {
    done = Walk(From(call.Source), Into(call.Dest))
               .Rows(call.Source.Height, [&](std::int32_t y, Sample* source, Sample* dest) {
                 const PlaneRow<n> in(source, call.In), out(dest, call.Out);
                 const Sample* cells = matrix.Cells + y % matrix.Side * matrix.Side;
                 for (std::ptrdiff_t x = 0; x < call.Source.Width; ++x)
                   for (int c = 0; c < n; ++c) out(c, x) = dither(in(c, x), cells[x % matrix.Side]);
               });
  });
  return done;
}

}

PictureZOR* DitherFilter(PictureZOR* self, PictureZOR* dest, Integer matrix, Integer levels) {
  const DitherMatrix* cells = MatrixOf(matrix);
  const FilterRules rules{.Groups = FilterRules::GrayAndRGB, .Writes = cells != nullptr};
  return RunFilter(self, dest, rules, [&](const FilterCall& call) {
    const Dither dither(cells->Side, std::clamp(levels, 2, 256));
    const bool runs = LieAlike(call.In, call.Out) && (!call.SharesPixels || &call.Source == &call.Dest);
    if (!runs) return DitherSamples(call, *cells, dither);
    return FillPixels(call.In) ? DitherRuns<false>(call, *cells, dither)
                               : DitherRuns<true>(call, *cells, dither);
  });
}

}
