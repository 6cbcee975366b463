#include <CLI/CLI.hpp>
#include <charconv>
#include <cmath>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <map>

#include "failure.h"
#include "picturezor/host.h"
#include "session.h"

namespace picturezor::cli {

namespace {

/// What the options of all filters say, with the values that stand where nothing is said.
struct FilterOptions {
  std::filesystem::path In, Out;
  double Gain = 0.5, Bias = 0.5, Radius = 3, Threshold = 0.5, Softness = 0.2, Amount = 1, Scale = 0;
  int Iterations = 1, Levels = 0, Range = 3, Level = 1, Difference = 0, Delta = 0;
  bool NoHorizontal = false, NoVertical = false;
  std::string Gamma, Table, Red, Green, Blue, Matrix, Black = "000000", White = "ffffff",
                                                      Dither = "ordered4x4";
};

const std::map<std::string, DitherMatrix> DitherMatrices{
    {"magic2x2", DitherMatrix::Magic2x2},       {"magic4x4", DitherMatrix::Magic4x4},
    {"ordered4x4", DitherMatrix::Ordered4x4},   {"lines4x4", DitherMatrix::Lines4x4},
    {"halftone", DitherMatrix::Halftone90_6x6}, {"ordered6x6", DitherMatrix::Ordered6x6},
    {"ordered8x8", DitherMatrix::Ordered8x8},   {"cluster3", DitherMatrix::Cluster3},
    {"cluster4", DitherMatrix::Cluster4},       {"cluster8", DitherMatrix::Cluster8}};

/// Whole numbers with commas or white space between them, from the text itself or, after an @, from the file
/// that it names.
std::vector<std::int32_t> Numbers(const std::string& option, const std::string& text) {
  std::string all = text;
  if (text.starts_with('@')) {
    std::ifstream file(text.substr(1), std::ios::binary);
    if (!file) throw Failure(text.substr(1), "it can't be read");
    all.assign(std::istreambuf_iterator<char>(file), {});
  }
  std::vector<std::int32_t> numbers;
  std::string word;
  const auto take = [&] {
    if (word.empty()) return;
    std::size_t used = 0;
    try {
      numbers.push_back(std::stoi(word, &used));
    } catch (const std::logic_error&) {
    }
    if (used != word.size()) throw UsageFailure(option + ": " + word + " isn't a whole number of 32 bits");
    word.clear();
  };
  for (const char c : all) {
    if (c == ',' || std::isspace(static_cast<unsigned char>(c)))
      take();
    else
      word += c;
  }
  take();
  if (numbers.empty()) throw UsageFailure(option + ": there are no numbers");
  return numbers;
}

IntegerArray TableOf(const std::string& option, const std::string& text) {
  std::vector<std::int32_t> numbers = Numbers(option, text);
  if (numbers.size() > 256) throw UsageFailure(option + ": a table has 256 numbers at most");
  return IntegerArray(std::move(numbers));
}

CLI::Validator Between(double least, double most) {
  return CLI::Validator(
      [=](std::string& text) {
        const double value = std::strtod(text.c_str(), nullptr);
        // Not a number is nowhere.
        return value >= least && value <= most ? std::string() : text + " isn't a number that it takes";
      },
      "");
}

enum class Serves { All, GrayAndRGB, RGB };

/// How the rows that a filter makes come from those of the image.
using Needs = flow::Dependence (*)(const FilterOptions& options);
constexpr auto OnBands = flow::Dependence::Kind::Bands;

flow::Dependence Everything(const FilterOptions&) { return {}; }
flow::Dependence Row(const FilterOptions&) { return {.Of = OnBands}; }
flow::Dependence Around(double rows) {
  constexpr double most = 1e9;
  return {.Of = OnBands, .Reach = std::int32_t(std::min(rows, most))};
}

/// A filter of the command. `Run` gets the colours of the image and gives them back filtered, in place where
/// that is possible.
struct FilterCommand {
  const char *Name, *Help;
  Serves Groups;
  Needs DependsOn;
  /// The pictures of the image's size that it needs at a time.
  int Pictures;
  void (*AddOptions)(CLI::App& command, FilterOptions& options);
  Picture (*Run)(const Picture& colours, const FilterOptions& options);
};

void NoOptions(CLI::App&, FilterOptions&) {}

void Number(CLI::App& command, const char* name, double& value, double least, double most, const char* help) {
  command.add_option(name, value, help)->type_name("X")->check(Between(least, most));
}
void Count(CLI::App& command, const char* name, int& value, int least, int most, const char* help) {
  command.add_option(name, value, help)->type_name("N")->check(CLI::Range(least, most));
}

Picture Gamma(const Picture& colours, const FilterOptions& options) {
  std::vector<double> g;
  const char *at = options.Gamma.data(), *end = at + options.Gamma.size();
  for (bool more = true; more; ++at) {
    double gamma = 0;
    const auto [rest, failed] = std::from_chars(at, end, gamma);
    // Not a number is nowhere.
    if (failed != std::errc() || !(gamma >= 1e-6 && gamma <= 1e6) || (rest != end && *rest != ','))
      throw UsageFailure("--gamma: " + options.Gamma + " isn't one number, or three with commas");
    g.push_back(gamma);
    at = rest;
    more = rest != end;
  }
  if (g.size() == 1) return colours.GammaFilter(colours, g[0]);
  if (g.size() != 3) throw UsageFailure("--gamma: give one number, or three with commas");
  if (colours.IsGray()) throw UsageFailure("--gamma: a gray image has one");
  return colours.GammaFilter(colours, g[0], g[1], g[2]);
}

Picture Transfer(const Picture& colours, const FilterOptions& options) {
  const bool any = !options.Red.empty() || !options.Green.empty() || !options.Blue.empty();
  if (options.Table.empty() != any)
    throw UsageFailure("transfer: give --table, or --red, --green and --blue");
  if (!any) return colours.TransferFilter(colours, TableOf("--table", options.Table));
  if (options.Red.empty() || options.Green.empty() || options.Blue.empty())
    throw UsageFailure("transfer: --red, --green and --blue go together");
  if (colours.IsGray()) throw UsageFailure("transfer: a gray image has one --table");
  return colours.TransferFilter(colours, TableOf("--red", options.Red), TableOf("--green", options.Green),
                                TableOf("--blue", options.Blue));
}

constexpr int MostMatrixRows = 50;

Picture Matrix(const Picture& colours, const FilterOptions& options) {
  const std::vector<std::int32_t> weights = Numbers("--weights", options.Matrix);
  const int side = int(std::lround(std::sqrt(double(weights.size()))));
  if (std::size_t(side) * std::size_t(side) != weights.size() || side > MostMatrixRows)
    throw UsageFailure("--weights: " + std::to_string(weights.size()) +
                       " numbers are no square of at most 50 x 50");
  double sum = 0;
  for (const std::int32_t weight : weights) sum += weight < 255 ? weight : 0;
  const double scale = options.Scale != 0 ? options.Scale : sum != 0 ? 1 / sum : 1;
  return colours.ApplyMatrix({}, side, IntegerArray(weights), options.Delta, scale);
}

Picture Blur(const Picture& colours, const FilterOptions& options) {
  return colours.BoxBlurFilter({}, options.Radius, options.Iterations, !options.NoVertical,
                               !options.NoHorizontal);
}

/// Three passes make nearly a bell of the box.
Picture Unsharp(const Picture& colours, const FilterOptions& options) {
  const Picture blurred = colours.BoxBlurFilter({}, options.Radius, 3);
  return blurred && colours.UnsharpFilter(blurred, options.Amount / 4, options.Difference) ? colours
                                                                                           : Picture();
}

const FilterCommand Filters[] = {
    {"invert", "The complement of every colour", Serves::All, Row, 1, NoOptions,
     [](const Picture& colours, const FilterOptions&) {
       colours.Invert();
       return colours;
     }},
    {"auto-level", "Stretch the levels from black to white", Serves::RGB, Everything, 1, NoOptions,
     [](const Picture& colours, const FilterOptions&) { return colours.AutoLevel() ? colours : Picture(); }},
    {"solarize", "Dark and bright become bright, the middle dark", Serves::All, Row, 1, NoOptions,
     [](const Picture& colours, const FilterOptions&) { return colours.SolarizeFilter(colours); }},
    {"gamma", "Brighten with more than 1, darken with less", Serves::GrayAndRGB, Row, 1,
     [](CLI::App& command, FilterOptions& options) {
       command
           .add_option("--gamma", options.Gamma, "One gamma, or those of red, green and blue, as 2.2,1.8,2")
           ->required()
           ->type_name("G");
     },
     Gamma},
    {"gain", "More or less contrast in the middle, and a lift of it", Serves::GrayAndRGB, Row, 1,
     [](CLI::App& command, FilterOptions& options) {
       Number(command, "--gain", options.Gain, 0, 1, "0.5 leaves all as it is, more is steeper; 0 to 1");
       Number(command, "--bias", options.Bias, 1e-6, 1, "0.5 leaves all as it is, more is brighter; up to 1");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.GainFilter(colours, options.Gain, options.Bias);
     }},
    {"transfer", "Send the samples through tables of numbers", Serves::GrayAndRGB, Row, 1,
     [](CLI::App& command, FilterOptions& options) {
       const auto add = [&](const char* name, std::string& text, const char* help) {
         command.add_option(name, text, help)->type_name("N,N,..|@FILE");
       };
       add("--table", options.Table,
           "What becomes of the samples 0 to 255, in the option or in a file; what is missing is 0");
       add("--red", options.Red, "The same for one channel");
       add("--green", options.Green, "The same for one channel");
       add("--blue", options.Blue, "The same for one channel");
     },
     Transfer},
    {"matrix", "Weigh the samples around each one", Serves::All,
     [](const FilterOptions&) { return Around(MostMatrixRows / 2); }, 2,
     [](CLI::App& command, FilterOptions& options) {
       command
           .add_option("--weights", options.Matrix,
                       "A square of weights, row by row, in the option or in a file; from 255 on a place is\n"
                       "left out")
           ->required()
           ->type_name("N,N,..|@FILE");
       Count(command, "--delta", options.Delta, -1000000, 1000000, "Added to the sum; 0 by default");
       Number(command, "--scale", options.Scale, -1e6, 1e6,
              "Then multiplied by this; 1 divided by the sum of the weights by default");
     },
     Matrix},
    {"blur", "The mean of a square around each sample", Serves::All,
     [](const FilterOptions& options) {
       return Around(options.NoVertical ? 0 : std::floor(options.Radius) * options.Iterations);
     },
     3,
     [](CLI::App& command, FilterOptions& options) {
       Number(command, "--radius", options.Radius, 1, 1e6, "In whole pixels; 3 by default");
       Count(command, "--iterations", options.Iterations, 1, 1000, "3 are nearly a bell; 1 by default");
       CLI::Option* rows = command.add_flag("--only-horizontal", options.NoVertical, "Along rows alone");
       command.add_flag("--only-vertical", options.NoHorizontal, "Along columns alone")->excludes(rows);
     },
     Blur},
    {"soft-blur", "A blur by less than a pixel", Serves::All, [](const FilterOptions&) { return Around(1); },
     1,
     [](CLI::App& command, FilterOptions& options) {
       options.Radius = 0.5;
       Number(command, "--radius", options.Radius, 0, 0.999, "A fraction of a pixel; 0.5 by default");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.BoxBlurFractionalFilter(colours, options.Radius);
     }},
    {"stamp", "Every channel to one of two colours, with a soft edge", Serves::GrayAndRGB,
     [](const FilterOptions& options) { return Around(std::floor(options.Radius / 3) * 3); }, 4,
     [](CLI::App& command, FilterOptions& options) {
       options.Radius = 9;
       Number(command, "--radius", options.Radius, 0, 1e6, "Of the blur before it; 9 by default");
       Number(command, "--threshold", options.Threshold, -10, 10, "Where the edge lies; 0.5 by default");
       Number(command, "--softness", options.Softness, 0, 10, "How wide it is; 0.2 by default");
       command.add_option("--black", options.Black, "The dark colour, as 202060")->type_name("COLOUR");
       command.add_option("--white", options.White, "The bright colour")->type_name("COLOUR");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.StampFilter({}, options.Radius, options.Threshold, options.Softness,
                                  ParseColor("--black", options.Black), ParseColor("--white", options.White));
     }},
    {"unsharp", "Sharpen by the difference to a blurred copy", Serves::All,
     [](const FilterOptions& options) { return Around(std::floor(options.Radius) * 3); }, 3,
     [](CLI::App& command, FilterOptions& options) {
       Number(command, "--radius", options.Radius, 1, 1e6, "Of the blur, in whole pixels; 3 by default");
       Number(command, "--amount", options.Amount, -1, 1000,
              "How many times the difference is added; 1 by default");
       Count(command, "--threshold", options.Difference, 0, 256,
             "Differences below it stay as they are; 0 by default");
     },
     Unsharp},
    {"oil", "Strokes of the most frequent colour around", Serves::All,
     [](const FilterOptions& options) { return Around(options.Range); }, 2,
     [](CLI::App& command, FilterOptions& options) {
       options.Levels = 32;
       Count(command, "--range", options.Range, 0, 100, "Pixels around each one; 3 by default");
       Count(command, "--levels", options.Levels, 1, 256, "Levels that are told apart; 32 by default");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.OilFilter({}, options.Levels, options.Range);
     }},
    {"diffuse", "Scatter the pixels", Serves::GrayAndRGB, Everything, 2,
     [](CLI::App& command, FilterOptions& options) {
       options.Level = 4;
       Count(command, "--level", options.Level, 0, 10000, "How far, in pixels; 4 by default");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.DiffuseFilter({}, options.Level);
     }},
    {"engrave", "Gray relief of the edges", Serves::GrayAndRGB,
     [](const FilterOptions& options) { return Around(std::abs(options.Level)); }, 2,
     [](CLI::App& command, FilterOptions& options) {
       Count(command, "--level", options.Level, -10000, 10000, "How deep, in pixels; 1 by default");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.EngraveFilter({}, options.Level);
     }},
    {"neon", "Bright edges on black", Serves::All, [](const FilterOptions&) { return Around(1); }, 1,
     NoOptions, [](const Picture& colours, const FilterOptions&) { return colours.NeonFilter(colours); }},
    {"dither", "A few levels a channel, by a pattern of thresholds", Serves::GrayAndRGB,
     [](const FilterOptions&) {
       // Of patterns of 2, 4, 6, 8 and 16 rows.
       return flow::Dependence{.Of = OnBands, .Period = 48};
     },
     1,
     [](CLI::App& command, FilterOptions& options) {
       options.Levels = 2;
       command
           .add_option(
               "--pattern", options.Dither,
               "magic2x2, magic4x4, ordered4x4 (default), ordered6x6, ordered8x8, lines4x4, halftone,\n"
               "cluster3, cluster4 or cluster8")
           ->type_name("NAME")
           ->check(CLI::IsMember(DitherMatrices));
       Count(command, "--levels", options.Levels, 2, 256, "Levels a channel; 2 by default");
     },
     [](const Picture& colours, const FilterOptions& options) {
       return colours.DitherFilter(colours, DitherMatrices.at(options.Dither), options.Levels);
     }},
};

void RequireServed(const FilterCommand& filter, const std::filesystem::path& file, Format format) {
  const Format colours = WithoutAlpha(format);
  if (filter.Groups == Serves::RGB && colours != Format::RGB)
    throw Failure(file, std::string(filter.Name) + " is there for RGB only, and this is " + Describe(format));
  if (filter.Groups == Serves::GrayAndRGB && colours == Format::CMYK)
    throw Failure(file, std::string(filter.Name) + " isn't there for CMYK");
}

/// A view of the colours, so that alpha stays as it is.
Picture ColoursOf(const Picture& picture) {
  if (!picture.HasAlpha()) return picture;
  return picture.IsGray()  ? picture.GrayChannel()
         : picture.IsRGB() ? picture.RGBChannels()
                           : picture.CMYKChannels();
}

/// Puts the colours of a result where those of the image were.
void TakeColours(const Picture& colours, const Picture& result, Format format) {
  for (std::int32_t y = 0; y < colours.Height(); ++y)
    colours.SetRowInFormat(y, format, result.RowInFormat(y, format));
}

/// In the image, or in a new one.
Picture Filtered(const Picture& picture, const FilterCommand& filter, const FilterOptions& options) {
  const Picture colours = ColoursOf(picture);
  const Picture result = filter.Run(colours, options);
  if (!result) throw Failure(options.In, "it can't be filtered");
  if (result == colours) return picture;
  if (!picture.HasAlpha()) return result;
  TakeColours(colours, result, WithoutAlpha(picture.ImageFormat()));
  return picture;
}

int Filter(Session& session, const FilterCommand& filter, const FilterOptions& options) {
  Target target(session, options.Out);
  OpenedImage source(session, options.In);
  const PictureSize size = source.Size();
  RequireServed(filter, options.In, size.Of);
  const Format format = target.Storable(session, size.Of);
  target.Start(size.Width, size.Height);
  const auto work = [&](const Picture& picture, const flow::Workplace& at) {
    if (at.Stores.Kind == Store::Memory) return Filtered(picture, filter, options);
    const PicturesLike made(at.Stores);
    return Filtered(picture, filter, options);
  };
  target.Carry(session, source, ChainOf(filter.DependsOn(options), filter.Pictures, work), format);
  target.Commit();
  return Done;
}

int List() {
  for (const FilterCommand& filter : Filters) std::printf("%-11s %s\n", filter.Name, filter.Help);
  return Done;
}

void AddOne(CLI::App& parent, Session& session, const FilterCommand& filter) {
  CLI::App* command = parent.add_subcommand(filter.Name, filter.Help);
  auto options = std::make_shared<FilterOptions>();
  command->add_option("IN", options->In, "Image to read: PNG, JPEG or TIFF")->required()->type_name("");
  filter.AddOptions(*command, *options);
  command->add_option("-o,--output", options->Out, "Image to write; the name's ending says its type")
      ->required()
      ->type_name("OUT");
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback([&session, &filter, options] {
    session.Work = [&session, &filter, options] { return Filter(session, filter, *options); };
  });
}

}

void AddFilter(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("filter", "Change the colours of an image, blur or sharpen it");
  command->footer(
      "picturezor filter NAME --help tells the options of a filter. Alpha stays as it is.\n\n"
      "Examples:\n"
      "  picturezor filter gamma photo.jpg --gamma 1.4 -o brighter.jpg\n"
      "  picturezor filter unsharp photo.jpg --radius 2 --amount 0.8 -o sharper.jpg\n"
      "  picturezor filter matrix photo.png --weights 0,-1,0,-1,5,-1,0,-1,0 -o crisp.png\n"
      "  picturezor filter dither scan.png --pattern cluster4 -o print.png");
  command->require_subcommand(0, 1);
  auto list = std::make_shared<bool>(false);
  command->add_flag("--list", *list, "Name all filters");
  for (const FilterCommand& filter : Filters) AddOne(*command, session, filter);
  command->allow_extras();
  command->callback([&session, command, list] {
    if (command->get_subcommands().empty() && command->remaining_size() > 0)
      throw CLI::ValidationError(command->remaining().front(),
                                 "there is no such filter; --list names them all");
    if (*list)
      session.Work = List;
    else if (command->get_subcommands().empty())
      throw CLI::RequiredError("filter: the name of a filter");
  });
}

}
