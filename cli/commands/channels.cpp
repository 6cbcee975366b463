#include <CLI/CLI.hpp>

#include "failure.h"
#include "session.h"

namespace picturezor::cli {

namespace {

struct ChannelsOptions {
  std::filesystem::path In;
  std::string Pattern;
};

std::vector<std::string> ChannelNames(Format format) {
  std::vector<std::string> names;
  switch (WithoutAlpha(format)) {
    case Format::G: names = {"gray"}; break;
    case Format::RGB: names = {"red", "green", "blue"}; break;
    default: names = {"cyan", "magenta", "yellow", "black"};
  }
  if (HasAlpha(format)) names.push_back("alpha");
  return names;
}

int Channels(Session& session, const ChannelsOptions& options) {
  const auto place = options.Pattern.find("{}");
  if (place == std::string::npos)
    throw UsageFailure("-o: " + options.Pattern + " has no {} for the name of the channel");
  TypeToWrite(options.Pattern, session.TypeName);
  OpenedImage source(session, options.In);
  const PictureSize size = source.Size();
  std::vector<std::unique_ptr<Target>> targets;
  for (const std::string& name : ChannelNames(size.Of)) {
    std::string file = options.Pattern;
    file.replace(place, 2, name);
    targets.push_back(std::make_unique<Target>(session, file));
    targets.back()->Start(size.Width, size.Height);
  }
  const auto rows = source.Rows(session);
  std::vector<std::unique_ptr<ImageWriter>> writers;
  for (const auto& target : targets)
    writers.push_back(target->Writer(session, Format::G, source.Upright, session.Threads));
  const std::size_t channels = writers.size();
  Bytes row(rows->RowBytes()), channel(row.size() / channels);
  session.Bar.Begin("writing", size.Height);
  for (std::int32_t y = 0; y < size.Height; ++y, session.Bar.Step()) {
    flow::ReadRows(*rows, row.data(), 0, 1);
    for (std::size_t c = 0; c < channels; ++c) {
      for (std::size_t x = 0; x < channel.size(); ++x) channel[x] = row[x * channels + c];
      writers[c]->WriteRow(channel.data());
    }
  }
  for (const auto& writer : writers) writer->Finish();
  for (const auto& target : targets) target->Commit();
  return Done;
}

}

void AddChannels(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("channels", "Write each channel to its own gray image");
  command->footer(
      "For CMYK, white means full ink. The channels are named gray; red, green, blue; cyan, magenta,\n"
      "yellow, black; and alpha.\n\n"
      "Example, which writes photo-red.png, photo-green.png and photo-blue.png:\n"
      "  picturezor channels photo.jpg -o photo-{}.png");
  auto options = std::make_shared<ChannelsOptions>();
  command->add_option("IN", options->In, "Image to read")->required()->type_name("");
  command->add_option("-o,--output", options->Pattern, "Images to write; {} stands for the channel's name")
      ->required()
      ->type_name("PATTERN");
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Channels(session, *options); }; });
}

}
