#include <CLI/CLI.hpp>
#include <cmath>

#include "failure.h"
#include "session.h"

// The commands that move pixels: mirror and rotate.

namespace picturezor::cli {

namespace {

struct TurnOptions {
  std::filesystem::path In, Out;
  bool Horizontal = false, Vertical = false;
  double Angle = 0;
  std::string Background = "000000";
};

int Mirror(Session& session, const TurnOptions& options) {
  Target target(session, options.Out);
  OpenedImage source(session, options.In);
  const PictureSize size = source.Size();
  const Format format = target.Storable(session, size.Of);
  target.Start(size.Width, size.Height);
  // Top and bottom change places only in a whole picture.
  const auto kind = options.Vertical ? flow::Dependence::Kind::Whole : flow::Dependence::Kind::Bands;
  const auto mirror = [&](const Picture& picture, const flow::Workplace&) {
    if (options.Horizontal) picture.HMirror();
    if (options.Vertical) picture.VMirror();
    return picture;
  };
  target.Carry(session, source, ChainOf({.Of = kind}, 1, mirror), format);
  target.Commit();
  return Done;
}

/// What fills the corners: the colour, its luma in gray pictures, no ink on paper that is white; and nothing
/// where there is alpha.
Picture::Background BackgroundOf(const TurnOptions& options) {
  const Color colour = ParseColor("--background", options.Background);
  const int gray = (colour.Red * 77 + colour.Green * 151 + colour.Blue * 28) >> 8;
  return {.Red = colour.Red, .Green = colour.Green, .Blue = colour.Blue, .Gray = gray, .Black = 255 - gray};
}

int Rotate(Session& session, const TurnOptions& options) {
  const Picture::Background background = BackgroundOf(options);
  Target target(session, options.Out);
  OpenedImage source(session, options.In);
  const PictureSize size = source.Size();
  const Format format = target.Storable(session, size.Of);
  // The picture, what it becomes, and what stands between two steps on the way.
  StoreOptions stores = session.Stores;
  stores.MemoryLimit /= 4;
  Picture picture = MakePictures(stores, {size})[0];
  source.ReadInto(session, picture);
  {
    session.Bar.Begin("rotating");
    const PicturesLike made(stores);
    picture = picture.Rotate(options.Angle, background);
  }
  if (!picture) throw Failure(options.In, "it can't be rotated");
  target.Start(picture.Width(), picture.Height());
  ImageInfo info = source.Upright;
  const double quarters = std::fmod(std::fabs(options.Angle), 180.0);
  if (info.Density && quarters == 90) std::swap(info.Density->X, info.Density->Y);
  target.Write(session, picture, format, info);
  target.Commit();
  return Done;
}

void AddFiles(CLI::App& command, TurnOptions& options) {
  command.add_option("IN", options.In, "Image to read: PNG, JPEG or TIFF")->required()->type_name("");
  command.add_option("-o,--output", options.Out, "Image to write; the name's ending says its type")
      ->required()
      ->type_name("OUT");
}

}

void AddMirror(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("mirror", "Swap left and right, or top and bottom");
  command->footer(
      "Both together are half a turn.\n\n"
      "Example:\n  picturezor mirror photo.jpg --horizontal -o mirrored.jpg");
  auto options = std::make_shared<TurnOptions>();
  AddFiles(*command, *options);
  command->add_flag("--horizontal", options->Horizontal, "Left for right");
  command->add_flag("--vertical", options->Vertical, "Top for bottom");
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback([&session, options] {
    if (!options->Horizontal && !options->Vertical)
      throw UsageFailure("mirror: give --horizontal, --vertical or both");
    session.Work = [&session, options] { return Mirror(session, *options); };
  });
}

void AddRotate(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("rotate", "Turn by any angle");
  command->footer(
      "Counter-clockwise. Right angles move pixels as they are; others make the image larger, so that all of "
      "it\n"
      "fits, and blur it a little. The corners are transparent where the image has alpha.\n\n"
      "Examples:\n"
      "  picturezor rotate scan.tif --angle 90 -o upright.tif\n"
      "  picturezor rotate photo.jpg --angle -2.5 --background ffffff -o straight.jpg");
  auto options = std::make_shared<TurnOptions>();
  AddFiles(*command, *options);
  command->add_option("--angle", options->Angle, "Degrees counter-clockwise; negative is clockwise")
      ->required()
      ->type_name("DEGREES")
      ->check([](const std::string& text) {
        char* end = nullptr;
        const double angle = std::strtod(text.c_str(), &end);
        return *end == '\0' && std::isfinite(angle) ? "" : text + " isn't an angle";
      });
  command
      ->add_option("--background", options->Background, "Colour of the corners, as ffffff; black by default")
      ->type_name("COLOUR");
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Rotate(session, *options); }; });
}

}
