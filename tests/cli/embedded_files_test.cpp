#include "command_test_support.h"
#include "picturezor/image_files.h"

// Image files in a program that embeds the library.

namespace picturezor::tests {

namespace {

using testing::HasSubstr;
using testing::ThrowsMessage;

class EmbeddedFiles : public CommandTest {
 protected:
  void SetUp() override { Host::Load(PICTUREZOR_MODULE); }
};

Picture NoisePicture(Format format) {
  const Picture picture(9, 7, format);
  picture.SetDataStringInFormat(format, Noise(9, 7, BytesPerPixel(format)).Samples);
  return picture;
}

// Catches an alpha or an order of planes that is lost on the way.
TEST_F(EmbeddedFiles, HoldEveryColour) {
  const struct {
    Format Of, InFile;
  } cases[] = {{Format::RGB, Format::RGB},   {Format::BGRA, Format::RGBA}, {Format::XBGR, Format::RGB},
               {Format::AG, Format::GA},     {Format::GofRGBA, Format::G}, {Format::KYMCA, Format::CMYKA},
               {Format::XCMYK, Format::CMYK}};
  for (const auto& [format, inFile] : cases) {
    const Picture picture = NoisePicture(format);
    SaveImage(At("a.tif"), picture);
    for (const Picture& read : {LoadImage(At("a.tif")), DecodeImage(EncodeImage("tif", picture))}) {
      EXPECT_EQ(read.ImageFormat(), inFile);
      EXPECT_EQ(read.DataStringInFormat(inFile), picture.DataStringInFormat(inFile));
    }
  }
  SaveImage(At("view.png"), NoisePicture(Format::RGB).ClipImage({2, 3, 4, 2}).MirroredView());
  EXPECT_EQ(ReadPNG(At("view.png")).Height, 2);
  EXPECT_EQ(Files(), (std::vector<std::string>{"a.tif", "view.png"}));
}

TEST_F(EmbeddedFiles, BecomePicturesOfTheHost) {
  const Raster picture = Noise(9, 7, 4);
  WritePNG(At("a.png"), picture);
  const HostPicture read = LoadHostPicture(At("a.png"));
  EXPECT_EQ(read.Pixel(1, 0), (Color{picture.Samples[4], picture.Samples[5], picture.Samples[6]}));
  EXPECT_EQ(read.Mask().Pixel(1, 0).Green, picture.Samples[7]);
  SaveImage(At("b.png"), read);
  EXPECT_EQ(ReadPNG(At("b.png")), picture);
  SaveImage(At("b.png"), read.Mask());
  EXPECT_EQ(ReadPNG(At("b.png")).Channels, 3);
}

TEST_F(EmbeddedFiles, SayWhatCantBeDone) {
  EXPECT_THROW(LoadImage(At("none.png")), std::runtime_error);
  const auto save = [&](const char* name, const auto& picture) {
    return [=, this] { SaveImage(At(name), picture); };
  };
  const std::function<void()> failures[] = {save("a.png", Picture()),
                                            save("a.png", HostPicture()),
                                            save("a.png", NoisePicture(Format::CMYK)),
                                            save("a.png", NoisePicture(Format::Scaling3)),
                                            save("a.gif", NoisePicture(Format::G)),
                                            save("no/a.png", NoisePicture(Format::G))};
  for (const auto& failure : failures)
    EXPECT_THAT(failure, ThrowsMessage<std::runtime_error>(HasSubstr(At("").string())));
  EXPECT_THROW(EncodeImage("gif", NoisePicture(Format::G)), std::runtime_error);
  EXPECT_THROW(DecodeImage({}), std::runtime_error);
  const Bytes png = EncodeImage("png", NoisePicture(Format::G));
  EXPECT_THROW(DecodeImage(std::span(png).first(40)), std::runtime_error);
  WritePNG(At("wide.png"), Noise(32768, 1, 1));
  EXPECT_THROW(LoadHostPicture(At("wide.png")), std::runtime_error);
  EXPECT_EQ(Files(), (std::vector<std::string>{"wide.png"}));
}

}

}
