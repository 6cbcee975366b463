#include "filter_operation.h"

namespace picturezor::steps {

const Step Gamma{.Name = "filter gamma",
                 .Help = "Brighten with more than 1, darken with less",
                 .More = "",
                 .Examples = {},
                 .Options = {{.Name = "gamma",
                              .Of = Kind::Numbers,
                              .Help = "One gamma, or those of red, green and blue, as 2.2,1.8,2",
                              .Placeholder = "G",
                              .Least = 1e-6,
                              .Most = 1e6,
                              .Required = true}},
                 .Make = [](const Values& values, const Surroundings&) {
                   const Numbers g = values.Get<Numbers>("gamma");
                   if (g.size() != 1 && g.size() != 3)
                     throw files::UsageFailure("--gamma: give one number, or three with commas");
                   return MakeFilter({.Name = "gamma",
                                      .Groups = Serves::GrayAndRGB,
                                      .NotForGray = g.size() > 1 ? "--gamma: a gray image has one" : nullptr},
                                     [g](const Picture& colours) {
                                       return g.size() == 1 ? colours.GammaFilter(colours, g[0])
                                                            : colours.GammaFilter(colours, g[0], g[1], g[2]);
                                     });
                 }};

}
