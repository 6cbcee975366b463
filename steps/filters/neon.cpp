#include "filter_operation.h"

namespace picturezor::steps {

const Step Neon{
    .Name = "filter neon",
    .Help = "Bright edges on black",
    .Make =
        [](const Values&, const Surroundings&) {
          return MakeFilter({.Name = "neon",
                             .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = 1},
                             .LooksBehindRows = true},
                            [](const Picture& colours) { return colours.NeonFilter(colours); });
        },
};

}
