#include <map>

#include "filter_operation.h"

namespace picturezor::steps {

namespace {

struct Pattern {
  DitherMatrix Of;
  /// Rows after which it comes again.
  std::int32_t Side;
};

const std::map<std::string, Pattern> Patterns{
    {"magic2x2", {DitherMatrix::Magic2x2, 2}},       {"magic4x4", {DitherMatrix::Magic4x4, 4}},
    {"ordered4x4", {DitherMatrix::Ordered4x4, 4}},   {"lines4x4", {DitherMatrix::Lines4x4, 4}},
    {"halftone", {DitherMatrix::Halftone90_6x6, 6}}, {"ordered6x6", {DitherMatrix::Ordered6x6, 6}},
    {"ordered8x8", {DitherMatrix::Ordered8x8, 8}},   {"cluster3", {DitherMatrix::Cluster3, 6}},
    {"cluster4", {DitherMatrix::Cluster4, 8}},       {"cluster8", {DitherMatrix::Cluster8, 16}}};

}

const Step Dither{.Name = "filter dither",
                  .Help = "Ordered dithering to a few levels per channel",
                  .Options = {{.Name = "pattern",
                               .Of = Kind::Choice,
                               .Help = "Threshold pattern",
                               .Default = "ordered4x4",
                               .Choices = {"magic2x2", "magic4x4", "ordered4x4", "ordered6x6", "ordered8x8",
                                           "lines4x4", "halftone", "cluster3", "cluster4", "cluster8"}},
                              {.Name = "levels",
                               .Of = Kind::Integer,
                               .Help = "Levels per channel",
                               .Least = 2,
                               .Most = 256,
                               .Default = "2"}},
                  .Make = [](const Values& values, const Surroundings&) {
                    const auto [matrix, side] = Patterns.at(values.Text("pattern"));
                    return MakeFilter(
                        {.Name = "dither",
                         .Groups = Serves::GrayAndRGB,
                         .Needs = {.Of = flow::Dependence::Kind::Bands, .Period = side}},
                        [matrix = matrix, levels = values.Integer("levels")](const Picture& colours) {
                          return colours.DitherFilter(colours, matrix, levels);
                        });
                  }};

}
