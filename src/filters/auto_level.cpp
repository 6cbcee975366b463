#include <array>

#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "image/arithmetic.h"
#include "image/walk.h"

namespace zor {
namespace {

using Histogram = std::array<std::int64_t, 256>;

/// The luma of a colour, in doubles as it is defined, from the products of every sample value.
struct LumaTables {
  std::array<double, 256> Red, Green, Blue;

  LumaTables() {
    for (int v = 0; v < 256; ++v) {
      Red[v] = 0.177 * v;
      Green[v] = 0.813 * v;
      Blue[v] = 0.01 * v;
    }
  }
  int operator()(Sample red, Sample green, Sample blue) const {
    // Below 256, so that a plain conversion does.
    return int(Red[red] + Green[green] + Blue[blue]);
  }
};

/// How many pixels of the part have each luma. False when a row can't be reached.
bool CountLumas(PictureData& picture, const Rectangle& part, Histogram& counts) {
  const PlaneList planes = PlanesOf(Group::RGB, picture, part.X);
  const LumaTables luma;
  // Neighbours often have one luma; counted apart they don't wait for each other.
  std::array<Histogram, 4> apart{};
  const bool done = Walk(Yielding(From(picture, part.Y))).Rows(part.Height, [&](std::int32_t, Sample* row) {
    const PlaneRow<3> in(row, planes);
    for (std::ptrdiff_t x = 0; x < part.Width; ++x) ++apart[x % 4][luma(in(0, x), in(1, x), in(2, x))];
  });
  for (int i = 0; i < 256; ++i) counts[i] = apart[0][i] + apart[1][i] + apart[2][i] + apart[3][i];
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
