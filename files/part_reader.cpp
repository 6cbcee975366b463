#include <cstring>

#include "image_file.h"

namespace picturezor::files {

namespace {

/// A part of what another reader gives from the top on.
class PartReader : public ImageReader {
 public:
  PartReader(std::unique_ptr<ImageReader> reader, const Rect& part) : Whole(std::move(reader)), At(part) {
    About = Whole->Info();
    Line.resize(std::size_t(About.Width) * std::size_t(ChannelsOf(About.Pixels)));
    About.Width = part.Width;
    About.Height = part.Height;
  }

  void ReadRow(std::uint8_t* row) override {
    for (; Above < At.Y; ++Above) Whole->ReadRow(Line.data());
    if (At.Width == Whole->Info().Width) return Whole->ReadRow(row);
    Whole->ReadRow(Line.data());
    const auto channels = std::size_t(ChannelsOf(About.Pixels));
    std::memcpy(row, &Line[std::size_t(At.X) * channels], std::size_t(At.Width) * channels);
  }

  void Finish() override {}

 private:
  std::unique_ptr<ImageReader> Whole;
  Rect At;
  Bytes Line;
  std::int32_t Above = 0;
};

}

std::unique_ptr<ImageReader> PartOf(std::unique_ptr<ImageReader> reader, const Rect& part) {
  if (reader->Select(part)) return reader;
  return std::make_unique<PartReader>(std::move(reader), part);
}

}
