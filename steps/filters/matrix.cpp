#include <cmath>

#include "filter_operation.h"

namespace picturezor::steps {

const Step Matrix{
    .Name = "filter matrix",
    .Help = "Convolve with a square kernel",
    .Options = {{.Name = "weights",
                 .Of = Kind::IntegersOrFile,
                 .Help =
                     "Square kernel of weights, row by row, in the option or in a file; a weight of 255 or\n"
                     "more leaves its sample out",
                 .Required = true},
                {.Name = "delta",
                 .Of = Kind::Integer,
                 .Help = "Offset that is added to the weighted sum",
                 .Least = -1000000,
                 .Most = 1000000,
                 .Default = "0"},
                {.Name = "scale",
                 .Of = Kind::Number,
                 .Help =
                     "Factor by which the sum with --delta is multiplied; by default 1 divided by the sum\n"
                     "of the weights, or 1 if they add up to 0",
                 .Least = -1e6,
                 .Most = 1e6}},
    .Make = [](const Values& values, const Surroundings&) {
      const Integers& numbers = values.Get<Integers>("weights");
      const std::vector<std::int32_t> weights(numbers.begin(), numbers.end());
      const int side = int(std::lround(std::sqrt(double(weights.size()))));
      if (std::size_t(side) * std::size_t(side) != weights.size() || side > 50)
        throw files::UsageFailure("--weights: " + std::to_string(weights.size()) +
                                  " numbers don't form a square of at most 50 x 50");
      double sum = 0;
      for (const std::int32_t weight : weights) sum += weight < 255 ? weight : 0;
      double scale = values.Has("scale") ? values.Number("scale") : 0;
      if (scale == 0) scale = sum != 0 ? 1 / sum : 1;
      return MakeFilter({.Name = "matrix",
                         .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = side / 2},
                         .Pictures = 2},
                        [=, delta = values.Integer("delta")](const Picture& colours) {
                          return colours.ApplyMatrix({}, side, IntegerArray(weights), delta, scale);
                        });
    }};

}
