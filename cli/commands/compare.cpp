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

struct Difference {
  std::int64_t Total = 0, Pixels = 0;
};

/// Of pictures of one size and format; nothing where there is no way to compare them.
std::optional<Difference> DifferenceOf(flow::Rows& a, flow::Rows& b, Progress& progress) {
  constexpr std::size_t bytesTogether = 1 << 20;
  const flow::Shape& shape = a.About();
  const std::size_t row = a.RowBytes(), pixel = std::size_t(BytesPerPixel(shape.Of));
  const auto together = std::clamp<std::int32_t>(std::int32_t(bytesTogether / row), 1, shape.Height);
  Bytes rowsOfA(row * std::size_t(together)), rowsOfB(rowsOfA.size());
  const auto read = [&](flow::Rows& rows, Bytes& into, std::int32_t count) {
    flow::ReadRows(rows, into.data(), std::ptrdiff_t(row), count);
    return Picture(MemoryBlock::Over(into), shape.Width, count, shape.Of, std::int32_t(row));
  };
  Difference difference;
  progress.Begin("comparing", shape.Height);
  for (std::int32_t y = 0; y < shape.Height; y += together) {
    const std::int32_t count = std::min(together, shape.Height - y);
    const std::int64_t total = read(a, rowsOfA, count).CompareImages(read(b, rowsOfB, count));
    if (total < 0) return std::nullopt;
    difference.Total += total;
    for (std::size_t at = 0; total > 0 && at < row * std::size_t(count); at += pixel)
      difference.Pixels += !std::equal(&rowsOfA[at], &rowsOfA[at] + pixel, &rowsOfB[at]);
    progress.Step(count);
  }
  return difference;
}

int Compare(Session& session, const CompareOptions& options) {
  OpenedImage a(session, options.A), b(session, options.B);
  const auto refuse = [&] {
    throw Failure(options.B, SizeAndFormat(b.Size()) + " can't be compared with " + SizeAndFormat(a.Size()) +
                                 " in " + options.A.string());
  };
  if (a.Size().Width != b.Size().Width || a.Size().Height != b.Size().Height || a.Size().Of != b.Size().Of)
    refuse();
  const PictureSize size = a.Size();
  const auto rowsOfA = a.Rows(session), rowsOfB = b.Rows(session);
  const auto difference = DifferenceOf(*rowsOfA, *rowsOfB, session.Bar);
  if (!difference) refuse();
  const auto [total, differing] = *difference;
  const std::int64_t pixels = std::int64_t{size.Width} * size.Height;
  session.Bar.Clear();
  std::printf("total difference:  %lld\n", static_cast<long long>(total));
  std::printf("mean per sample:   %.6f\n", double(total) / double(pixels * ChannelsOf(size.Of)));
  std::printf("differing pixels:  %lld of %lld (%.4f %%)\n", static_cast<long long>(differing),
              static_cast<long long>(pixels), 100.0 * double(differing) / double(pixels));
  return total ? Different : Done;
}

}

void AddCompare(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("compare", "Measure how much two images differ");
  command->footer(
      "The total is the sum of the absolute differences of all samples, including alpha.\n"
      "Exit codes: 0 equal, 1 different, 2 not comparable, such as different sizes or pixel formats.\n\n"
      "Example:\n  picturezor compare expected.png result.png");
  auto options = std::make_shared<CompareOptions>();
  command->add_option("A", options->A, "An image")->required()->type_name("");
  command->add_option("B", options->B, "Another image")->required()->type_name("");
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Compare(session, *options); }; });
}

}
