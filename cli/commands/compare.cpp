#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>

#include "failure.h"
#include "session.h"

namespace picturezor::cli {

namespace {

struct CompareOptions {
  std::filesystem::path A, B;
};

std::string SizeAndFormat(const PictureSize& size) {
  return std::to_string(size.Width) + " x " + std::to_string(size.Height) + " " + Describe(size.Of);
}

std::int64_t DifferingPixels(const Picture& a, const Picture& b) {
  const auto pixel = std::size_t(a.PixelSize()), row = pixel * std::size_t(a.Width());
  std::int64_t count = 0;
  for (std::int32_t y = 0; y < a.Height(); ++y) {
    const MemoryBlock rowOfA = a.RawRow(y), rowOfB = b.RawRow(y);
    if (!rowOfA || !rowOfB) throw Failure("a row of a picture can't be reached");
    const std::uint8_t *atA = rowOfA.Start(), *atB = rowOfB.Start();
    for (std::size_t at = 0; at < row; at += pixel)
      count += !std::equal(atA + at, atA + at + pixel, atB + at);
  }
  return count;
}

int Compare(Session& session, const CompareOptions& options) {
  OpenedImage a(session, options.A), b(session, options.B);
  const auto refuse = [&] {
    throw Failure(options.B, SizeAndFormat(b.Size()) + " can't be compared with " + SizeAndFormat(a.Size()) +
                                 " in " + options.A.string());
  };
  if (a.Size().Width != b.Size().Width || a.Size().Height != b.Size().Height || a.Size().Of != b.Size().Of)
    refuse();
  const auto pictures = MakePictures(session.Stores, {a.Size(), b.Size()});
  a.ReadInto(session, pictures[0]);
  b.ReadInto(session, pictures[1]);
  const std::int64_t total = pictures[0].CompareImages(pictures[1]);
  if (total < 0) refuse();
  const std::int64_t differing = total ? DifferingPixels(pictures[0], pictures[1]) : 0;
  const std::int64_t pixels = std::int64_t{a.Size().Width} * a.Size().Height;
  session.Bar.Clear();
  std::printf("total difference:  %lld\n", static_cast<long long>(total));
  std::printf("mean per sample:   %.6f\n", double(total) / double(pixels * ChannelsOf(a.Size().Of)));
  std::printf("differing pixels:  %lld of %lld (%.4f %%)\n", static_cast<long long>(differing),
              static_cast<long long>(pixels), 100.0 * double(differing) / double(pixels));
  return total ? Different : Done;
}

}

void AddCompare(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("compare", "Tell how far two images are from each other");
  command->footer(
      "The total adds up the differences of all samples, alpha included.\n"
      "Exit codes: 0 equal, 1 different, 2 not comparable, as for other sizes or pixel formats.\n\n"
      "Example:\n  picturezor compare expected.png result.png");
  auto options = std::make_shared<CompareOptions>();
  command->add_option("A", options->A, "An image")->required()->type_name("");
  command->add_option("B", options->B, "Another image")->required()->type_name("");
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Compare(session, *options); }; });
}

}
