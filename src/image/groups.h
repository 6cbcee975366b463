#pragma once
#include <algorithm>
#include <array>
#include <type_traits>

#include "image/picture_data.h"

namespace zor {

enum class Family : std::uint8_t { None, Gray, RGB, CMYK };
enum class Group : std::uint8_t { None, Gray, GrayAlpha, RGB, RGBAlpha, CMYK, CMYKAlpha };

/// The family and the group of a picture, from its layout flags; never from its format code.
Family FamilyOf(const PictureData& picture);
Group GroupOf(const PictureData& picture);

/// The planes of a group as they lie in one picture: gray | red, green, blue | cyan, magenta, yellow, black,
/// and alpha last. Step is the bytes from one pixel to the next.
struct PlaneList {
  int Count = 0;
  std::int32_t Step = 0;
  std::array<std::int32_t, 5> Offset{};
};

/// The planes as they stand from column x on.
PlaneList PlanesOf(Group group, const PictureData& picture, std::int32_t x = 0);

/// The offset of the plane that lies first. Of at least one plane.
std::int32_t FirstOffset(const PlaneList& planes);

/// Whether the planes of two lists, as many in each, lie in a pixel in the same way; and whether they fill
/// the pixel too, so that a row is one run of samples. False without planes.
bool LieAlike(const PlaneList& a, const PlaneList& b);
bool FillPixelsAlike(const PlaneList& a, const PlaneList& b);

/// Whether a picture has all planes of a group; its alpha is asked for only `withAlpha`.
bool HasPlanes(Group group, const PictureData& picture, bool withAlpha);

/// The offset of the pixel that the planes stand in: the left edge of what a clip view shows.
inline std::int32_t LeftOf(const PlaneList& planes) {
  return planes.Count > 0 ? planes.Offset[0] / planes.Step * planes.Step : 0;
}
/// Whether the planes take up every byte of a pixel.
inline bool FillPixels(const PlaneList& planes) { return planes.Count > 0 && planes.Count == planes.Step; }

/// A row seen as N planes: row(c, x) is the sample of plane c at column x. ConstantStep, where it isn't 0,
/// is the step that the compiler then knows.
template <int N, int ConstantStep = 0>
struct PlaneRow {
  static constexpr int Count = N;

  PlaneRow(Sample* row, const PlaneList& planes) : Step(planes.Step) {
    for (int c = 0; c < N; ++c) Plane[c] = row + planes.Offset[c];
  }
  Sample& operator()(int c, std::ptrdiff_t x) const {
    return Plane[c][x * (ConstantStep ? ConstantStep : Step)];
  }

  std::array<Sample*, N> Plane;
  std::ptrdiff_t Step;
};

template <int N>
using Planes = std::integral_constant<int, N>;

/// Runs loop with the number of planes as a constant, 1 to 5: the one choice of an operation, outside its
/// loops. The group None has no planes and runs nothing.
template <class Loop>
void ForPlaneCount(int count, Loop&& loop) {
  switch (count) {
    case 1: return loop(Planes<1>{});
    case 2: return loop(Planes<2>{});
    case 3: return loop(Planes<3>{});
    case 4: return loop(Planes<4>{});
    case 5: return loop(Planes<5>{});
  }
}

/// The same for work that treats all planes alike. Planes that fill the pixel come as one run of bytes: a
/// single plane with step 1, Count times as wide, which the compiler turns into vector code. Calls
/// loop(planesOn, width), where planesOn(row) is the PlaneRow of a row.
template <class Loop>
void ForAlikePlanes(const PlaneList& planes, std::int32_t width, Loop&& loop) {
  if (FillPixels(planes)) {
    const PlaneList run{1, 1, {FirstOffset(planes)}};
    return loop([=](Sample* row) { return PlaneRow<1, 1>(row, run); }, std::ptrdiff_t{width} * planes.Count);
  }
  ForPlaneCount(planes.Count, [&](auto n) {
    loop([&](Sample* row) { return PlaneRow<n>(row, planes); }, std::ptrdiff_t{width});
  });
}

}
