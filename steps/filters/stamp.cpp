#include <cmath>

#include "filter_operation.h"

namespace picturezor::steps {

const Step Stamp{
    .Name = "filter stamp",
    .Help = "Threshold every channel to one of two colours, with a soft edge",
    .Options = {{.Name = "radius",
                 .Of = Kind::Number,
                 .Help = "Radius in pixels of the blur that is applied first; below 3 nothing is blurred",
                 .Least = 0,
                 .Most = 1e6,
                 .Default = "9"},
                {.Name = "threshold",
                 .Of = Kind::Number,
                 .Help = "Level at which the edge lies, as a fraction of full scale (255)",
                 .Least = -10,
                 .Most = 10,
                 .Default = "0.5"},
                {.Name = "softness",
                 .Of = Kind::Number,
                 .Help =
                     "Range of levels across the edge, as a fraction of full scale (255); 0 is a hard edge",
                 .Least = 0,
                 .Most = 10,
                 .Default = "0.2"},
                {.Name = "black",
                 .Of = Kind::Colour,
                 .Help = "The dark colour, such as 202060",
                 .Default = "000000"},
                {.Name = "white", .Of = Kind::Colour, .Help = "The bright colour", .Default = "ffffff"}},
    .Make = [](const Values& values, const Surroundings&) {
      const double radius = values.Number("radius"), threshold = values.Number("threshold"),
                   softness = values.Number("softness");
      // Three blurs by a third.
      const std::int32_t reach = 3 * Rows(std::trunc(radius / 3));
      return MakeFilter({.Name = "stamp",
                         .Groups = Serves::GrayAndRGB,
                         .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = reach},
                         .Pictures = 4},
                        [=, black = values.Get<Color>("black"),
                         white = values.Get<Color>("white")](const Picture& colours) {
                          return colours.StampFilter({}, radius, threshold, softness, black, white);
                        });
    }};

}
