#include "filter_operation.h"

namespace picturezor::steps {

const Step Solarize{.Name = "filter solarize",
                    .Help = "Dark and bright become bright, the middle dark",
                    .More = "",
                    .Examples = {},
                    .Options = {},
                    .Make = [](const Values&, const Surroundings&) {
                      return MakeFilter({.Name = "solarize"}, [](const Picture& colours) {
                        return colours.SolarizeFilter(colours);
                      });
                    }};

}
