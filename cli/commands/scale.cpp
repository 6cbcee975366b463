#include <CLI/CLI.hpp>
#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <map>

#include "failure.h"
#include "picturezor/host.h"
#include "session.h"

namespace picturezor::cli {

namespace {

struct ScaleOptions {
  std::filesystem::path In, Out;
  std::int64_t Width = 0, Height = 0;
  std::string Fit;
  double Percent = 0;
  std::string KernelName = "lanczos3";
  int Threads = 0;
  bool Fast = false;
};

const std::map<std::string, Kernel> Kernels{{"triangle", Kernel::Triangle}, {"box", Kernel::Box},
                                            {"lanczos3", Kernel::Lanczos3}, {"lanczos8", Kernel::Lanczos8},
                                            {"mitchell", Kernel::Mitchell}, {"poly3", Kernel::Poly3},
                                            {"cubic", Kernel::Cubic}};

/// The size asked for; a side that isn't given follows the other.
PictureSize ResultSize(const ScaleOptions& options, const ImageInfo& source, Format format) {
  double width = double(options.Width), height = double(options.Height);
  if (!options.Fit.empty()) {
    const auto box = ParseNumbers("--fit", options.Fit, 'x', 2);
    if (box[0] < 1 || box[1] < 1) throw UsageFailure("--fit: " + options.Fit + ": a size is 1 or more");
    const double factor = std::min(double(box[0]) / source.Width, double(box[1]) / source.Height);
    width = source.Width * factor;
    height = source.Height * factor;
  } else if (options.Percent > 0) {
    width = source.Width * options.Percent / 100;
    height = source.Height * options.Percent / 100;
  } else if (options.Height == 0) {
    height = width * source.Height / source.Width;
  } else if (options.Width == 0) {
    width = height * source.Width / source.Height;
  }
  constexpr double most = 4e8;
  if (width > most || height > most) throw UsageFailure("the size asked for is too large");
  return {std::max(1, int(std::lround(width))), std::max(1, int(std::lround(height))), format};
}

int Scale(Session& session, const ScaleOptions& options) {
  if (options.Width == 0 && options.Height == 0 && options.Fit.empty() && options.Percent == 0)
    throw UsageFailure("scale: give --width, --height, --fit or --percent");
  Target target(session, options.Out);
  OpenedImage source(session, options.In);
  const Format format = target.Storable(session, source.Upright.Pixels);
  if (options.Fast && format == Format::CMYK) throw Failure(options.In, "--fast has no way for CMYK");
  const PictureSize size = ResultSize(options, source.Upright, format);
  target.Start(size.Width, size.Height);
  const auto scale = [&](const Picture& picture, const flow::Workplace& at) {
    const Picture scaled = MakePictures(at.Stores, {size})[0];
    if (session.Bar.Shown()) scaled.SetYieldTicks(6);
    const bool done = options.Fast ? scaled.ScaleFast(picture, size.Width, size.Height)
                                   : scaled.ScaleMT(at.Threads > 1 ? at.Threads : -1, picture, {},
                                                    Kernels.at(options.KernelName), size.Width, size.Height);
    if (!done) throw Failure(options.In, "it can't be scaled");
    return scaled;
  };
  const auto reshape = [&](flow::Shape& shape) {
    shape.Width = size.Width;
    shape.Height = size.Height;
    shape.Of = size.Of;
  };
  target.Carry(session, source, ChainOf({.Of = flow::Dependence::Kind::InOrder}, 2, scale, reshape), format,
               options.Threads);
  target.Commit();
  return Done;
}

}

void AddScale(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("scale", "Scale an image");
  command->footer(
      "Examples:\n"
      "  picturezor scale photo.jpg --width 800 -o small.jpg\n"
      "  picturezor scale photo.png --fit 1920x1080 --kernel mitchell -o screen.png\n"
      "  picturezor scale map.tif --percent 12.5 --memory-limit 256M -o overview.tif");
  auto options = std::make_shared<ScaleOptions>();
  command->add_option("IN", options->In, "Image to read: PNG, JPEG or TIFF")->required()->type_name("");
  command->add_option("-o,--output", options->Out, "Image to write; the name's ending says its type")
      ->required()
      ->type_name("OUT");
  const auto size = CLI::Range(std::int64_t{1}, std::int64_t{400'000'000});
  CLI::Option* width =
      command->add_option("--width", options->Width, "Columns; without --height it follows")->check(size);
  CLI::Option* height =
      command->add_option("--height", options->Height, "Rows; without --width it follows")->check(size);
  CLI::Option* fit =
      command->add_option("--fit", options->Fit, "The largest size within this, as 1920x1080; enlarges too")
          ->type_name("WxH");
  CLI::Option* percent =
      command->add_option("--percent", options->Percent, "Of both sides")->check([](const std::string& text) {
        const double percent = std::strtod(text.c_str(), nullptr);
        // Not a number is neither.
        return percent >= 1e-6 && percent <= 1e9 ? "" : text + " isn't a percentage";
      });
  width->type_name("N");
  height->type_name("N");
  percent->type_name("P");
  fit->excludes(width)->excludes(height)->excludes(percent);
  percent->excludes(width)->excludes(height);
  CLI::Option* kernel =
      command
          ->add_option("--kernel", options->KernelName,
                       "triangle, box, lanczos3 (default), lanczos8, mitchell, poly3 or cubic")
          ->type_name("NAME")
          ->check(CLI::IsMember(Kernels));
  command
      ->add_option("--threads", options->Threads,
                   "Threads to work on; 0, the default, is one a processor. In temporary files one works")
      ->type_name("N")
      ->check(CLI::Range(0, 32));
  command->add_flag("--fast", options->Fast, "Take the nearest pixels: quick and rough, without a kernel")
      ->excludes(kernel);
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Scale(session, *options); }; });
}

}
