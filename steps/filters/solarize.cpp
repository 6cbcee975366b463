#include "filter_operation.h"

namespace picturezor::steps {

const Step Solarize{
    .Name = "filter solarize",
    .Help = "Make dark and bright tones bright, and midtones dark",
    .Make =
        [](const Values&, const Surroundings&) {
          return MakeFilter({.Name = "solarize"},
                            [](const Picture& colours) { return colours.SolarizeFilter(colours); });
        },
};

}
