#include <gmock/gmock.h>

#include "exchange_test_support.h"

// Pictures over the pixels of a host picture.

namespace picturezor {
namespace {

TEST(HostPixels, AreSharedBothWays) {
  const struct {
    PictureForm Form;
    bool UseAlpha;
    Format Of;
  } cases[] = {{PictureForm::GWorld32, false, Format::XRGB},
               {PictureForm::GWorld32, true, Format::ARGB},
               {PictureForm::GWorld24, true, Format::RGB}};
  for (const auto& [form, useAlpha, format] : cases)
    InHost(form, [&] {
      SCOPED_TRACE(int(format));
      const HostPicture host = NoisePicture(5, 4, form, 3);
      {
        const Picture picture(host, useAlpha);
        ASSERT_TRUE(picture.Valid());
        EXPECT_EQ(picture.ImageFormat(), format);
        EXPECT_EQ(picture.HasAlpha(), format == Format::ARGB);
        EXPECT_EQ(picture.Width(), 5);
        EXPECT_EQ(picture.Height(), 4);
        EXPECT_EQ(picture.RowSize(), Inside(host).World.Map.RowBytes);
        EXPECT_EQ(picture.TotalSize(), picture.RowSize() * 4);
        EXPECT_EQ(picture.ChannelCount(), 0);
        EXPECT_TRUE(picture.IsRGB() && !picture.IsGray() && !picture.IsMapping());
        EXPECT_EQ(picture.Target(), host);
        EXPECT_EQ(picture.DataStringInFormat(Format::RGB), host.RGB());

        picture.SetRowInFormat(2, Format::RGB, Samples(15, 77));
        EXPECT_EQ(host.Pixel(4, 2), (Color{77, 77, 77}));
        host.SetPixel(1, 1, {1, 2, 3});
        EXPECT_EQ(picture.ClipImage({1, 1, 1, 1}).RowInFormat(0, Format::RGB), (Samples{1, 2, 3}));
        EXPECT_EQ(picture.GreenChannel().RowInFormat(1, Format::G)[1], 2);
        EXPECT_EQ(picture.CopyPicture().RGB(), host.RGB());
        EXPECT_THROW(picture.Channel(0), HostException);
      }
      EXPECT_EQ(host.References(), 1);
    });
}

TEST(HostPixels, OutliveThePictureThatWasGiven) {
  InHost(PictureForm::GWorld32, [] {
    HostPicture host = NoisePicture(5, 4, PictureForm::GWorld32, 3);
    const Samples pixels = host.RGB();
    Picture picture(host);
    host = HostPicture();
    const Picture mirrored = picture.MirroredView().MirroredView();
    picture.Close();
    picture = Picture();
    EXPECT_EQ(mirrored.DataStringInFormat(Format::RGB), pixels);
  });
}

TEST(HostPixels, AreThoseOfGWorldsOnly) {
  InHost(PictureForm::GWorld32, [] {
    for (const PictureForm form : {PictureForm::GWorld16, PictureForm::Form1, PictureForm::Form2,
                                   PictureForm::Form3, PictureForm::Rows, PictureForm::None}) {
      const HostPicture host(5, 4, form);
      EXPECT_FALSE(Picture(host).Valid()) << int(form);
      EXPECT_EQ(host.References(), 1);
    }
    EXPECT_FALSE(Picture(HostPicture()).Valid());
    for (const char* hidden :
         {"GetPortPixMap", "GetPixBaseAddr", "GetPixRowBytes", "lockPictureDescription"}) {
      Host::Hide(hidden);
      if (!std::string_view(hidden).starts_with("Get")) Host::Hide("unlockPictureDescription");
      EXPECT_FALSE(Picture(HostPicture(5, 4)).Valid()) << hidden;
      Host::Hide(hidden, false);
    }
  });
}

// A picture drawn onto itself is read as far as it has been written: pixel by pixel, from the top left.
TEST(HostPixels, CanBeDrawnOntoThemselves) {
  InHost(PictureForm::GWorld24, [] {
    const HostPicture host(40, 1);
    for (int x = 0; x < 40; ++x) host.SetPixel(x, 0, {std::uint8_t(x), 0, 0});
    const Picture picture(host);
    picture.DrawPictureRGB(host, {1, 0, 39, 1}, 0, 0);
    for (int x = 0; x < 40; ++x) EXPECT_EQ(host.Pixel(x, 0).Red, 0) << x;
  });
}

TEST(HostPixels, CanBeBlendedOntoThemselves) {
  for (const PictureForm form : {PictureForm::GWorld24, PictureForm::GWorld32})
    InHost(form, [&] {
      const HostPicture host = NoisePicture(40, 1, form, 3);
      GiveMask(host, NoisePicture(40, 1, form, 4));
      Samples expected = host.RGB();
      const Samples mask = host.Mask().RGB();
      for (std::size_t i = 3; i < expected.size(); ++i)
        expected[i] = std::uint8_t((expected[i] * mask[i - 3] + expected[i - 3] * (255 - mask[i - 3])) / 255);
      Picture(host).DrawMaskedPictureApplyMaskRGB(host, {1, 0, 39, 1}, 0, 0);
      EXPECT_EQ(host.RGB(), expected);
    });
}

}
}
