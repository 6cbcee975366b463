#include <numeric>

#include "filter_operation.h"

namespace picturezor::steps {

namespace {

/// What becomes of all samples: to find it out costs as much as to filter a picture of some size.
std::vector<std::int32_t> TableOf(double gamma) {
  const Picture ramp(256, 1, Format::G);
  Bytes samples(256);
  std::iota(samples.begin(), samples.end(), std::uint8_t{0});
  ramp.SetRowInFormat(0, Format::G, samples);
  if (!ramp.GammaFilter(ramp, gamma)) throw files::Failure("this gamma can't be applied");
  samples = ramp.RowInFormat(0, Format::G);
  return {samples.begin(), samples.end()};
}

}

const Step Gamma{.Name = "filter gamma",
                 .Help = "Correct the gamma: above 1 brightens, below 1 darkens",
                 .Options = {{.Name = "gamma",
                              .Of = Kind::Numbers,
                              .Help = "One gamma, or one each for red, green and blue, such as 2.2,1.8,2",
                              .Placeholder = "G",
                              .Least = 1e-6,
                              .Most = 1e6,
                              .Required = true}},
                 .Make = [](const Values& values, const Surroundings&) {
                   const Numbers g = values.Get<Numbers>("gamma");
                   if (g.size() != 1 && g.size() != 3)
                     throw files::UsageFailure("--gamma: give one number, or three separated by commas");
                   return MakeFilter({.Name = "gamma",
                                      .Groups = Serves::GrayAndRGB,
                                      .NotForGray = g.size() > 1 ? "--gamma: a gray image has one" : nullptr},
                                     [red = TableOf(g[0]), green = TableOf(g[g.size() / 2]),
                                      blue = TableOf(g.back())](const Picture& colours) {
                                       if (colours.IsGray())
                                         return colours.TransferFilter(colours, IntegerArray(red));
                                       return colours.TransferFilter(colours, IntegerArray(red),
                                                                     IntegerArray(green), IntegerArray(blue));
                                     });
                 }};

}
