#include <cstdlib>

#include "filter_operation.h"

namespace picturezor::steps {

const Step Engrave{.Name = "filter engrave",
                   .Help = "Emboss: a gray relief of the edges",
                   .Options = {{.Name = "level",
                                .Of = Kind::Integer,
                                .Help = "Depth of the relief in pixels",
                                .Least = -10000,
                                .Most = 10000,
                                .Default = "1"}},
                   .Make = [](const Values& values, const Surroundings&) {
                     const std::int32_t level = values.Integer("level");
                     return MakeFilter(
                         {.Name = "engrave",
                          .Groups = Serves::GrayAndRGB,
                          .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = std::abs(level)},
                          .Pictures = 2},
                         [level](const Picture& colours) { return colours.EngraveFilter({}, level); });
                   }};

}
