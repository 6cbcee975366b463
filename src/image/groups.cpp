#include "image/groups.h"

#include "image/plane_fields.h"

namespace zor {
namespace {

struct GroupPlanes {
  int Count;
  PlaneFields Plane[5];
};

constexpr GroupPlanes PlanesOfGroup[] = {
    {0, {}},
    {1, {GrayPlane}},
    {2, {GrayPlane, AlphaPlane}},
    {3, {RedPlane, GreenPlane, BluePlane}},
    {4, {RedPlane, GreenPlane, BluePlane, AlphaPlane}},
    {4, {CyanPlane, MagentaPlane, YellowPlane, BlackPlane}},
    {5, {CyanPlane, MagentaPlane, YellowPlane, BlackPlane, AlphaPlane}},
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
    return picture.*plane.Has || (plane.Has == AlphaPlane.Has && !withAlpha);
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

}
