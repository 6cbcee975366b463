#include <cmath>

#include "filters/filters.h"
#include "filters/packed_rows.h"
#include "image/targets.h"

namespace zor {
namespace {

/// A sample and its two neighbours, those with the weight f, and k to make up for it.
struct Blend {
  double F, K;
};

void BlendRows(const Sample* before, const Sample* row, const Sample* behind, Sample* out,
               std::ptrdiff_t count, Blend blend) {
  // Never leaves 0..255, so the conversion needs no bounds.
  for (std::ptrdiff_t i = 0; i < count; ++i)
    out[i] = Sample(std::int32_t(blend.K * (row[i] + blend.F * (before[i] + behind[i]))));
}

class FractionalBlur {
 public:
  FractionalBlur(const FilterCall& call, Blend blend)
      : Call(call),
        Packing(call),
        Of(blend),
        Pixel(Packing.Count()),
        Band(call.Source, Packing, 1, 1, 0),
        Line(NewBuffer(std::size_t(Packing.Samples()) + 2 * std::size_t(Pixel))),
        Result(NewBuffer(std::size_t(Packing.Samples()))) {}

  /// False when a row can't be reached. Without memory nothing is done.
  bool Run() {
    if (!Band || !Line || !Result) return true;
    const std::int32_t height = Call.Source.Height;
    bool reached = true;
    // The rows go along only after all have gone down, which shows where they overlap or are the source's.
    for (std::int32_t y = 0; reached && y < height; ++y)
      reached = Down(y) && (Call.SharesPixels ? Store(y) : Along(y));
    for (std::int32_t y = 0; Call.SharesPixels && reached && y < height; ++y)
      reached = WithRow(Call.Dest, y, [&](Sample* row) { Packing.LoadDest(row, First()); }) && Along(y);
    return reached;
  }

 private:
  Sample* First() const { return Line.get() + Pixel; }

  /// The line becomes row y blended with those above and below. The first row is blended with itself alone.
  bool Down(std::int32_t y) {
    if (!Band.MoveTo(y)) return false;
    OnBestTarget<BlendRows>(Band[y - 1], Band[y], Band[y == 0 ? 0 : y + 1], First(), Packing.Samples(), Of);
    return true;
  }
  /// The line, blended along, goes into row y. The last column is blended with itself alone.
  bool Along(std::int32_t y) {
    Sample *first = First(), *last = first + Packing.Samples() - Pixel;
    std::copy_n(first, Pixel, first - Pixel);
    return WithRow(Call.Dest, y, [&](Sample* row) {
      Packing.Write(row, Result.get(), [&](Sample* out) {
        const std::ptrdiff_t before = Packing.Samples() - Pixel;
        OnBestTarget<BlendRows>(first - Pixel, first, first + Pixel, out, before, Of);
        OnBestTarget<BlendRows>(last, last, last, out + before, std::ptrdiff_t{Pixel}, Of);
      });
    });
  }
  bool Store(std::int32_t y) {
    return WithRow(Call.Dest, y, [&](Sample* row) { Packing.Store(First(), row); });
  }

  const FilterCall& Call;
  PackedRows Packing;
  Blend Of;
  int Pixel;
  PackedBand Band;
  Buffer Line, Result;
};

}

PictureZOR* BoxBlurFractionalFilter(PictureZOR* self, PictureZOR* dest, Double radius) {
  Held result{RunFilter(self, dest, {}, [&](const FilterCall& call) {
    const double fraction = radius - std::floor(radius), f = std::isnan(fraction) ? 0 : fraction;
    return FractionalBlur(call, {f, 1.0 / (f + f + 1.0)}).Run();
  })};
  return GroupOf(DataOf(self)) == Group::None ? nullptr : result.HandOn();
}

}
