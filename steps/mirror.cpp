#include "all_steps.h"

namespace picturezor::steps {

namespace {

class Mirroring final : public flow::Operation {
 public:
  Mirroring(bool horizontal, bool vertical) : Horizontal(horizontal), Vertical(vertical) {}

  flow::Shape Result(const flow::Shape& source) const override { return source; }
  flow::Dependence DependsOn(const flow::Shape&) const override {
    return {.Of = Vertical ? flow::Dependence::Kind::Whole : flow::Dependence::Kind::Bands};
  }
  std::optional<int> Turns() const override { return !Vertical ? 2 : Horizontal ? 3 : 4; }
  int Pictures() const override { return 1; }
  Picture Apply(Picture source, const flow::Workplace&) const override {
    if (Horizontal) source.HMirror();
    if (Vertical) source.VMirror();
    return source;
  }

 private:
  const bool Horizontal, Vertical;
};

}

const Step Mirror{
    .Name = "mirror",
    .Help = "Swap left and right, or top and bottom",
    .More = "Both together rotate the image by half a turn.",
    .Examples = {"mirror photo.jpg --horizontal -o mirrored.jpg"},
    .Options = {{.Name = "horizontal", .Of = Kind::Flag, .Help = "Swap left and right"},
                {.Name = "vertical", .Of = Kind::Flag, .Help = "Swap top and bottom"}},
    .Make = [](const Values& values, const Surroundings&) -> std::unique_ptr<const flow::Operation> {
      if (!values.Flag("horizontal") && !values.Flag("vertical"))
        throw files::UsageFailure("give --horizontal, --vertical or both");
      return std::make_unique<Mirroring>(values.Flag("horizontal"), values.Flag("vertical"));
    }};

}
