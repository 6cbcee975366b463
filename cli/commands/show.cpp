#include <sys/ioctl.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <optional>

#include "failure.h"
#include "small_picture.h"

namespace picturezor::cli {

namespace {

struct ShowOptions {
  std::filesystem::path File;
  std::int32_t Width = 0;
};

/// The size in pixels of the terminal's window, which shows two in each place; without a window 80 columns of
/// any length. A line is left for the prompt.
Extent SizeInWindow(const ImageInfo& image, std::int32_t width) {
  constexpr double anyHeight = 1e9;
  winsize window{};
  const bool known = ioctl(STDOUT_FILENO, TIOCGWINSZ, &window) == 0 && window.ws_col > 0 && window.ws_row > 1;
  if (width > 0) return SizeWithin(image, width, anyHeight);
  if (!known) return SizeWithin(image, 80, anyHeight);
  return SizeWithin(image, window.ws_col, 2 * (window.ws_row - 1));
}

/// What stands in one place of the terminal: an upper and a lower pixel, nothing where the picture lets the
/// terminal's own background through.
struct Place {
  std::optional<Color> Upper, Lower;
};

std::string Coloured(int ground, Color c) {
  return ";" + std::to_string(ground) + ";2;" + std::to_string(c.Red) + ";" + std::to_string(c.Green) + ";" +
         std::to_string(c.Blue);
}

void Append(std::string& line, std::string& style, const Place& place) {
  constexpr int inFront = 38, behind = 48;
  constexpr const char *upperHalf = "\u2580", *lowerHalf = "\u2584";
  const bool upper = place.Upper.has_value(), lower = place.Lower.has_value();
  std::string needed = "\x1b[0";
  if (upper || lower) needed += Coloured(inFront, upper ? *place.Upper : *place.Lower);
  if (upper && lower) needed += Coloured(behind, *place.Lower);
  needed += "m";
  if (needed != style) line += needed;
  style = needed;
  line += upper ? upperHalf : lower ? lowerHalf : " ";
}

void Print(const HostPicture& picture) {
  const HostPicture mask = picture.Mask();
  const auto pixel = [&](std::int32_t x, std::int32_t y) -> std::optional<Color> {
    if (y >= picture.Height() || (mask && mask.Pixel(x, y).Red < 128)) return std::nullopt;
    return picture.Pixel(x, y);
  };
  for (std::int32_t y = 0; y < picture.Height(); y += 2) {
    std::string line, style;
    for (std::int32_t x = 0; x < picture.Width(); ++x) Append(line, style, {pixel(x, y), pixel(x, y + 1)});
    line += "\x1b[0m\n";
    std::fwrite(line.data(), 1, line.size(), stdout);
  }
}

int Show(Session& session, const ShowOptions& options) {
  OpenedImage image(session, options.File);
  const Extent size = SizeInWindow(image.Upright, options.Width);
  constexpr std::int32_t mostRows = 32767;
  if (size.Height > mostRows) throw Failure(options.File, "it is too tall to be shown at this width");
  const flow::Chain chain = ScaleTo(session, image, size, false);
  const auto rows = image.Rows(session, chain);
  // With a mask where it has alpha, and gray or inks turned into light.
  const HostPicture picture = flow::Gather(*rows, session.Stores, session.Bar).CopyPictureWithMask();
  if (!picture) throw Failure(options.File, "no picture can be made from it");
  session.Bar.Clear();
  Print(picture);
  return Done;
}

}

void AddShow(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("show", "Show an image in a terminal with 24-bit colour");
  command->footer(
      "The image fills the terminal window as far as its aspect ratio allows; without a window it is\n"
      "80 columns wide. The terminal's background shows through pixels with little alpha.\n\n"
      "Examples:\n"
      "  picturezor show photo.jpg\n"
      "  picturezor show photo.jpg --width 120 | less -R");
  auto options = std::make_shared<ShowOptions>();
  command->add_option("FILE", options->File, "Image to show")->required()->type_name("");
  command->add_option("--width", options->Width, "Width in columns, whatever the window's")
      ->type_name("N")
      ->check(CLI::Range(1, 4000));
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Show(session, *options); }; });
}

}
