#include <cmath>

#include "filter_operation.h"

namespace picturezor::steps {

const Step Blur{
    .Name = "filter blur",
    .Help = "The mean of a square around each sample",
    .More = "",
    .Examples = {},
    .Options = {{.Name = "radius",
                 .Of = Kind::Number,
                 .Help = "In whole pixels",
                 .Least = 1,
                 .Most = 1e6,
                 .Default = "3"},
                {.Name = "iterations",
                 .Of = Kind::Integer,
                 .Help = "3 are nearly a bell",
                 .Least = 1,
                 .Most = 1000,
                 .Default = "1"},
                {.Name = "only-horizontal", .Of = Kind::Flag, .Help = "Along rows alone"},
                {.Name = "only-vertical",
                 .Of = Kind::Flag,
                 .Help = "Along columns alone",
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
