#include "filter_operation.h"

namespace picturezor::steps {

const Step Oil{.Name = "filter oil",
               .Help = "Oil painting: take the most frequent colour in the neighbourhood",
               .Options = {{.Name = "range",
                            .Of = Kind::Integer,
                            .Help = "Radius of the neighbourhood in pixels",
                            .Least = 0,
                            .Most = 100,
                            .Default = "3"},
                           {.Name = "levels",
                            .Of = Kind::Integer,
                            .Help = "Number of levels per channel that are distinguished",
                            .Least = 1,
                            .Most = 256,
                            .Default = "32"}},
               .Make = [](const Values& values, const Surroundings&) {
                 return MakeFilter(
                     {.Name = "oil",
                      .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = values.Integer("range")},
                      .Pictures = 2},
                     [levels = values.Integer("levels"), range = values.Integer("range")](
                         const Picture& colours) { return colours.OilFilter({}, levels, range); });
               }};

}
