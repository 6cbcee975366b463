#include "filter_operation.h"

namespace picturezor::steps {

const Step Diffuse{.Name = "filter diffuse",
                   .Help = "Scatter the pixels",
                   .Options = {{.Name = "level",
                                .Of = Kind::Integer,
                                .Help = "Largest distance in pixels",
                                .Least = 0,
                                .Most = 10000,
                                .Default = "4"}},
                   .Make = [](const Values& values, const Surroundings&) {
                     // Its random numbers come in the order of the pixels.
                     return MakeFilter(
                         {.Name = "diffuse", .Groups = Serves::GrayAndRGB, .Needs = {}, .Pictures = 2},
                         [level = values.Integer("level")](const Picture& colours) {
                           return colours.DiffuseFilter({}, level);
                         });
                   }};

}
