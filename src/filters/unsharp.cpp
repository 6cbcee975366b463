#include <cstdlib>

#include "filters/filters.h"
#include "image/arithmetic.h"
#include "image/groups.h"
#include "image/stores.h"
#include "image/walk.h"

namespace zor {
namespace {

/// How far a sample a goes from its blurred neighbour b.
struct Push {
  double Factor;
  std::int32_t Threshold;

  Sample operator()(int a, int b) const {
    const int d = a - b;
    return std::abs(d) < Threshold ? Sample(a) : Clamp(Truncate(Factor * d + b));
  }
};

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

  const Push push{Amount * 4.0 + 1.0, Threshold};
  const Group group = GroupOf(picture);
  const PlaneList planes = PlanesOf(group, picture), from = PlanesOf(group, blurred);
  bool done = true;
  ForPlaneCount(planes.Count, [&](auto n) {
    done = Walk(From(blurred), Into(picture)).Rows(picture.Height, [&](std::int32_t, Sample* b, Sample* a) {
      const PlaneRow<n> below(b, from), sample(a, planes);
      for (std::ptrdiff_t x = 0; x < picture.Width; ++x)
        for (int c = 0; c < n; ++c) sample(c, x) = push(sample(c, x), below(c, x));
    });
  });
  return done;
}

}
