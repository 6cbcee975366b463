#include "filters/filters.h"
#include "image/clip.h"
#include "image/groups.h"
#include "image/walk.h"

namespace zor {

void Invert(PictureZOR* self, Integer x, Integer y, Integer w, Integer h) {
  PictureData& picture = DataOf(self);
  const Rectangle part = FilterRect(picture, {x, y, w, h});
  if (part.Empty() || !Usable(picture)) return;
  MayYield(picture);

  const PlaneList planes = PlanesOf(GroupOf(picture), picture, part.X);
  ForAlikePlanes(planes, part.Width, [&](auto planesOn, std::ptrdiff_t width) {
    Walk(Yielding(Into(picture, part.Y))).Rows(part.Height, [&](std::int32_t, Sample* row) {
      const auto sample = planesOn(row);
      for (std::ptrdiff_t i = 0; i < width; ++i)
        for (int c = 0; c < sample.Count; ++c) sample(c, i) = Sample(255 - sample(c, i));
    });
  });
}

void Invert(PictureZOR* self) {
  const PictureData& picture = DataOf(self);
  Invert(self, 0, 0, picture.Width, picture.Height);
}

}
