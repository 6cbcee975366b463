#include <CLI/CLI.hpp>
#include <algorithm>
#include <map>

#include "failure.h"
#include "small_picture.h"

namespace picturezor::cli {

namespace {

using std::filesystem::path;

struct ThumbnailOptions {
  std::vector<path> In;
  path Directory;
  std::int32_t Size = 0;
};

/// A file for each image. Two of one name, or one that is an image itself, would cost somebody a picture.
std::vector<path> TargetsOf(const ThumbnailOptions& options) {
  std::vector<path> targets;
  std::map<path, path> of;
  for (const path& in : options.In) {
    const path target = options.Directory / in.stem().concat(".png");
    const auto [other, added] = of.emplace(target, in);
    if (!added) throw Failure(in, "its thumbnail would have the name of that of " + other->second.string());
    targets.push_back(target);
  }
  std::error_code missing;
  for (const path& target : targets)
    for (const path& in : options.In)
      if (std::filesystem::equivalent(target, in, missing) && !missing)
        throw Failure(in, "its place would be taken by a thumbnail");
  return targets;
}

void MakeThumbnail(Session& session, const path& in, const path& out, std::int32_t side) {
  OpenedImage image(session, in);
  const double most = std::min(side, std::max(image.Upright.Width, image.Upright.Height));
  const PictureSize size = SizeWithin(image.Size(), most, most);
  Target target(session, out);
  target.Start(size.Width, size.Height);
  const HostPicture small = SmallPicture(session, image, size.Width, size.Height);
  const Format format = small.Mask() ? Format::RGBA : Format::RGB;
  const Picture written(size.Width, size.Height, format);
  written.DrawMaskedPictureRGB(small);
  target.Write(session, written, format, image.Upright);
  target.Commit();
}

int Thumbnail(Session& session, const ThumbnailOptions& options) {
  const std::vector<path> targets = TargetsOf(options);
  std::error_code failed;
  std::filesystem::create_directory(options.Directory, failed);
  if (failed) throw Failure(options.Directory, failed.message());
  for (std::size_t i = 0; i < targets.size(); ++i)
    MakeThumbnail(session, options.In[i], targets[i], options.Size);
  return Done;
}

}

void AddThumbnail(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("thumbnail", "Make a small PNG of each of many images");
  command->footer(
      "Each keeps its proportions; one that is small already keeps its size. Colours become RGB, alpha "
      "stays.\n"
      "Thumbnails are named after their images. At the first one that can't be made the command stops; "
      "those\n"
      "before it stay.\n\n"
      "Example:\n  picturezor thumbnail photos/*.jpg --size 160 -o contacts");
  auto options = std::make_shared<ThumbnailOptions>();
  command->add_option("IN", options->In, "Images to read: PNG, JPEG or TIFF")->required()->type_name("");
  command->add_option("-o,--output", options->Directory, "Directory to write to; made if it isn't there")
      ->required()
      ->type_name("DIR");
  command->add_option("--size", options->Size, "Pixels of the longer side")
      ->required()
      ->type_name("N")
      ->check(CLI::Range(1, 32767));
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Thumbnail(session, *options); }; });
}

}
