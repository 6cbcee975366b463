#include <CLI/CLI.hpp>

#include "failure.h"
#include "session.h"

namespace picturezor::cli {

namespace {

struct CropOptions {
  std::filesystem::path In, Out;
  std::string Rectangle;
};

int Crop(Session& session, const CropOptions& options) {
  const auto numbers = ParseNumbers("--rect", options.Rectangle, ',', 4);
  const std::int64_t x = numbers[0], y = numbers[1], width = numbers[2], height = numbers[3];
  if (width < 1 || height < 1) throw UsageFailure("--rect: a size is 1 or more");
  Target target(session, options.Out);
  OpenedImage source(session, options.In);
  const PictureSize size = source.Size();
  if (x < 0 || y < 0 || x > size.Width - width || y > size.Height - height)
    throw Failure(options.In, "the rectangle " + options.Rectangle + " doesn't lie within " +
                                  std::to_string(size.Width) + " x " + std::to_string(size.Height));
  const Format format = target.Storable(session, size.Of);
  target.Start(width, height);
  source.Limit({std::int32_t(x), std::int32_t(y), std::int32_t(width), std::int32_t(height)});
  target.Carry(session, source, {}, format);
  target.Commit();
  return Done;
}

}

void AddCrop(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("crop", "Cut out a rectangle");
  command->footer("Example:\n  picturezor crop photo.jpg --rect 100,50,640,480 -o part.jpg");
  auto options = std::make_shared<CropOptions>();
  command->add_option("IN", options->In, "Image to read: PNG, JPEG or TIFF")->required()->type_name("");
  command->add_option("--rect", options->Rectangle, "What to cut out, counted from the top left corner")
      ->required()
      ->type_name("X,Y,W,H");
  command->add_option("-o,--output", options->Out, "Image to write; the name's ending says its type")
      ->required()
      ->type_name("OUT");
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Crop(session, *options); }; });
}

}
