#include <cmath>

#include "filter_operation.h"

namespace picturezor::steps {

const Step Unsharp{
    .Name = "filter unsharp",
    .Help = "Unsharp mask: sharpen by the difference from a blurred copy",
    .Options = {{.Name = "radius",
                 .Of = Kind::Number,
                 .Help = "Radius of the blur, in whole pixels",
                 .Least = 1,
                 .Most = 1e6,
                 .Default = "3"},
                {.Name = "amount",
                 .Of = Kind::Number,
                 .Help = "Factor by which the difference is added",
                 .Least = -1,
                 .Most = 1000,
                 .Default = "1"},
                {.Name = "threshold",
                 .Of = Kind::Integer,
                 .Help = "Samples that differ by less than this from the blurred copy aren't changed",
                 .Least = 0,
                 .Most = 256,
                 .Default = "0"}},
    .Make = [](const Values& values, const Surroundings&) {
      // Three passes make nearly a bell of the box.
      constexpr int passes = 3;
      const double radius = values.Number("radius"), amount = values.Number("amount") / 4;
      const std::int32_t reach = passes * Rows(std::trunc(radius));
      return MakeFilter(
          {.Name = "unsharp", .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = reach}, .Pictures = 3},
          [=, threshold = values.Integer("threshold")](const Picture& colours) {
            const Picture blurred = colours.BoxBlurFilter({}, radius, passes);
            return blurred && colours.UnsharpFilter(blurred, amount, threshold) ? colours : Picture();
          });
    }};

}
