#include <cmath>

#include "filter_operation.h"

namespace picturezor::steps {

const Step Blur{
    .Name = "filter blur",
    .Help = "Box blur: the mean of a square around each sample",
    .Options = {{.Name = "radius",
                 .Of = Kind::Number,
                 .Help = "Radius in whole pixels",
                 .Least = 1,
                 .Most = 1e6,
                 .Default = "3"},
                {.Name = "iterations",
                 .Of = Kind::Integer,
                 .Help = "Number of passes; 3 approximate a Gaussian blur",
                 .Least = 1,
                 .Most = 1000,
                 .Default = "1"},
                {.Name = "only-horizontal", .Of = Kind::Flag, .Help = "Blur along rows only"},
                {.Name = "only-vertical",
                 .Of = Kind::Flag,
                 .Help = "Blur along columns only",
                 .Excludes = {"only-horizontal"}}},
    .Make = [](const Values& values, const Surroundings&) {
      const double radius = values.Number("radius");
      const std::int32_t iterations = values.Integer("iterations");
      const bool down = !values.Flag("only-horizontal"), along = !values.Flag("only-vertical");
      const std::int32_t reach = down ? Rows(std::trunc(radius) * iterations) : 0;
      return MakeFilter(
          {.Name = "blur", .Needs = {.Of = flow::Dependence::Kind::Bands, .Reach = reach}, .Pictures = 3},
          [=](const Picture& colours) { return colours.BoxBlurFilter({}, radius, iterations, down, along); });
    }};

}
