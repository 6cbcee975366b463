#include <CLI/CLI.hpp>

#include "failure.h"
#include "session.h"

namespace picturezor::cli {

namespace {

struct CombineCommand {
  std::filesystem::path Base, Overlay, Mask, Out;
  std::string At = "0,0", Fore, MaskColour;
  bool Premultiplied = false;
};

/// What an overlay's alpha leaves of the base, in all planes of the mask.
void FillWithInvertedAlpha(const Picture& mask, const Picture& overlay) {
  const Picture alpha = overlay.AlphaChannel();
  for (std::int32_t plane = 0; plane < mask.ChannelCount(); ++plane) {
    const Picture channel = mask.Channel(plane);
    for (std::int32_t y = 0; y < mask.Height(); ++y) {
      Bytes row = alpha.RowInFormat(y, Format::G);
      for (auto& sample : row) sample = std::uint8_t(255 - sample);
      channel.SetRowInFormat(y, Format::G, row);
    }
  }
}

int Combine(Session& session, const CombineCommand& command) {
  const auto at = ParseNumbers("--at", command.At, ',', 2);
  for (const std::int64_t edge : at)
    if (edge < INT32_MIN / 2 || edge > INT32_MAX / 2)
      throw UsageFailure("--at: " + command.At + " is too far");
  CombineOptions how;
  how.PreMultipliedSource = command.Premultiplied;
  how.UseColours = true;
  if (!command.Fore.empty()) how.ForeColour = ParseColor("--fore", command.Fore);
  if (!command.MaskColour.empty()) how.MaskColour = ParseColor("--mask-colour", command.MaskColour);
  Target target(session, command.Out);
  OpenedImage base(session, command.Base), overlay(session, command.Overlay);
  std::vector<PictureSize> sizes{base.Size(), overlay.Size()};

  std::optional<OpenedImage> mask;
  const bool ownMask =
      command.Mask.empty() && !how.ForeColour && !how.MaskColour && HasAlpha(overlay.Size().Of);
  if (!command.Mask.empty()) {
    mask.emplace(session, command.Mask);
    sizes.push_back(mask->Size());
    if (sizes[2].Width != sizes[1].Width || sizes[2].Height != sizes[1].Height)
      throw Failure(command.Mask, "the mask must be as large as the overlay");
  } else if (ownMask) {
    // Added samples need room in alpha too: there the base's is scaled like its colours.
    const bool joins = command.Premultiplied && HasAlpha(base.Size().Of);
    sizes.push_back({sizes[1].Width, sizes[1].Height, joins ? Format::GA : Format::G});
  }
  const bool blends = sizes.size() > 2 || how.ForeColour || how.MaskColour;
  for (const PictureSize& size : sizes)
    if (blends && WithoutAlpha(size.Of) == Format::CMYK)
      throw Failure(command.Base, "blending isn't there for CMYK");
  if (!Convertible(sizes[1].Of, sizes[0].Of))
    throw Failure(command.Overlay,
                  "there is no way from " + Describe(sizes[1].Of) + " to " + Describe(sizes[0].Of));

  const Format format = target.Storable(session, sizes[0].Of);
  target.Start(sizes[0].Width, sizes[0].Height);
  const auto pictures = MakePictures(session.Stores, sizes);
  base.ReadInto(session, pictures[0]);
  overlay.ReadInto(session, pictures[1]);
  if (mask) mask->ReadInto(session, pictures[2]);
  if (ownMask) FillWithInvertedAlpha(pictures[2], pictures[1]);
  if (sizes.size() > 2) how.Mask = pictures[2];
  const Rect place{std::int32_t(at[0]), std::int32_t(at[1]), sizes[1].Width, sizes[1].Height};
  if (!pictures[0].Combine(pictures[1], place, 0, 0, how))
    throw Failure(command.Overlay, "nothing of it lies on the base at " + command.At);
  target.Write(session, pictures[0], format, base.Upright);
  target.Commit();
  return Done;
}

}

void AddCombine(CLI::App& app, Session& session) {
  CLI::App* command = app.add_subcommand("combine", "Lay an image over another one");
  command->footer(
      "A mask says how much of the base stays: white keeps it, black takes the overlay. Without a mask or a\n"
      "colour the overlay's alpha decides, if it has one; an alpha of the base stays as it is then, but "
      "with\n"
      "--premultiplied it becomes that of both together.\n\n"
      "Examples:\n"
      "  picturezor combine photo.jpg badge.png --at 20,20 -o marked.jpg\n"
      "  picturezor combine photo.jpg other.jpg --mask soft-edge.png -o both.jpg\n"
      "  picturezor combine photo.jpg letters.png --fore ff8000 -o titled.jpg");
  auto options = std::make_shared<CombineCommand>();
  command->add_option("BASE", options->Base, "Image to lay the other one on")->required()->type_name("");
  command->add_option("OVERLAY", options->Overlay, "Image that is laid over it")->required()->type_name("");
  CLI::Option* mask =
      command->add_option("--mask", options->Mask, "Gray or RGB image as large as the overlay");
  mask->type_name("MASK");
  command->add_option("--at", options->At, "Where its top left corner goes; 0,0 by default")
      ->type_name("X,Y");
  command->add_flag("--premultiplied", options->Premultiplied,
                    "The overlay's colours have been scaled by their coverage, so they are added");
  CLI::Option* fore = command->add_option("--fore", options->Fore,
                                          "A flat colour, as ff8000, that the overlay is the mask for");
  CLI::Option* maskColour = command->add_option("--mask-colour", options->MaskColour,
                                                "One mask value a channel for all pixels, as 808080");
  fore->type_name("COLOUR")->excludes(mask)->excludes(maskColour);
  maskColour->type_name("COLOUR")->excludes(mask);
  command->add_option("-o,--output", options->Out, "Image to write; the name's ending says its type")
      ->required()
      ->type_name("OUT");
  AddWriteOptions(*command, session);
  AddStoreOptions(*command, session);
  command->callback(
      [&session, options] { session.Work = [&session, options] { return Combine(session, *options); }; });
}

}
