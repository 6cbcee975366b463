#include <algorithm>

#include "all_steps.h"

namespace picturezor::steps {

std::span<const Step* const> Steps() {
  static const Step* const all[] = {
      &Scale,    &Crop,  &Convert, &Mirror,   &Rotate, &Combine, &Invert,   &AutoLevel,
      &Solarize, &Gamma, &Gain,    &Transfer, &Matrix, &Blur,    &SoftBlur, &Stamp,
      &Unsharp,  &Oil,   &Diffuse, &Engrave,  &Neon,   &Dither,
  };
  return all;
}

std::span<const Group> Groups() {
  static const Group groups[] = {
      {"filter",
       "Change the colours of an image, blur or sharpen it",
       "Alpha isn't changed.",
       {"filter gamma photo.jpg --gamma 1.4 -o brighter.jpg",
        "filter unsharp photo.jpg --radius 2 --amount 0.8 -o sharper.jpg",
        "filter matrix photo.png --weights 0,-1,0,-1,5,-1,0,-1,0 -o crisp.png",
        "filter dither scan.png --pattern cluster4 -o print.png"}},
  };
  return groups;
}

const Step* FindStep(std::string_view name) {
  const auto steps = Steps();
  const auto found =
      std::ranges::find(steps, name, [](const Step* step) { return std::string_view(step->Name); });
  return found == steps.end() ? nullptr : *found;
}

std::unique_ptr<const flow::Operation> MakeOperation(const Step& step, std::map<std::string, Value> values,
                                                     const Surroundings& around) {
  const auto given = [&](const std::string& name) {
    const auto at = values.find(name);
    return at != values.end() && at->second != Value(false);
  };
  for (const auto& [name, value] : values)
    if (std::ranges::find(step.Options, name, &Option::Name) == step.Options.end())
      throw files::UsageFailure("it has no option --" + name);
  for (const Option& option : step.Options) {
    if (option.Required && !given(option.Name)) throw files::UsageFailure(option.Shown() + " is required");
    for (const char* other : option.Excludes)
      if (given(option.Name) && given(other))
        throw files::UsageFailure(option.Shown() + " and --" + other + " can't be used together");
  }
  for (const Option& option : step.Options) {
    if (!values.contains(option.Name) && !option.Default.empty())
      values[option.Name] = ParseValue(option, option.Default);
    if (const auto at = values.find(option.Name); at != values.end())
      at->second = Checked(option, std::move(at->second));
  }
  return step.Make(Values(std::move(values)), around);
}

std::unique_ptr<const flow::Operation> MakeOperation(const Step& step,
                                                     const std::map<std::string, std::string>& texts,
                                                     const Surroundings& around) {
  std::map<std::string, Value> values;
  for (const auto& [name, text] : texts) {
    const auto option = std::ranges::find(step.Options, name, &Option::Name);
    if (option == step.Options.end()) throw files::UsageFailure("it has no option --" + name);
    values[name] = ParseValue(*option, text);
  }
  return MakeOperation(step, std::move(values), around);
}

}
