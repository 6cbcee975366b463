#include <filesystem>
#include <mutex>

#include "all_steps.h"
#include "named.h"

namespace picturezor::steps {

namespace {

using files::Failure;

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

/// A file or picture that is laid over, or a mask: known from the start, read when it is needed first.
struct Laid {
  std::filesystem::path File = "a picture";
  std::unique_ptr<files::ImageReader> Reader;
  Picture Given;
  files::PictureSize Size;

  Laid(const Value& of, const Surroundings& around) {
    if (const auto* picture = std::get_if<Picture>(&of)) {
      Given = *picture;
      Size = {Given.Width(), Given.Height(), files::FileFormatOf(Given)};
      return;
    }
    File = std::get<std::string>(of);
    Reader = files::OpenNamed(
        File, {.MemoryLimit = around.Stores.MemoryLimit, .TempDirectory = around.Stores.TempDirectory});
    const files::ImageInfo info = files::Upright(Reader->Info());
    Size = {info.Width, info.Height, info.Pixels};
    for (const std::string& note : info.Notes) around.Note(File, note);
  }
  void ReadInto(const Picture& picture) {
    files::Silence silence;
    if (Reader)
      files::ReadInto(picture, *Reader, silence);
    else if (!picture.CopyPixels(Given))
      throw Failure(File, "it can't be read");
    Reader.reset();
  }
};

class Combining final : public flow::Operation {
 public:
  Combining(const Values& values, const Surroundings& around)
      : Stores(around.Stores), At(values.Get<Integers>("at")), Overlay(values.Any("overlay"), around) {
    How.PreMultipliedSource = values.Flag("premultiplied");
    How.UseColours = true;
    if (values.Has("fore")) How.ForeColour = values.Get<Color>("fore");
    if (values.Has("mask-colour")) How.MaskColour = values.Get<Color>("mask-colour");
    if (!values.Has("mask")) return;
    Mask.emplace(values.Any("mask"), around);
    if (Mask->Size.Width != Overlay.Size.Width || Mask->Size.Height != Overlay.Size.Height)
      throw Failure(Mask->File, "the mask must be as large as the overlay");
  }

  flow::Shape Result(const flow::Shape& source) const override {
    const bool blends = Mask || OwnMask() || How.ForeColour || How.MaskColour;
    for (const Format format : {source.Of, Overlay.Size.Of, Mask ? Mask->Size.Of : source.Of})
      if (blends && files::WithoutAlpha(format) == Format::CMYK)
        throw Unserved("blending doesn't support CMYK");
    if (!files::Convertible(Overlay.Size.Of, source.Of))
      throw Failure(Overlay.File, files::Describe(Overlay.Size.Of) + " can't be converted to " +
                                      files::Describe(source.Of));
    if (At[0] >= source.Width || At[1] >= source.Height || At[0] + Overlay.Size.Width <= 0 ||
        At[1] + Overlay.Size.Height <= 0)
      throw Failure(Overlay.File, "it lies entirely outside the base at " + std::to_string(At[0]) + "," +
                                      std::to_string(At[1]));
    return source;
  }
  flow::Dependence DependsOn(const flow::Shape&) const override {
    return {.Of = flow::Dependence::Kind::Bands};
  }
  int Pictures() const override { return 1; }
  Picture Apply(Picture source, const flow::Workplace& at) const override {
    const std::int64_t top = At[1] - at.FirstRow;
    if (top >= source.Height() || top + Overlay.Size.Height <= 0) return source;
    // Bands share the overlay, whose window moves where it is mapped.
    const std::lock_guard lock(Access);
    if (!Read) ReadOverlay(source.ImageFormat());
    const Rect place{std::int32_t(At[0]), std::int32_t(top), Overlay.Size.Width, Overlay.Size.Height};
    if (!source.Combine(OverlayPicture, place, 0, 0, How))
      throw Failure(Overlay.File, "it can't be combined with the base");
    return source;
  }

 private:
  bool OwnMask() const {
    return !Mask && !How.ForeColour && !How.MaskColour && files::HasAlpha(Overlay.Size.Of);
  }
  void ReadOverlay(Format base) const {
    std::vector<files::PictureSize> sizes{Overlay.Size};
    if (Mask) sizes.push_back(Mask->Size);
    // Added samples need room in alpha too: there the base's is scaled like its colours.
    const bool joins = How.PreMultipliedSource && files::HasAlpha(base);
    if (OwnMask()) sizes.push_back({Overlay.Size.Width, Overlay.Size.Height, joins ? Format::GA : Format::G});
    const auto pictures = files::MakePictures(Stores, sizes);
    Overlay.ReadInto(pictures[0]);
    if (Mask) Mask->ReadInto(pictures[1]);
    if (OwnMask()) FillWithInvertedAlpha(pictures[1], pictures[0]);
    if (sizes.size() > 1) How.Mask = pictures[1];
    OverlayPicture = pictures[0];
    Read = true;
  }

  const files::StoreOptions Stores;
  Integers At;
  // What is read once.
  mutable std::mutex Access;
  mutable bool Read = false;
  mutable Laid Overlay;
  mutable std::optional<Laid> Mask;
  mutable Picture OverlayPicture;
  mutable CombineOptions How;
};

}

const Step Combine{
    .Name = "combine",
    .Help = "Overlay one image on another",
    .More =
        "A mask sets how much of the base is kept: white keeps the base, black takes the overlay. Without a\n"
        "mask or a colour, the overlay's alpha is used, if it has one; the base's own alpha then doesn't\n"
        "change, except with --premultiplied, where it becomes the combined alpha of both.",
    .Examples = {"combine photo.jpg badge.png --at 20,20 -o marked.jpg",
                 "combine photo.jpg other.jpg --mask soft-edge.png -o both.jpg",
                 "combine photo.jpg letters.png --fore ff8000 -o titled.jpg"},
    .Options =
        {{.Name = "overlay",
          .Of = Kind::File,
          .Help = "Image to lay over the base",
          .Required = true,
          .ByPlace = true},
         {.Name = "mask",
          .Of = Kind::File,
          .Help = "Gray or RGB image of the same size as the overlay",
          .Placeholder = "MASK"},
         {.Name = "at", .Of = Kind::Point, .Help = "Top left corner of the overlay", .Default = "0,0"},
         {.Name = "premultiplied",
          .Of = Kind::Flag,
          .Help = "The overlay's colours are premultiplied by alpha: add them to what is kept of the base"},
         {.Name = "fore",
          .Of = Kind::Colour,
          .Help = "Paint this solid colour, such as ff8000, with the overlay as its mask",
          .Excludes = {"mask", "mask-colour"}},
         {.Name = "mask-colour",
          .Of = Kind::Colour,
          .Help = "One mask value per channel for all pixels, such as 808080",
          .Excludes = {"mask"}}},
    .Make = [](const Values& values, const Surroundings& around) -> std::unique_ptr<const flow::Operation> {
      return std::make_unique<Combining>(values, around);
    }};

}
