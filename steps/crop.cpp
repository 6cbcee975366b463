#include "all_steps.h"

namespace picturezor::steps {

namespace {

class Cropping final : public flow::Operation {
 public:
  explicit Cropping(const Integers& rect)
      : Part{std::int32_t(rect[0]), std::int32_t(rect[1]), std::int32_t(rect[2]), std::int32_t(rect[3])} {}

  flow::Shape Result(const flow::Shape& source) const override {
    if (Part.X < 0 || Part.Y < 0 || Part.X > source.Width - Part.Width ||
        Part.Y > source.Height - Part.Height)
      throw Unserved("the rectangle " + std::to_string(Part.X) + "," + std::to_string(Part.Y) + "," +
                     std::to_string(Part.Width) + "," + std::to_string(Part.Height) + " doesn't lie within " +
                     std::to_string(source.Width) + " x " + std::to_string(source.Height));
    flow::Shape result = source;
    result.Width = Part.Width;
    result.Height = Part.Height;
    return result;
  }
  flow::Dependence DependsOn(const flow::Shape&) const override {
    return {.Of = flow::Dependence::Kind::Bands, .First = Part.Y, .KeepsSource = true};
  }
  int Pictures() const override { return 1; }
  std::optional<Rect> Cuts() const override { return Part; }
  Picture Apply(Picture source, const flow::Workplace&) const override {
    return source.ClipImage({Part.X, 0, Part.Width, source.Height()});
  }

 private:
  const Rect Part;
};

}

const Step Crop{
    .Name = "crop",
    .Help = "Cut out a rectangle",
    .Examples = {"crop photo.jpg --rect 100,50,640,480 -o part.jpg"},
    .Options = {{.Name = "rect",
                 .Of = Kind::Rectangle,
                 .Help = "Rectangle to cut out, from the top left corner",
                 .Required = true}},
    .Make = [](const Values& values, const Surroundings&) -> std::unique_ptr<const flow::Operation> {
      return std::make_unique<Cropping>(values.Get<Integers>("rect"));
    }};

}
