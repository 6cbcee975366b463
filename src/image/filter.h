#pragma once
#include <utility>

#include "image/groups.h"
#include "image/lifecycle.h"
#include "image/stores.h"

namespace zor {

/// What a method with a `dest` asks of it.
struct FilterRules {
  enum GroupsServed { EveryGroup, GrayAndRGB } Groups = EveryGroup;
  bool WritesAlpha = true;
  /// Whether `dest` may be the source itself.
  bool InPlace = true;
  /// Whether the result is as wide as the source is high.
  bool Turned = false;
  /// Whether the pixels of a given `dest` must be of the size of the source's. Those of a new picture for a
  /// view of wider pixels never are.
  bool SamePixelSize = false;
  /// Whether the call's numbers ask for anything to be written.
  bool Writes = true;
};

/// A filter's two pictures, both usable, with the planes of the source's group in each.
struct FilterCall {
  PictureData &Source, &Dest;
  Group Of;
  PlaneList In, Out;
  /// Whether what is written may show in the source, or in other rows of the destination, as in a caller's
  /// block with less than a row from one row to the next. Then the order of reading and writing, pixel by
  /// pixel, makes the result, and a form with another order steps aside.
  bool SharesPixels;
};

/// The way into every method with a `dest`. Takes `dest`, or makes a picture of the source's size and format,
/// and runs body once if the source's group is served and there is anything to write. The result is the
/// destination with a reference for the caller. Nil when a picture isn't usable; when `dest`, if it would be
/// written, is smaller than the result or lacks a plane, or is the source and may not be; or when a body that
/// gives a Boolean gives false: a row can't be reached then, and what was written until then stays.
template <class Body>
PictureZOR* RunFilter(PictureZOR* self, PictureZOR* dest, const FilterRules& rules, Body&& body) {
  PictureData& source = DataOf(self);
  if (!Usable(source)) return nullptr;
  MayYield(source);
  const std::int32_t width = rules.Turned ? source.Height : source.Width;
  const std::int32_t height = rules.Turned ? source.Width : source.Height;
  Held result{dest ? Locked(dest) : CreatePictureThroughFactory(&source, width, height, source.ImageFormat)};
  if (!result || !Usable(result.Data())) return nullptr;
  PictureData& into = result.Data();
  const Group group = GroupOf(source);
  const bool served =
      group != Group::None && (rules.Groups == FilterRules::EveryGroup || group < Group::CMYK);
  if (!served || !rules.Writes || source.Width < 1) {
    MayYield(into);
    return result.HandOn();
  }
  if (result.Object() == self && !rules.InPlace) return nullptr;
  if (into.Width < width || into.Height < height || !HasPlanes(group, into, rules.WritesAlpha))
    return nullptr;
  if (rules.SamePixelSize && dest && into.PixelSize != source.PixelSize) return nullptr;
  MayYield(into);
  const FilterCall call{source,
                        into,
                        group,
                        PlanesOf(group, source),
                        PlanesOf(group, into),
                        SharePixels(source, into) || !RowsAreApart(into)};
  if constexpr (std::is_void_v<decltype(body(call))>)
    body(call);
  else if (!body(call))
    return nullptr;
  return result.HandOn();
}

}
