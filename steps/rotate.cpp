#include <cmath>

#include "all_steps.h"
#include "made_pictures.h"

namespace picturezor::steps {

namespace {

constexpr double Pi = 3.141592653589793;

class Rotating final : public flow::Operation {
 public:
  /// What fills the corners: the colour, its luma in gray pictures, no ink on paper that is white; and
  /// nothing where there is alpha.
  Rotating(double angle, Color colour)
      : Angle(angle), Corners{.Red = colour.Red, .Green = colour.Green, .Blue = colour.Blue} {
    Corners.Gray = (colour.Red * 77 + colour.Green * 151 + colour.Blue * 28) >> 8;
    Corners.Black = 255 - Corners.Gray;
  }

  flow::Shape Result(const flow::Shape& source) const override {
    // Quarters of a turn, and within 45 degrees what is left.
    const double angle = Within360();
    const int quarters = angle > 315 ? 0 : int(std::ceil((angle - 45) / 90));
    const double rest = angle - 90 * quarters;
    flow::Shape result = source;
    if (quarters % 2 == 1) {
      std::swap(result.Width, result.Height);
      if (rest == 0 && result.Density) std::swap(result.Density->X, result.Density->Y);
    }
    if (rest == 0) return result;
    const double s = std::fabs(std::sin(rest * Pi / 180)), c = std::cos(rest * Pi / 180);
    const double width = std::trunc(result.Height * s + result.Width * c) + 1,
                 height = std::trunc(result.Width * s + result.Height * c) + 1;
    if (width > INT32_MAX || height > INT32_MAX) throw Unserved("it can't be rotated");
    result.Width = std::int32_t(width);
    result.Height = std::int32_t(height);
    return result;
  }
  flow::Dependence DependsOn(const flow::Shape&) const override {
    // By nothing it is the source itself.
    if (Turns() == 1) return {.Of = flow::Dependence::Kind::Bands};
    return {.KeepsSource = true};
  }
  std::optional<int> Turns() const override {
    const double angle = Within360();
    if (std::fmod(angle, 90) != 0) return std::nullopt;
    constexpr int counterClockwise[] = {1, 8, 3, 6};
    return counterClockwise[int(angle / 90)];
  }
  /// The picture, what it becomes, and what stands between two steps on the way.
  int Pictures() const override { return 4; }
  Picture Apply(Picture source, const flow::Workplace& at) const override {
    const flow::Shape wanted = Result({source.Width(), source.Height(), source.ImageFormat(), {}});
    source.SetFactory(FactoryFor(at.Stores));
    const Picture turned = source.Rotate(Angle, Corners);
    if (!turned || turned.Width() != wanted.Width || turned.Height() != wanted.Height)
      throw Unserved("it can't be rotated");
    return turned;
  }

 private:
  double Within360() const {
    double angle = std::fmod(Angle, 360.0);
    if (angle < 0) angle += 360;
    return angle == 360 ? 0 : angle;
  }

  const double Angle;
  Picture::Background Corners;
};

}

const Step Rotate{
    .Name = "rotate",
    .Help = "Rotate by any angle",
    .More =
        "The direction is counter-clockwise. Multiples of 90 degrees move pixels unchanged; other angles\n"
        "enlarge the image, so that all of it fits, and blur it a little. The corners are transparent if\n"
        "the image has alpha.",
    .Examples = {"rotate scan.tif --angle 90 -o upright.tif",
                 "rotate photo.jpg --angle -2.5 --background ffffff -o straight.jpg"},
    .Options =
        {{.Name = "angle",
          .Of = Kind::Number,
          .Help = "Degrees counter-clockwise; negative is clockwise",
          .Placeholder = "DEGREES",
          .Least = -1e300,
          .Most = 1e300,
          .Required = true},
         {.Name = "background", .Of = Kind::Colour, .Help = "Colour of the corners", .Default = "000000"}},
    .Make = [](const Values& values, const Surroundings&) -> std::unique_ptr<const flow::Operation> {
      return std::make_unique<Rotating>(values.Number("angle"), values.Get<Color>("background"));
    }};

}
