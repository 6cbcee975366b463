#include <algorithm>
#include <cmath>
#include <map>

#include "all_steps.h"
#include "scale_passes.h"

namespace picturezor::steps {

namespace {

const std::map<std::string, Kernel> Kernels{{"triangle", Kernel::Triangle}, {"box", Kernel::Box},
                                            {"lanczos3", Kernel::Lanczos3}, {"lanczos8", Kernel::Lanczos8},
                                            {"mitchell", Kernel::Mitchell}, {"poly3", Kernel::Poly3},
                                            {"cubic", Kernel::Cubic}};
constexpr double MostSide = 4e8;

class Scaling final : public flow::Operation {
 public:
  explicit Scaling(const Values& values) {
    if (values.Has("width")) Width = values.Integer("width");
    if (values.Has("height")) Height = values.Integer("height");
    if (values.Has("fit")) Fit = values.Get<Integers>("fit");
    if (values.Has("percent")) Percent = values.Number("percent");
    Fast = values.Flag("fast");
    Drafts = values.Flag("draft");
    By = Kernels.at(values.Text("kernel"));
  }

  flow::Shape Result(const flow::Shape& source) const override {
    if (Fast && source.Of == Format::CMYK) throw Unserved("--fast doesn't support CMYK");
    double width = Width, height = Height;
    if (!Fit.empty()) {
      const double factor = std::min(double(Fit[0]) / source.Width, double(Fit[1]) / source.Height);
      width = source.Width * factor;
      height = source.Height * factor;
    } else if (Percent > 0) {
      width = source.Width * Percent / 100;
      height = source.Height * Percent / 100;
    } else if (Height == 0) {
      height = width * source.Height / source.Width;
    } else if (Width == 0) {
      width = height * source.Width / source.Height;
    }
    if (width > MostSide || height > MostSide) throw files::UsageFailure("the requested size is too large");
    flow::Shape result = source;
    result.Width = std::max(1, int(std::lround(width)));
    result.Height = std::max(1, int(std::lround(height)));
    return result;
  }
  flow::Dependence DependsOn(const flow::Shape&) const override {
    return {.Of = flow::Dependence::Kind::InOrder};
  }
  std::optional<flow::Draft> Drafted(const flow::Shape& source) const override {
    if (!Drafts) return std::nullopt;
    const flow::Shape size = Result(source);
    constexpr std::int32_t smaller = 2;
    if (size.Width > source.Width / smaller || size.Height > source.Height / smaller) return std::nullopt;
    auto rest = std::make_unique<Scaling>(*this);
    rest->Fit.clear();
    rest->Percent = 0;
    rest->Width = size.Width;
    rest->Height = size.Height;
    return flow::Draft{{smaller * size.Width, smaller * size.Height}, std::move(rest)};
  }
  std::vector<std::unique_ptr<const flow::Operation>> Parts(const flow::Shape& source) const override {
    if (Fast) return {};
    const flow::Shape size = Result(source);
    return flow::ScalePasses(By, size.Width, size.Height);
  }
  Picture Apply(Picture source, const flow::Workplace& at) const override {
    const flow::Shape size = Result({source.Width(), source.Height(), source.ImageFormat(), {}});
    const Picture scaled = files::MakePictures(at.Stores, {{size.Width, size.Height, size.Of}})[0];
    // What stands between the two passes can't be mapped, as that of a step before may be.
    source.SetFactory({});
    const bool done =
        Fast ? scaled.ScaleFast(source, size.Width, size.Height)
             : scaled.ScaleMT(at.Threads > 1 ? at.Threads : -1, source, {}, By, size.Width, size.Height);
    if (!done) throw Unserved("it can't be scaled");
    return scaled;
  }

 private:
  double Width = 0, Height = 0, Percent = 0;
  Integers Fit;
  bool Fast = false, Drafts = false;
  Kernel By = Kernel::Lanczos3;
};

}

const Step Scale{
    .Name = "scale",
    .Help = "Scale an image",
    .Examples = {"scale photo.jpg --width 800 -o small.jpg",
                 "scale photo.png --fit 1920x1080 --kernel mitchell -o screen.png",
                 "scale map.tif --percent 12.5 --memory-limit 256M -o overview.tif"},
    .Options = {{.Name = "width",
                 .Of = Kind::Integer,
                 .Help = "Width in pixels; without --height, the height keeps the aspect ratio",
                 .Least = 1,
                 .Most = MostSide},
                {.Name = "height",
                 .Of = Kind::Integer,
                 .Help = "Height in pixels; without --width, the width keeps the aspect ratio",
                 .Least = 1,
                 .Most = MostSide},
                {.Name = "fit",
                 .Of = Kind::Size,
                 .Help = "Fit within this size, such as 1920x1080; also enlarges",
                 .Excludes = {"width", "height", "percent"}},
                {.Name = "percent",
                 .Of = Kind::Number,
                 .Help = "Percentage of the width and the height",
                 .Placeholder = "P",
                 .Least = 1e-6,
                 .Most = 1e9,
                 .Excludes = {"width", "height"}},
                {.Name = "kernel",
                 .Of = Kind::Choice,
                 .Help = "Resampling kernel",
                 .Default = "lanczos3",
                 .Choices = {"triangle", "box", "lanczos3", "lanczos8", "mitchell", "poly3", "cubic"}},
                {.Name = "fast",
                 .Of = Kind::Flag,
                 .Help = "Take the nearest pixel, without a kernel: fast, but rough",
                 .Excludes = {"kernel"}},
                {.Name = "draft",
                 .Of = Kind::Flag,
                 .Help =
                     "Start from a reduced image at least twice as large as the result, where the type has\n"
                     "one: JPEG and JPEG 2000 are decoded at a reduced size, TIFF files and slides may\n"
                     "hold smaller copies. Faster, but not bit-exact; no effect after another step"}},
    .Make = [](const Values& values, const Surroundings&) -> std::unique_ptr<const flow::Operation> {
      if (!values.Has("width") && !values.Has("height") && !values.Has("fit") && !values.Has("percent"))
        throw files::UsageFailure("give --width, --height, --fit or --percent");
      return std::make_unique<Scaling>(values);
    }};

}
