#include "image/conversion.h"
#include "image/lifecycle.h"
#include "image/walk.h"
#include "scale/scale.h"

namespace zor {
namespace {

/// A row of nearest pixels. The product is made anew for each, so that no error adds up.
using NearestRow = void (*)(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                            std::int32_t width, double ratio);

template <int I, int O, Colour<O> (*Step)(Colour<I>), bool Alpha>
void TakeNearest(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                 std::int32_t width, double ratio) {
  const PlaneRow<I + Alpha> source(const_cast<Sample*>(from), in);
  const PlaneRow<O + Alpha> dest(into, out);
  for (std::int32_t x = 0; x < width; ++x) {
    const auto nearest = std::int32_t(ratio * x);
    Colour<I> colour;
    for (int i = 0; i < I; ++i) colour.Of[i] = source(i, nearest);
    const Colour<O> result = Step(colour);
    if constexpr (Alpha) dest(O, x) = source(I, nearest);
    for (int o = 0; o < O; ++o) dest(o, x) = result.Of[o];
  }
}

enum class NeedsAlpha : std::uint8_t { Nothing, Source, SourceIfDest };

struct FastPair {
  Family From, Into;
  NeedsAlpha Needs;
  NearestRow Plain, WithAlpha;
};

template <Family From, Family Into, Colour<ColoursOf(Into)> (*Step)(Colour<ColoursOf(From)>),
          NeedsAlpha Needs = NeedsAlpha::Nothing>
constexpr FastPair Fast{From, Into, Needs, TakeNearest<ColoursOf(From), ColoursOf(Into), Step, false>,
                        TakeNearest<ColoursOf(From), ColoursOf(Into), Step, true>};

// Gray becomes black ink alone here, where `Scale` gives it to all four plates.
constexpr FastPair FastPairs[] = {
    Fast<Family::Gray, Family::Gray, Same<1>>,
    Fast<Family::Gray, Family::RGB, GrayToAll>,
    Fast<Family::Gray, Family::CMYK, GrayToBlack, NeedsAlpha::SourceIfDest>,
    Fast<Family::RGB, Family::Gray, Luma>,
    Fast<Family::RGB, Family::RGB, Same<3>>,
    Fast<Family::CMYK, Family::Gray, BlackToGray, NeedsAlpha::Source>,
    Fast<Family::CMYK, Family::CMYK, Same<4>, NeedsAlpha::Source>,
};

NearestRow FindNearest(const PictureData& source, const PictureData& dest) {
  for (const FastPair& pair : FastPairs) {
    if (pair.From != FamilyOf(source) || pair.Into != FamilyOf(dest)) continue;
    const bool missing =
        pair.Needs == NeedsAlpha::Source || (pair.Needs == NeedsAlpha::SourceIfDest && dest.HasAlpha);
    if (missing && !source.HasAlpha) return nullptr;
    return source.HasAlpha && dest.HasAlpha ? pair.WithAlpha : pair.Plain;
  }
  return nullptr;
}

/// The planes that a pair's loop works on: alpha only where both have it.
PlaneList PlanesFor(const PictureData& picture, bool alpha) {
  const Group group = GroupOf(picture);
  return PlanesOf(picture.HasAlpha && !alpha ? Group(int(group) - 1) : group, picture);
}

}

Boolean ScaleFast(PictureZOR* self, PictureZOR* source, Integer width, Integer height) {
  if (!source) return false;
  PictureData &dest = DataOf(self), &from = DataOf(source);
  if (!from.Valid || !dest.Valid) return false;
  width = std::min(width, dest.Width);
  height = std::min(height, dest.Height);
  const NearestRow take = FindNearest(from, dest);
  if (width < 1 || height < 1 || !take || !Usable(from) || from.Width < 1) return false;
  MayYield(from);
  const double xRatio = double(from.Width) / width, yRatio = double(from.Height) / height;
  if (!Usable(dest)) return false;
  MayYield(dest);
  const bool alpha = from.HasAlpha && dest.HasAlpha;
  const PlaneList in = PlanesFor(from, alpha), out = PlanesFor(dest, alpha);
  for (std::int32_t y = 0; y < height; ++y) {
    Walk walk(From(from, std::int32_t(yRatio * y)), Yielding(Into(dest, y)));
    if (!walk.Rows(1, [&](std::int32_t, const Sample* row, Sample* into) {
          take(row, in, into, out, width, xRatio);
        }))
      return false;
  }
  return true;
}

}
