#include <CLI/CLI.hpp>
#include <map>

#include "failure.h"
#include "session.h"

namespace picturezor::cli {

namespace {

struct ConvertOptions {
  std::filesystem::path In, Out;
  std::string FormatName;
};

const std::map<std::string, Format> Formats{{"gray", Format::G},
                                            {"graya", Format::GA},
                                            {"rgb", Format::RGB},
                                            {"rgba", Format::RGBA},
                                            {"cmyk", Format::CMYK}};

int Convert(Session& session, const ConvertOptions& options) {
  Target target(session, options.Out);
  OpenedImage source(session, options.In);
  const Format from = source.Upright.Pixels;
  const Format asked = options.FormatName.empty() ? from : Formats.at(options.FormatName);
  if (!Convertible(from, asked))
    throw Failure(options.In, "there is no way from " + Describe(from) + " to " + Describe(asked));
  const Format format = target.Storable(session, asked);
  if (WithoutAlpha(from) == Format::CMYK && WithoutAlpha(format) == Format::G)
    session.Note(options.In, "gray is made of the black ink alone");
  target.Start(source.Upright.Width, source.Upright.Height);
  target.Carry(session, source, {}, format);
  target.Commit();
  return Done;
}

}

void AddConvert(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("convert", "Change the file type or the pixel format");
  command->footer(
      "Gray goes to and from everything; RGB and CMYK have no way to each other. Gray becomes black ink,\n"
      "and of CMYK only the black ink becomes gray.\n\n"
      "Examples:\n"
      "  picturezor convert scan.tif -o scan.png\n"
      "  picturezor convert photo.jpg --format gray -o gray.tif");
  auto options = std::make_shared<ConvertOptions>();
  command->add_option("IN", options->In, "Image to read: PNG, JPEG or TIFF")->required()->type_name("");
  command->add_option("-o,--output", options->Out, "Image to write; the name's ending says its type")
      ->required()
      ->type_name("OUT");
  command
      ->add_option("--format", options->FormatName,
                   "gray, graya, rgb, rgba or cmyk; as in the input by default")
      ->type_name("NAME")
      ->check(CLI::IsMember(Formats));
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Convert(session, *options); }; });
}

}
