#include "filter_operation.h"

namespace picturezor::steps {

namespace {

std::vector<std::int32_t> TableOf(const char* name, const Values& values) {
  const Integers& numbers = values.Get<Integers>(name);
  if (numbers.size() > 256)
    throw files::UsageFailure(std::string("--") + name + ": a table has at most 256 numbers");
  return {numbers.begin(), numbers.end()};
}

}

const Step Transfer{
    .Name = "filter transfer",
    .Help = "Map samples through lookup tables",
    .Options = {{.Name = "table",
                 .Of = Kind::IntegersOrFile,
                 .Help = "Lookup table for all colour channels: new values for the samples 0 to 255, in the\n"
                         "option or in a file; missing ones are 0. Excludes --red, --green and --blue"},
                {.Name = "red",
                 .Of = Kind::IntegersOrFile,
                 .Help = "Lookup table for red, as for --table; needs --green and --blue too"},
                {.Name = "green",
                 .Of = Kind::IntegersOrFile,
                 .Help = "Lookup table for green, as for --table; needs --red and --blue too"},
                {.Name = "blue",
                 .Of = Kind::IntegersOrFile,
                 .Help = "Lookup table for blue, as for --table; needs --red and --green too"}},
    .Make = [](const Values& values, const Surroundings&) {
      const int channels = values.Has("red") + values.Has("green") + values.Has("blue");
      if (values.Has("table") == (channels > 0))
        throw files::UsageFailure("give --table, or --red, --green and --blue");
      if (channels % 3 != 0) throw files::UsageFailure("give --red, --green and --blue together");
      const FilterRules rules{.Name = "transfer",
                              .Groups = Serves::GrayAndRGB,
                              .NotForGray = channels > 0 ? "for a gray image, give --table" : nullptr};
      if (channels == 0)
        return MakeFilter(rules, [table = TableOf("table", values)](const Picture& colours) {
          return colours.TransferFilter(colours, IntegerArray(table));
        });
      return MakeFilter(rules, [red = TableOf("red", values), green = TableOf("green", values),
                                blue = TableOf("blue", values)](const Picture& colours) {
        return colours.TransferFilter(colours, IntegerArray(red), IntegerArray(green), IntegerArray(blue));
      });
    }};

}
