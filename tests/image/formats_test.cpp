#include <gmock/gmock.h>

#include "support/every_store.h"

namespace picturezor {
namespace {

/// The planes of a pixel by their letters, '-' for a byte of none; a second reading of the formats' names.
struct {
  Format Of;
  std::string Bytes, Name;
} const Layouts[] = {
    {Format::RGB, "RGB", "RGB"},
    {Format::RGBA, "RGBA", "RBBA"},
    {Format::RGBX, "RGB-", "RGBX"},
    {Format::ARGB, "ARGB", "ARGB"},
    {Format::XRGB, "-RGB", "XRGB"},
    {Format::BGR, "BGR", "BGR"},
    {Format::BGRA, "BGRA", "BGRA"},
    {Format::BGRX, "BGR-", "BGRX"},
    {Format::ABGR, "ABGR", "ABGR"},
    {Format::XBGR, "-BGR", "XBGR"},
    {Format::G, "g", "G"},
    {Format::GA, "gA", "GA"},
    {Format::AG, "Ag", "AG"},
    {Format::OneOf3, "g--", ""},
    {Format::TwoOf3, "-g-", ""},
    {Format::ThreeOf3, "--g", ""},
    {Format::OneOf4, "g---", ""},
    {Format::TwoOf4, "-g--", ""},
    {Format::ThreeOf4, "--g-", ""},
    {Format::FourOf4, "---g", ""},
    {Format::Buffer, "-", ""},
    {Format::CMYK, "CMYK", "CMYK"},
    {Format::CMYKA, "CMYKA", "CMYKA"},
    {Format::ACMYK, "ACMYK", "ACMYK"},
    {Format::CMYKX, "CMYK-", "CMYKX"},
    {Format::XCMYK, "-CMYK", "XCMYK"},
    {Format::KYMC, "KYMC", "KYMC"},
    {Format::KYMCA, "KYMCA", "KYMCA"},
    {Format::AKYMC, "AKYMC", "AKYMC"},
    {Format::KYMCX, "KYMC-", "KYMCX"},
    {Format::XKYMC, "-KYMC", "XKYMC"},
    {Format::Scaling1, "-", "Scaling"},
    {Format::Scaling5, "-----", "Scaling"},
    {Format::Scaling8, "--------", "Scaling"},
};

TEST(Formats, LayPlanesOut) {
  for (const auto& [format, bytes, name] : Layouts) {
    SCOPED_TRACE(int(format));
    const Picture picture(1, 1, format);
    EXPECT_EQ(picture.ImageFormat(), format);
    EXPECT_EQ(picture.ImageFormatString(), name);
    EXPECT_EQ(picture.PixelSize(), int(bytes.size()));
    EXPECT_EQ(BytesPerPixel(format), int(bytes.size()));
    struct {
      char Letter;
      bool Has;
      int Offset;
      Picture View;
    } planes[] = {{'R', picture.HasRed(), picture.RedOffset(), picture.RedChannel()},
                  {'G', picture.HasGreen(), picture.GreenOffset(), picture.GreenChannel()},
                  {'B', picture.HasBlue(), picture.BlueOffset(), picture.BlueChannel()},
                  {'g', picture.HasGray(), picture.GrayOffset(), picture.GrayChannel()},
                  {'A', picture.HasAlpha(), picture.AlphaOffset(), picture.AlphaChannel()},
                  {'C', picture.HasCyan(), picture.CyanOffset(), picture.CyanChannel()},
                  {'M', picture.HasMagenta(), picture.MagentaOffset(), picture.MagentaChannel()},
                  {'Y', picture.HasYellow(), picture.YellowOffset(), picture.YellowChannel()},
                  {'K', picture.HasBlack(), picture.BlackOffset(), picture.BlackChannel()}};
    for (const auto& [letter, has, offset, view] : planes) {
      SCOPED_TRACE(letter);
      const auto found = bytes.find(letter);
      EXPECT_EQ(has, found != std::string::npos);
      EXPECT_EQ(offset, has ? int(found) : 0);
      ASSERT_EQ(bool(view), has);
      if (!view) continue;
      EXPECT_EQ(view.GrayOffset(), offset);
      EXPECT_EQ(view.ImageFormatString(), "G");
      EXPECT_EQ(view.PixelSize(), picture.PixelSize());
      EXPECT_EQ(view.ChannelCount(), 1);
      EXPECT_TRUE(view.IsGray() && view.HasGray() && !view.HasAlpha());
    }
    EXPECT_EQ(picture.IsRGB(), bytes.find('R') != std::string::npos);
    EXPECT_EQ(picture.IsGray(), bytes.find('g') != std::string::npos);
    EXPECT_EQ(picture.IsCMYK(), bytes.find('C') != std::string::npos);
    int channel = 0;
    for (std::size_t i = 0; i < bytes.size(); ++i) {
      if (bytes[i] == '-') continue;
      EXPECT_EQ(picture.Channel(channel++).GrayOffset(), int(i));
    }
    EXPECT_EQ(picture.ChannelCount(), channel);
  }
}

TEST(Formats, AreRefusedWithoutALayout) {
  for (const int code : {0, 14, 41, -1, 1000000}) {
    SCOPED_TRACE(code);
    const Picture picture(3, 2, Format(code));
    EXPECT_FALSE(picture.Valid());
    EXPECT_EQ(picture.Width(), 3);
    EXPECT_EQ(picture.Height(), 2);
    EXPECT_EQ(picture.ImageFormat(), Format(code));
    EXPECT_EQ(picture.PixelSize(), 0);
    EXPECT_EQ(picture.ImageFormatString(), code == 0 ? "Unknown" : "");
    EXPECT_EQ(BytesPerPixel(Format(code)), 0);
  }
}

}
}
