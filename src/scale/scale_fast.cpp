#include <cstring>

#include "image/conversion.h"
#include "image/lifecycle.h"
#include "image/walk.h"
#include "scale/scale.h"

namespace zor {
namespace {

/// A row of nearest pixels, each from a column of the source.
using NearestRow = void (*)(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                            std::int32_t width, const std::int32_t* columns);

template <int I, int O, Colour<O> (*Step)(Colour<I>), bool Alpha>
void TakeNearest(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                 std::int32_t width, const std::int32_t* columns) {
  const PlaneRow<I + Alpha> source(const_cast<Sample*>(from), in);
  const PlaneRow<O + Alpha> dest(into, out);
  for (std::int32_t x = 0; x < width; ++x) {
    const std::ptrdiff_t nearest = columns[x];
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

/// Whole pixels. Those of three bytes go as four, of which the next pixel overwrites one.
template <int Size>
void CopyNearest(const Sample* from, const PlaneList& in, Sample* into, const PlaneList& out,
                 std::int32_t width, const std::int32_t* columns) {
  constexpr std::size_t all = Size == 3 ? 4 : Size;
  const Sample* const first = from + FirstOffset(in);
  Sample* const dest = into + FirstOffset(out);
  std::ptrdiff_t x = 0;
  for (const std::int32_t last = columns[width - 1]; columns[x] < last; ++x) {
    Sample pixel[all];
    std::memcpy(pixel, first + std::ptrdiff_t{columns[x]} * Size, all);
    std::memcpy(dest + x * Size, pixel, all);
  }
  for (; x < width; ++x) std::memcpy(dest + x * Size, first + std::ptrdiff_t{columns[x]} * Size, Size);
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
  NearestRow take = FindNearest(from, dest);
  if (width < 1 || height < 1 || !take || !Usable(from) || from.Width < 1) return false;
  MayYield(from);
  const double xRatio = double(from.Width) / width, yRatio = double(from.Height) / height;
  if (!Usable(dest)) return false;
  MayYield(dest);
  const bool alpha = from.HasAlpha && dest.HasAlpha;
  const PlaneList in = PlanesFor(from, alpha), out = PlanesFor(dest, alpha);
  const Buffer memory = NewBuffer(std::int64_t{width}, sizeof(std::int32_t));
  if (!memory) return false;
  auto* const columns = reinterpret_cast<std::int32_t*>(memory.get());
  // A product for each, so that no error adds up.
  for (std::int32_t x = 0; x < width; ++x) columns[x] = std::int32_t(xRatio * x);
  const bool apart = !SharePixels(from, dest) && RowsAreApart(dest);
  if (apart && FamilyOf(from) == FamilyOf(dest) && FillPixelsAlike(in, out))
    ForPlaneCount(in.Count, [&](auto n) { take = CopyNearest<n>; });
  const bool repeats = apart && FillPixels(out);
  bool reached = true;
  for (std::int32_t y = 0, last = -1; reached && y < height; ++y) {
    const auto nearest = std::int32_t(yRatio * y);
    if (repeats && nearest == last)
      reached = WithRows({dest, y - 1, 2}, [&](const RowRun& rows) {
        const std::int32_t first = FirstOffset(out);
        std::memcpy(rows[1] + first, rows[0] + first, std::size_t(width) * std::size_t(out.Step));
      });
    else
      reached = Walk(From(from, nearest), Into(dest, y))
                    .Rows(1, [&](std::int32_t, const Sample* source, Sample* row) {
                      take(source, in, row, out, width, columns);
                    });
    if (reached) MayYield(dest);
    last = nearest;
  }
  return reached;
}

}
