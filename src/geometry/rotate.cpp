#include <cmath>
#include <limits>

#include "geometry/geometry.h"
#include "geometry/shears.h"
#include "image/arithmetic.h"
#include "image/lifecycle.h"
#include "image/stores.h"
#include "image/trigonometry.h"
#include "image/walk.h"

// A rotation is three shears: along the rows, along the columns, along the rows again (A. Paeth, "A Fast
// Algorithm for General Raster Rotation", 1986). No pixel is resampled twice in one direction, but an angle
// has to be within 45 degrees of 0, to which an exact turn brings it.

namespace zor {
namespace {

constexpr double Pi = 3.141592653589793;

/// The shifts of `count` lines; null without memory.
template <class Distance>
Buffer Shifts(std::int32_t count, Distance&& distance) {
  Buffer memory = NewBuffer((std::size_t(count) + 1) * sizeof(Shift));
  auto* shifts = reinterpret_cast<Shift*>(memory.get());
  for (std::int32_t i = 0; memory && i < count; ++i) shifts[i] = ShiftBy(distance(i));
  return memory;
}
const Shift* In(const Buffer& shifts) { return reinterpret_cast<const Shift*>(shifts.get()); }

/// The rotation of one picture. New pictures come from the factories of the one that was asked, also where an
/// exact turn has made another one of it first.
class Rotation {
 public:
  Rotation(const PictureData& asked, PictureData& base, double angle, const std::array<Sample, 5>& background)
      : Asked(asked), Base(base), Of(GroupOf(base)), Background(background) {
    const double theta = angle * Pi / 180.0;
    S = Sine(theta);
    T = Tangent(theta * 0.5);
    C = Cosine(theta);
  }

  PictureZOR* Run() const {
    if (!Usable(Base)) return nullptr;
    MayYield(Base);
    const double w = Base.Width, h = Base.Height;
    Held sheared = NewPicture(Base, w + Truncate(h * std::fabs(T)), h);
    if (!sheared || !FirstShear(sheared.Data())) return nullptr;
    Held upright = NewPicture(sheared.Data(), sheared.Data().Width, Truncate(h * C + w * std::fabs(S)) + 1.0);
    if (!upright || !SecondShear(sheared.Data(), upright.Data())) return nullptr;
    sheared = Held{nullptr};
    const double height = Truncate(w * std::fabs(S) + h * C) + 1.0;
    Held turned = NewPicture(upright.Data(), Truncate(h * std::fabs(S) + w * C) + 1.0, height);
    if (!turned || !ThirdShear(upright.Data(), turned.Data(), std::int32_t(height))) return nullptr;
    return turned.HandOn();
  }

 private:
  /// A picture for a shear of `source`, in its format. None where it can't hold the result, or where writing
  /// it would write what is read, or one of its rows where another one is.
  Held NewPicture(const PictureData& source, double width, double height) const {
    constexpr double most = std::numeric_limits<std::int32_t>::max();
    if (width > most || height > most) return Held{nullptr};
    Held made{
        CreatePictureThroughFactory(&Asked, std::int32_t(width), std::int32_t(height), source.ImageFormat)};
    if (!made) return made;
    PictureData& data = made.Data();
    if (!Usable(data) || data.Width < width || data.Height < height || !HasPlanes(Of, data, true) ||
        !RowsAreApart(data) || SharePixels(data, source) || SharePixels(data, Base) ||
        SharePixels(data, Asked))
      return Held{nullptr};
    MayYield(data);
    return made;
  }
  Shear Between(PictureData& from, PictureData& into) const {
    return {from, into, PlanesOf(Of, from), PlanesOf(Of, into), Background};
  }

  bool FirstShear(PictureData& into) const {
    const double h = Base.Height;
    const Buffer shifts =
        Shifts(Base.Height, [&](std::int32_t y) { return T >= 0 ? T * (y + 0.5) : T * (y - h + 0.5); });
    return shifts && ShearRows(Between(Base, into), In(shifts), Base.Height);
  }
  bool SecondShear(PictureData& from, PictureData& into) const {
    const double w = Base.Width;
    double distance = S > 0 ? S * (w - 1) : -S * (w - from.Width);
    const Buffer shifts =
        Shifts(from.Width, [&](std::int32_t) { return std::exchange(distance, distance - S); });
    return shifts && ShearColumns(Between(from, into), In(shifts));
  }
  bool ThirdShear(PictureData& from, PictureData& into, std::int32_t height) const {
    const double w = Base.Width;
    double distance = S >= 0 ? S * (w - 1) * -T : T * -(S * (w - 1) - (1.0 - height));
    const Buffer shifts = Shifts(height, [&](std::int32_t) { return std::exchange(distance, distance + T); });
    return shifts && ShearRows(Between(from, into), In(shifts), height);
  }

  const PictureData& Asked;
  PictureData& Base;
  Group Of;
  std::array<Sample, 5> Background;
  double S, T, C;
};

/// Within 0 to 360, by whole turns. 360 itself is what a tiny negative angle is rounded to.
double Normalised(double angle) {
  angle = std::fmod(angle, 360.0);
  return angle < 0 ? angle + 360 : angle;
}

}

PictureZOR* Rotate(PictureZOR* self, Double angle, Integer Red, Integer Green, Integer Blue, Integer Alpha,
                   Integer Gray, Integer Cyan, Integer Magenta, Integer Yellow, Integer Black) {
  if (!std::isfinite(angle)) return nullptr;
  angle = Normalised(angle);
  if (angle == 0) return Locked(self);
  if (angle == 90) return Rotate90(self, nullptr);
  if (angle == 180) return Rotate180(self, nullptr);
  if (angle == 270) return Rotate270(self, nullptr);

  // The exact turns have no alpha to blend and no background.
  Held base{nullptr};
  if (angle > 45 && angle <= 135) {
    base = Held{Rotate90(self, nullptr)};
    angle -= 90;
  } else if (angle > 135 && angle <= 225) {
    base = Held{Rotate180(self, nullptr)};
    angle -= 180;
  } else if (angle > 225 && angle <= 315) {
    base = Held{Rotate270(self, nullptr)};
    angle -= 270;
  } else {
    base = Held{Locked(self)};
  }
  if (!base) return nullptr;
  const auto background = [&]() -> std::array<Sample, 5> {
    switch (FamilyOf(base.Data())) {
      case Family::None: break;
      case Family::Gray: return {Sample(Gray), Sample(Alpha)};
      case Family::RGB: return {Sample(Red), Sample(Green), Sample(Blue), Sample(Alpha)};
      case Family::CMYK: return {Sample(Cyan), Sample(Magenta), Sample(Yellow), Sample(Black), Sample(Alpha)};
    }
    return {};
  }();
  if (FamilyOf(base.Data()) == Family::None) return nullptr;
  return Rotation(DataOf(self), base.Data(), angle, background).Run();
}

}
