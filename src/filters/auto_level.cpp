#include <algorithm>
#include <array>

#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "image/arithmetic.h"
#include "image/targets.h"
#include "image/walk.h"

namespace zor {
namespace {

using Histogram = std::array<std::int64_t, 256>;

/// The lumas of a run of pixels, in doubles as they are defined.
template <int Step>
void FindLumas(const PlaneRow<3, Step>& in, std::ptrdiff_t first, Sample* lumas, std::ptrdiff_t count) {
  const PlaneRow<3, Step> from = in;
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const std::ptrdiff_t x = first + i;
    // Below 256, so that a plain conversion does.
    lumas[i] = Sample(int(0.177 * from(0, x) + 0.813 * from(1, x) + 0.01 * from(2, x)));
  }
}

/// Counts the lumas of rows.
class LumaCounts {
 public:
  template <int Step>
  void Add(const PlaneRow<3, Step>& in, std::int32_t width) {
    for (std::ptrdiff_t first = 0; first < width; first += Stretch) {
      const std::ptrdiff_t count = std::min(Stretch, width - first);
      Sample lumas[Stretch];
      OnBestTarget<FindLumas<Step>>(in, first, static_cast<Sample*>(lumas), count);
      for (std::ptrdiff_t i = 0; i < count; ++i) ++Apart[i % Many][lumas[i]];
    }
  }
  Histogram Sums() const {
    Histogram sums{};
    for (const Histogram& counts : Apart)
      for (std::size_t luma = 0; luma < 256; ++luma) sums[luma] += counts[luma];
    return sums;
  }

 private:
  static constexpr std::ptrdiff_t Stretch = 512, Many = 8;
  /// Neighbours often have one luma; counted apart they don't wait for each other.
  Histogram Apart[Many]{};
};

/// How many pixels of the part have each luma. False when a row can't be reached.
bool CountLumas(PictureData& picture, const Rectangle& part, Histogram& counts) {
  const PlaneList planes = PlanesOf(Group::RGB, picture, part.X);
  LumaCounts lumas;
  const auto count = [&]<int Step>() {
    return Walk(Yielding(From(picture, part.Y))).Rows(part.Height, [&](std::int32_t, Sample* row) {
      lumas.Add(PlaneRow<3, Step>(row, planes), part.Width);
    });
  };
  const bool done = planes.Step == 3   ? count.template operator()<3>()
                    : planes.Step == 4 ? count.template operator()<4>()
                                       : count.template operator()<0>();
  counts = lumas.Sums();
  return done;
}

/// The last level that no more than `count` pixels reach; 0 if there is none.
int LevelBelow(const Histogram& reached, std::int64_t count) {
  int level = 255;
  while (level > 0 && reached[level] > count) --level;
  return level;
}

/// The levels from low to high spread over 0 to 255. Where the two are one level, it becomes 0.
SampleTable Stretched(int low, int high) {
  const double scale = 255.0 / (high - low);
  SampleTable table;
  for (int c = 0; c < 256; ++c) table[c] = c < low ? 0 : c > high ? 255 : Sample(Truncate(scale * (c - low)));
  return table;
}

}

Boolean AutoLevel(PictureZOR* self, Integer x, Integer y, Integer w, Integer h) {
  PictureData& picture = DataOf(self);
  const Rectangle part = FilterRect(picture, {x, y, w, h});
  if (!picture.IsRGB || part.Empty() || !Usable(picture)) return false;
  MayYield(picture);

  Histogram reached{};
  if (!CountLumas(picture, part, reached)) return false;
  for (int i = 1; i < 256; ++i) reached[i] += reached[i - 1];
  // In single precision, as the cut points are defined.
  const float total = float(reached[255]);
  const int low = LevelBelow(reached, std::int64_t(total * 0.005f));
  const int high = LevelBelow(reached, std::int64_t(total * 0.995f));
  const SampleTable table = Stretched(low, high);
  return MapPlanes(picture, part, {.Red = &table, .Green = &table, .Blue = &table});
}

Boolean AutoLevel(PictureZOR* self) {
  const PictureData& picture = DataOf(self);
  return AutoLevel(self, 0, 0, picture.Width, picture.Height);
}

}
