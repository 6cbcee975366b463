#include "filter_operation.h"

namespace picturezor::steps {

const Step SoftBlur{.Name = "filter soft-blur",
                    .Help = "Blur by less than a pixel",
                    .Options = {{.Name = "radius",
                                 .Of = Kind::Number,
                                 .Help = "Radius, a fraction of a pixel",
                                 .Least = 0,
                                 .Most = 0.999,
                                 .Default = "0.5"}},
                    .Make = [](const Values& values, const Surroundings&) {
                      return MakeFilter(
                          {.Name = "soft-blur", .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = 1}},
                          [radius = values.Number("radius")](const Picture& colours) {
                            return colours.BoxBlurFractionalFilter(colours, radius);
                          });
                    }};

}
