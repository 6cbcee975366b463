#include "filter_operation.h"

namespace picturezor::steps {

const Step Gain{.Name = "filter gain",
                .Help = "Change the contrast and brightness of midtones",
                .Options = {{.Name = "gain",
                             .Of = Kind::Number,
                             .Help = "Contrast of midtones: above 0.5 raises it, below 0.5 lowers it",
                             .Least = 0,
                             .Most = 1,
                             .Default = "0.5"},
                            {.Name = "bias",
                             .Of = Kind::Number,
                             .Help = "Brightness of midtones: above 0.5 raises it, below 0.5 lowers it",
                             .Least = 1e-6,
                             .Most = 1,
                             .Default = "0.5"}},
                .Make = [](const Values& values, const Surroundings&) {
                  return MakeFilter(
                      {.Name = "gain", .Groups = Serves::GrayAndRGB},
                      [gain = values.Number("gain"), bias = values.Number("bias")](const Picture& colours) {
                        return colours.GainFilter(colours, gain, bias);
                      });
                }};

}
