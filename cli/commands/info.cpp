#include <CLI/CLI.hpp>
#include <cstdio>

#include "failure.h"
#include "session.h"

namespace picturezor::cli {

namespace {

std::string ProfileText(const Bytes& profile) {
  if (profile.empty()) return "none";
  std::string text = std::to_string(profile.size()) + " bytes";
  if (profile.size() >= 20) text += ", " + std::string(profile.begin() + 16, profile.begin() + 20);
  return text.substr(0, text.find_last_not_of(' ') + 1);
}

int Info(Session& session, const std::filesystem::path& file) {
  const auto reader = OpenFor(session, file);
  const ImageInfo& stored = reader->Info();
  const ImageInfo upright = Upright(stored);
  std::printf("file:        %s\n", file.c_str());
  std::printf("type:        %s\n", stored.Type->Name);
  std::printf("size:        %d x %d\n", upright.Width, upright.Height);
  std::printf("pixels:      %s\n", Describe(stored.Pixels).c_str());
  std::printf("bits:        %d per sample\n", stored.Bits);
  std::printf("orientation: %d\n", stored.Orientation);
  if (upright.Density)
    std::printf("resolution:  %.6g x %.6g pixels per inch\n", upright.Density->X, upright.Density->Y);
  else
    std::printf("resolution:  none\n");
  std::printf("profile:     %s\n", ProfileText(stored.Profile).c_str());
  std::string metadata;
  for (const auto& [name, block] :
       {std::pair{"EXIF", &stored.Exif}, {"XMP", &stored.Xmp}, {"IPTC", &stored.Iptc}})
    if (!block->empty()) metadata += (metadata.empty() ? "" : ", ") + std::string(name);
  std::printf("metadata:    %s\n", metadata.empty() ? "none" : metadata.c_str());
  std::printf("pages:       %d\n", stored.Pages);
  for (const Extent& level : stored.Levels) std::printf("level:       %d x %d\n", level.Width, level.Height);
  for (const std::string& note : stored.Notes) std::printf("note:        %s\n", note.c_str());
  return Done;
}

}

void AddInfo(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("info", "Describe an image file");
  command->footer("The size is that of the upright image; the pixels themselves aren't read.");
  auto file = std::make_shared<std::filesystem::path>();
  command->add_option("FILE", *file, "Image to describe")->required()->type_name("");
  command->callback([&session, file] { session.Work = [&session, file] { return Info(session, *file); }; });
}

}
