#include <map>

#include "all_steps.h"
#include "in_format.h"

namespace picturezor::steps {

namespace {

const std::map<std::string, Format> Formats{{"gray", Format::G},
                                            {"graya", Format::GA},
                                            {"rgb", Format::RGB},
                                            {"rgba", Format::RGBA},
                                            {"cmyk", Format::CMYK}};

/// Without a format all stays as it is.
class Converting final : public flow::Operation {
 public:
  explicit Converting(std::optional<Format> to) : To(to) {}

  flow::Shape Result(const flow::Shape& source) const override {
    flow::Shape result = source;
    result.Of = To.value_or(source.Of);
    if (!files::Convertible(source.Of, result.Of))
      throw Unserved(files::Describe(source.Of) + " can't be converted to " + files::Describe(result.Of));
    return result;
  }
  flow::Dependence DependsOn(const flow::Shape&) const override {
    return {.Of = flow::Dependence::Kind::Bands, .KeepsSource = true};
  }
  Picture Apply(Picture source, const flow::Workplace& at) const override {
    return To ? flow::InFormat(*To).Apply(std::move(source), at) : source;
  }

 private:
  const std::optional<Format> To;
};

}

const Step Convert{
    .Name = "convert",
    .Help = "Change the file type or the pixel format",
    .More =
        "Gray converts to and from every format; RGB and CMYK don't convert to each other. Gray becomes\n"
        "the black channel of CMYK, and CMYK becomes gray from its black channel alone.",
    .Examples = {"convert scan.tif -o scan.png", "convert photo.jpg --format gray -o gray.tif"},
    .Options = {{.Name = "format",
                 .Of = Kind::Choice,
                 .Help = "Pixel format; that of the input by default",
                 .Choices = {"gray", "graya", "rgb", "rgba", "cmyk"}}},
    .Make = [](const Values& values, const Surroundings&) -> std::unique_ptr<const flow::Operation> {
      return std::make_unique<Converting>(
          values.Has("format") ? std::optional(Formats.at(values.Text("format"))) : std::nullopt);
    }};

}
