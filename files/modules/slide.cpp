#include <openslide.h>

#include <algorithm>
#include <cmath>
#include <cstdlib>

#include "failure.h"
#include "handle.h"
#include "type_module.h"

// Scans of microscopes, of several makers: pictures with smaller copies of themselves, read by region.

namespace picturezor::files {

namespace {

constexpr double MicrometresOfInch = 25400;

class SlideReader : public ImageReader {
 public:
  SlideReader(const Input& input, const ReadOptions& options)
      : Path(input.Path()), MemoryLimit(options.MemoryLimit), Slide(openslide_open(Path.c_str())) {
    Check();
    // The size counts, not that of the file: some are spread over several.
    RequirePlausible(Path, LevelSize(0).Width, LevelSize(0).Height, INT64_MAX, 1);
    for (std::int32_t level = 1; level < openslide_get_level_count(Slide.get()); ++level)
      About.Levels.push_back(LevelSize(level));
    SetPart({0, 0, LevelSize(0).Width, LevelSize(0).Height});
    About.Pixels = Format::RGB;
    const double across = Property(OPENSLIDE_PROPERTY_NAME_MPP_X);
    const double down = Property(OPENSLIDE_PROPERTY_NAME_MPP_Y);
    if (across > 0 && down > 0) About.Density = {MicrometresOfInch / across, MicrometresOfInch / down};
    if (const char* colour =
            openslide_get_property_value(Slide.get(), OPENSLIDE_PROPERTY_NAME_BACKGROUND_COLOR))
      Background = std::uint32_t(std::strtoul(colour, nullptr, 16));
  }

  void Reduce(std::int32_t leastWidth, std::int32_t leastHeight) override {
    for (std::int32_t level = openslide_get_level_count(Slide.get()) - 1; level > 0; --level) {
      const Extent size = LevelSize(level);
      if (size.Width < leastWidth || size.Height < leastHeight) continue;
      Level = level;
      return SetPart({0, 0, size.Width, size.Height});
    }
  }

  bool Select(const Rect& part) override {
    SetPart(part);
    return true;
  }
  bool StartsAnywhere() const override { return true; }

  void ReadRow(std::uint8_t* row) override {
    if (Next < BandTop || Next >= BandTop + BandRows) ReadBand();
    const std::uint32_t* pixels = &Band[std::size_t(Next - BandTop) * std::size_t(Part.Width)];
    ++Next;
    for (std::int32_t x = 0; x < Part.Width; ++x, row += 3) {
      // Colours are multiplied by the alpha, and where the scanner didn't look there is nothing.
      const std::uint32_t pixel = pixels[x], clear = 255 - (pixel >> 24);
      for (int c = 0; c < 3; ++c) {
        const int shift = 16 - 8 * c;
        row[c] = std::uint8_t(
            std::min(255u, (pixel >> shift & 255) + ((Background >> shift & 255) * clear + 127) / 255));
      }
    }
  }

  void Finish() override {}

 private:
  void Check() const {
    const char* reason = Slide ? openslide_get_error(Slide.get()) : "it can't be opened";
    if (reason) throw Failure(Path, std::string("corrupt slide: ") + reason);
  }

  Extent LevelSize(std::int32_t level) const {
    std::int64_t width = 0, height = 0;
    openslide_get_level_dimensions(Slide.get(), level, &width, &height);
    return {std::int32_t(std::min<std::int64_t>(width, INT32_MAX)),
            std::int32_t(std::min<std::int64_t>(height, INT32_MAX))};
  }

  double Property(const char* name) const {
    const char* text = openslide_get_property_value(Slide.get(), name);
    return text ? std::strtod(text, nullptr) : 0;
  }

  void SetPart(const Rect& part) {
    Part = part;
    About.Width = part.Width;
    About.Height = part.Height;
    Next = part.Y;
    BandRows = 0;
  }

  /// Some rows at a time, as many as tiles are high, since each has to be unpacked whole.
  void ReadBand() {
    constexpr std::int32_t usual = 256;
    constexpr std::int64_t room = 64 << 20;
    const std::int64_t rowBytes = std::int64_t{Part.Width} * 4;
    BandTop = Next;
    BandRows = std::int32_t(std::clamp<std::int64_t>(room / rowBytes, 1, usual));
    // Up to where a tile may end, so that the next band begins with one.
    BandRows = std::min({BandRows, Part.Y + Part.Height - Next, usual - Next % usual});
    RequireWithinLimit(Path, rowBytes * BandRows, MemoryLimit, "a band of this slide");
    Band.resize(std::size_t(BandRows) * std::size_t(Part.Width));
    // Places are counted in the largest level.
    const double scale = openslide_get_level_downsample(Slide.get(), Level);
    openslide_read_region(Slide.get(), Band.data(), std::llround(Part.X * scale), std::llround(Next * scale),
                          Level, Part.Width, BandRows);
    Check();
  }

  std::filesystem::path Path;
  std::int64_t MemoryLimit;
  Handle<openslide_t, openslide_close> Slide;
  std::uint32_t Background = 0xFFFFFF;
  std::int32_t Level = 0, Next = 0, BandTop = 0, BandRows = 0;
  Rect Part;
  std::vector<std::uint32_t> Band;
};

}

PICTUREZOR_TYPE_CODE(Slide){
    PICTUREZOR_VERSION,
    [](const Input& input) { return openslide_detect_vendor(input.Path().c_str()) != nullptr; },
    OpenAs<SlideReader>,
    nullptr,
};

}
