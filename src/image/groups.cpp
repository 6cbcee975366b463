#include "image/groups.h"

namespace zor {
namespace {

/// A plane's fields in the record.
struct PlaneFields {
  bool PictureData::*Has;
  std::int32_t PictureData::*Offset;
};

using P = PictureData;
constexpr PlaneFields Gray{&P::HasGray, &P::GrayOffset}, Alpha{&P::HasAlpha, &P::AlphaOffset},
    Red{&P::HasRed, &P::RedOffset}, Green{&P::HasGreen, &P::GreenOffset}, Blue{&P::HasBlue, &P::BlueOffset},
    Cyan{&P::HasCyan, &P::CyanOffset}, Magenta{&P::HasMagenta, &P::MagentaOffset},
    Yellow{&P::HasYellow, &P::YellowOffset}, Black{&P::HasBlack, &P::BlackOffset};

struct GroupPlanes {
  int Count;
  PlaneFields Plane[5];
};

constexpr GroupPlanes PlanesOfGroup[] = {
    {0, {}},
    {1, {Gray}},
    {2, {Gray, Alpha}},
    {3, {Red, Green, Blue}},
    {4, {Red, Green, Blue, Alpha}},
    {4, {Cyan, Magenta, Yellow, Black}},
    {5, {Cyan, Magenta, Yellow, Black, Alpha}},
};

}

Family FamilyOf(const PictureData& picture) {
  return picture.IsGray   ? Family::Gray
         : picture.IsRGB  ? Family::RGB
         : picture.IsCMYK ? Family::CMYK
                          : Family::None;
}

Group GroupOf(const PictureData& picture) {
  const int alpha = picture.HasAlpha ? 1 : 0;
  if (picture.IsGray) return Group(int(Group::Gray) + alpha);
  if (picture.IsRGB) return Group(int(Group::RGB) + alpha);
  if (picture.IsCMYK) return Group(int(Group::CMYK) + alpha);
  return Group::None;
}

bool HasPlanes(Group group, const PictureData& picture, bool withAlpha) {
  const GroupPlanes& row = PlanesOfGroup[int(group)];
  return std::all_of(row.Plane, row.Plane + row.Count, [&](const PlaneFields& plane) {
    return picture.*plane.Has || (plane.Has == Alpha.Has && !withAlpha);
  });
}

std::int32_t FirstOffset(const PlaneList& planes) {
  return *std::min_element(planes.Offset.begin(), planes.Offset.begin() + planes.Count);
}

bool LieAlike(const PlaneList& a, const PlaneList& b) {
  bool alike = a.Count > 0 && a.Step == b.Step;
  for (int c = 0; c < a.Count; ++c) alike = alike && a.Offset[c] - a.Offset[0] == b.Offset[c] - b.Offset[0];
  return alike;
}

bool FillPixelsAlike(const PlaneList& a, const PlaneList& b) { return a.Count == a.Step && LieAlike(a, b); }

PlaneList PlanesOf(Group group, const PictureData& picture, std::int32_t x) {
  const GroupPlanes& row = PlanesOfGroup[int(group)];
  PlaneList planes{row.Count, picture.PixelSize, {}};
  for (int c = 0; c < row.Count; ++c) planes.Offset[c] = picture.*row.Plane[c].Offset + x * picture.PixelSize;
  return planes;
}

bool SamePixels(const PlaneList& a, const PlaneList& b) {
  if (!FillPixels(a) || a.Count != b.Count || a.Step != b.Step) return false;
  const std::int32_t shift = LeftOf(a) - LeftOf(b);
  return std::equal(a.Offset.begin(), a.Offset.begin() + a.Count, b.Offset.begin(),
                    [&](std::int32_t atA, std::int32_t atB) { return atA == atB + shift; });
}

}
