#include <CLI/CLI.hpp>
#include <map>

#include "make_tiles.h"
#include "session.h"
#include "values.h"

namespace picturezor::cli {

namespace {

using tiles::Layout;

struct TilesOptions {
  std::filesystem::path In, Out;
  tiles::TilesOptions Making;
  std::string Background;
};

const std::map<std::string, Layout> Layouts{
    {"deepzoom", Layout::DeepZoom}, {"iiif", Layout::IIIF}, {"xyz", Layout::XYZ}};

constexpr std::int32_t MostParts = 1 << 20;

void SetPart(tiles::TilesOptions& making, const std::string& text) {
  const std::size_t slash = text.find('/');
  const auto number = [](const std::string& digits) {
    int value = 0;
    return CLI::detail::lexical_cast(digits, value) && value >= 1 && value <= MostParts ? value : 0;
  };
  making.Part = number(text.substr(0, slash));
  making.Parts = slash == std::string::npos ? 0 : number(text.substr(slash + 1));
  if (making.Part == 0 || making.Part > making.Parts)
    throw UsageFailure("--part: " + text + " isn't a part like 2/5");
}

int Tiles(Session& session, TilesOptions options) {
  tiles::TilesOptions& making = options.Making;
  if (!options.Background.empty()) {
    const steps::Option colour{.Name = "background", .Of = steps::Kind::Colour, .Help = ""};
    making.Background = std::get<Color>(steps::ParseValue(colour, options.Background));
  }
  making.Writing = session.Writing;
  making.Running = {session.Stores, session.Threads};
  MakeTiles(OpenedImage(session, options.In).Take(session), options.In, options.Out, making, session.Bar);
  return Done;
}

}

void AddTiles(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("tiles", "Make an image pyramid for web viewers");
  command->footer(
      "Each level is half as wide and half as high as the next larger one, but is scaled from the full\n"
      "image, as by `scale`, unless --use-levels is given. The pyramid gets its name when it is complete;\n"
      "until then it is NAME.unfinished, which --resume continues.\n\n"
      "Examples:\n"
      "  picturezor tiles scan.tif -o scan --page\n"
      "  picturezor tiles scan.tif --layout iiif --address https://example.org/iiif -o scan\n"
      "  picturezor tiles map.png --layout xyz --format png --skip-blank -o map\n"
      "  picturezor tiles scan.tif --tile 254 --overlap 1 -o scan.szi\n"
      "  for part in 1 2 3; do picturezor tiles scan.tif -o scan --part $part/3; done\n"
      "  picturezor tiles scan.tif -o scan --join 3");
  auto options = std::make_shared<TilesOptions>();
  command->add_option("IN", options->In, "Image to read")->required()->type_name("");
  command
      ->add_option("-o,--output", options->Out,
                   "Name of the pyramid: a folder, or a ZIP file if it ends in .zip or .szi")
      ->required()
      ->type_name("NAME");
  command
      ->add_option_function<std::string>(
          "--layout", [options](const std::string& name) { options->Making.How = Layouts.at(name); },
          "deepzoom (NAME.dzi and NAME_files; the default), iiif (level 0 of version 3) or xyz (for maps)")
      ->type_name("KIND")
      ->check(CLI::IsMember(Layouts));
  command->add_option("--tile", options->Making.Tile, "Width and height of a tile in pixels, 256 by default")
      ->type_name("N")
      ->check(CLI::Range(16, 8192));
  command
      ->add_option("--overlap", options->Making.Overlap,
                   "Pixels by which deepzoom tiles overlap their neighbours, on each side; 0 by default")
      ->type_name("N")
      ->check(CLI::Range(0, 64));
  command->add_option("--format", options->Making.Type, "Type of the tiles: jpg (default), png or webp")
      ->type_name("NAME");
  command
      ->add_option("--quality", session.Writing.Quality,
                   "JPEG quality, 1 to 100, 90 by default; from 90 on chroma isn't subsampled")
      ->type_name("N")
      ->check(CLI::Range(1, 100));
  command
      ->add_option("--kernel", options->Making.Kernel,
                   "Resampling kernel: triangle, box (default), lanczos3, lanczos8, mitchell, poly3 or\n"
                   "cubic. box reads the image once, the others once for each level")
      ->type_name("NAME")
      ->check(CLI::IsMember({"triangle", "box", "lanczos3", "lanczos8", "mitchell", "poly3", "cubic"}));
  command->add_flag("--use-levels", options->Making.UseLevels,
                    "Use the smaller copies in the file, as in a pyramidal TIFF, for smaller levels");
  command
      ->add_option("--background", options->Background,
                   "Colour behind alpha in tiles without alpha, and padding of xyz tiles; white by default")
      ->type_name("RRGGBB");
  command->add_flag("--skip-blank", options->Making.SkipBlank,
                    "Omit tiles that show only the background, or nothing");
  command
      ->add_option("--address", options->Making.Address,
                   "URL where the iiif folder will be served, such as https://example.org/iiif")
      ->type_name("URL");
  command->add_flag("--page", options->Making.Page,
                    "Add a web page that shows the pyramid: NAME.html beside NAME.dzi, else NAME/index.html");
  command->add_flag("--resume", options->Making.Resume, "Continue an interrupted folder");
  CLI::Option* part =
      command
          ->add_option_function<std::string>(
              "--part", [options](const std::string& text) { SetPart(options->Making, text); },
              "Make only part K of N; parts may be made at the same time, and on several machines")
          ->type_name("K/N");
  command
      ->add_option(
          "--join", options->Making.Parts,
          "Complete the pyramid when all N parts are made; give the options that they were made with")
      ->type_name("N")
      ->check(CLI::Range(1, MostParts))
      ->excludes(part);
  command->add_option("--threads", session.Threads, "Number of threads; 0, the default, is one per processor")
      ->type_name("N")
      ->check(CLI::Range(0, 32));
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Tiles(session, *options); }; });
}

}
