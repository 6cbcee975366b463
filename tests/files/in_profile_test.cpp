#include "in_profile.h"

#include <gtest/gtest.h>

#include "failure.h"

namespace picturezor::files {

namespace {

/// Red, green, blue and a gray of alpha 7; other formats take as many samples as they have.
class FourPixels final : public ImageReader {
 public:
  explicit FourPixels(Format format) {
    About.Width = 4;
    About.Height = 1;
    About.Pixels = format;
  }
  void ReadRow(std::uint8_t* row) override {
    constexpr std::uint8_t pixels[4][4] = {
        {255, 0, 0, 255}, {0, 255, 0, 255}, {0, 0, 255, 128}, {128, 128, 128, 7}};
    for (const auto& pixel : pixels) row = std::copy_n(pixel, ChannelsOf(About.Pixels), row);
  }
  void Finish() override {}
};

// The numbers are those of sRGB's primaries in Adobe RGB (1998) and of their luminance, after IEC 61966-2-1
// and the publication of that space. Catches channels in another order, alpha that is converted, a lost
// profile.
TEST(Profiles, CarryColoursOver) {
  const struct {
    const char* Name;
    Format From, To;
    Bytes Samples;
  } cases[] = {
      {"srgb", Format::RGB, Format::RGB, {255, 0, 0, 0, 255, 0, 0, 0, 255, 128, 128, 128}},
      {"adobe-rgb",
       Format::RGBA,
       Format::RGBA,
       {219, 0, 0, 255, 144, 255, 60, 255, 0, 0, 250, 128, 127, 127, 127, 7}},
      {"gray", Format::RGB, Format::G, {130, 220, 69, 128}},
      {"srgb", Format::G, Format::RGB, {255, 255, 255, 0, 0, 0, 0, 0, 0, 128, 128, 128}},
  };
  for (const auto& [name, from, to, samples] : cases) {
    SCOPED_TRACE(name);
    const auto reader =
        InProfile(std::make_unique<FourPixels>(from), "made", {ProfileNamed(name), Intent::Relative});
    EXPECT_EQ(reader->Info().Pixels, to);
    EXPECT_TRUE(ProfileFits(reader->Info().Profile, to));
    Bytes row(samples.size());
    reader->ReadRow(row.data());
    for (std::size_t i = 0; i < row.size(); ++i) EXPECT_NEAR(row[i], samples[i], 1) << i;
  }
  EXPECT_THROW(InProfile(std::make_unique<FourPixels>(Format::CMYK), "made", {ProfileNamed("srgb")}),
               Failure);
  EXPECT_THROW(ProfileNamed("/dev/null"), Failure);
}

}

}
