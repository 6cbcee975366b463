#include <png.h>
#include <tiffio.h>

#include "command_test_support.h"

namespace picturezor::tests {

namespace {

using testing::HasSubstr;
using testing::IsEmpty;

class Formats : public CommandTest {
 protected:
  Raster Converted(const std::string& in) {
    Do({"convert", in, "-o", "converted.png"});
    return ReadPNG(At("converted.png"));
  }
};

TEST_F(Formats, LosslessTypesKeepEverySample) {
  for (int channels = 1; channels <= 4; ++channels) {
    SCOPED_TRACE(channels);
    const Raster picture = Noise(61, 43, channels);
    WritePNG(At("a.png"), picture);
    EXPECT_EQ(Converted("a.png"), picture);
    Do({"convert", "a.png", "-o", "b.tif"});
    EXPECT_EQ(ReadTIFF(At("b.tif")), picture);
    EXPECT_EQ(Converted("b.tif"), picture);
  }
}

TEST_F(Formats, JPEGStaysNear) {
  for (const int channels : {1, 3}) {
    const Raster picture = Waves(67, 41, channels);
    WriteJPEG(At("a.jpg"), picture);
    EXPECT_EQ(Converted("a.jpg"), ReadJPEG(At("a.jpg")));
    WriteJPEG(At("a.jpg"), picture, {.Progressive = true});
    EXPECT_EQ(Converted("a.jpg"), ReadJPEG(At("a.jpg")));
    WritePNG(At("b.png"), picture);
    Do({"convert", "b.png", "-o", "b.jpg", "--quality", "95"});
    EXPECT_LE(Difference(ReadJPEG(At("b.jpg")), picture), 8);
    Do({"convert", "b.png", "-o", "low.jpeg", "--quality", "10"});
    EXPECT_LT(file_size(At("low.jpeg")), file_size(At("b.jpg")));
  }
}

TEST_F(Formats, CMYKIsInkInTIFFAndInvertedInJPEG) {
  const Raster ink = Waves(40, 30, 4);
  Raster inverted = ink;
  for (auto& sample : inverted.Samples) sample = std::uint8_t(255 - sample);
  WriteTIFF(At("a.tif"), ink, {.CMYK = true});
  Do({"convert", "a.tif", "-o", "copy.tif"});
  EXPECT_EQ(ReadTIFF(At("copy.tif")), ink);
  Do({"convert", "a.tif", "-o", "a.jpg"});
  EXPECT_LE(Difference(ReadJPEG(At("a.jpg")), inverted), 8);
  Do({"convert", "a.jpg", "-o", "back.tif"});
  EXPECT_LE(Difference(ReadTIFF(At("back.tif")), ink), 8);
  Fail({"convert", "a.tif", "-o", "a.png"}, "a.png", "CMYK");
}

TEST_F(Formats, AskedForPixelFormats) {
  WritePNG(At("rgb.png"), {2, 1, 3, {255, 0, 0, 255, 255, 255}});
  Do({"convert", "rgb.png", "--format", "gray", "-o", "gray.png"});
  EXPECT_EQ(ReadPNG(At("gray.png")), (Raster{2, 1, 1, {76, 255}}));
  Do({"convert", "rgb.png", "--format", "rgba", "-o", "rgba.png"});
  EXPECT_EQ(ReadPNG(At("rgba.png")), (Raster{2, 1, 4, {255, 0, 0, 255, 255, 255, 255, 255}}));
  // White is no ink.
  Do({"convert", "gray.png", "--format", "cmyk", "-o", "ink.tif"});
  EXPECT_EQ(ReadTIFF(At("ink.tif")), (Raster{2, 1, 4, {0, 0, 0, 179, 0, 0, 0, 0}}));
  EXPECT_THAT(Do({"convert", "ink.tif", "--format", "gray", "-o", "back.png"}), HasSubstr("black channel"));
  EXPECT_EQ(ReadPNG(At("back.png")), ReadPNG(At("gray.png")));
  Fail({"convert", "rgb.png", "--format", "cmyk", "-o", "x.tif"}, "rgb.png", "can't be converted to CMYK");
  WritePNG(At("alpha.png"), Noise(9, 9, 4));
  EXPECT_THAT(Do({"convert", "alpha.png", "-o", "flat.jpg"}), HasSubstr("alpha"));
  EXPECT_EQ(ReadJPEG(At("flat.jpg")).Channels, 3);
}

TEST_F(Formats, EveryLayoutOfTIFF) {
  const struct {
    const char* Name;
    int Channels;
    TIFFExtras Extras;
  } cases[] = {
      {"one strip", 3, {.RowsPerStrip = 1000}},
      {"deflate", 3, {.Compression = COMPRESSION_ADOBE_DEFLATE}},
      {"lzw, one strip", 4, {.Compression = COMPRESSION_LZW, .RowsPerStrip = 1000}},
      {"packbits", 1, {.Compression = COMPRESSION_PACKBITS}},
      {"tiles", 3, {.Tile = 16}},
      {"deflated tiles, planes apart",
       3,
       {.Compression = COMPRESSION_ADOBE_DEFLATE, .Tile = 32, .Planar = true}},
      {"planes apart", 4, {.Planar = true}},
      {"planes apart, deflate", 2, {.Compression = COMPRESSION_ADOBE_DEFLATE, .Planar = true}},
      {"BigTIFF", 3, {.Mode = "w8"}},
  };
  for (const auto& [name, channels, extras] : cases)
    for (const int bits : {1, 2, 4, 8, 16})
      for (const int fillOrder : {FILLORDER_MSB2LSB, FILLORDER_LSB2MSB})
        for (const char* byteOrder : {"l", "b"}) {
          SCOPED_TRACE(name + (" bits, fill order, bytes: " + std::to_string(bits)) + " " +
                       std::to_string(fillOrder) + " " + byteOrder);
          Raster picture = Noise(53, 47, channels);
          if (bits < 8)
            for (auto& sample : picture.Samples)
              sample = std::uint8_t((sample >> (8 - bits)) * 255 / ((1 << bits) - 1));
          TIFFExtras of = extras;
          of.Bits = bits;
          of.FillOrder = fillOrder;
          of.Mode = extras.Mode + byteOrder;
          WriteTIFF(At("a.tif"), picture, of);
          EXPECT_EQ(Converted("a.tif"), picture);
        }
}

TEST_F(Formats, SixteenBitsAreRoundedWithANote) {
  const Raster picture = Noise(20, 10, 3);
  for (const char* mode : {"wl", "wb"}) {
    // 100 of 257 above is nearer to the same sample, 200 to the next one; nothing is above 255.
    for (const int shift : {0, 100}) {
      WriteTIFF(At("a.tif"), picture, {.Bits = 16, .Shift = shift, .Mode = mode});
      Raster expected = picture;
      if (shift)
        for (auto& sample : expected.Samples)
          if (sample == 255) sample = 0;  // It has wrapped in the file: 65535 + 100 is 99.
      EXPECT_EQ(Converted("a.tif"), expected);
    }
    WriteTIFF(At("a.tif"), Raster{2, 1, 1, {10, 20}}, {.Bits = 16, .Shift = 200, .Mode = mode});
    EXPECT_EQ(Converted("a.tif"), (Raster{2, 1, 1, {11, 21}}));
  }
  EXPECT_THAT(Do({"convert", "a.tif", "-o", "a.png"}), HasSubstr("16 bits per sample reduced to 8"));
  EXPECT_THAT(Do({"convert", "a.tif", "-q", "-o", "a.png"}), IsEmpty());
}

/// A PNG that libpng writes from rows as they are given.
void WriteRawPNG(const std::filesystem::path& file, int width, int height, int bits, int type,
                 bool interlaced, const Bytes& samples, void (*extras)(png_structp, png_infop) = nullptr) {
  std::FILE* stream = std::fopen(file.c_str(), "wb");
  png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
  png_infop info = png_create_info_struct(png);
  png_init_io(png, stream);
  png_set_IHDR(png, info, png_uint_32(width), png_uint_32(height), bits, type, interlaced, 0, 0);
  if (extras) extras(png, info);
  png_write_info(png, info);
  std::vector<png_bytep> rows;
  const std::size_t size = samples.size() / std::size_t(height);
  for (int y = 0; y < height; ++y) rows.push_back(const_cast<png_bytep>(&samples[size * std::size_t(y)]));
  png_write_image(png, rows.data());
  png_write_end(png, info);
  png_destroy_write_struct(&png, &info);
  std::fclose(stream);
}

TEST_F(Formats, PalettesBilevelAndInterlacedFiles) {
  WriteRawPNG(At("palette.png"), 4, 1, 2, PNG_COLOR_TYPE_PALETTE, false, {0b00011011},
              [](png_structp png, png_infop info) {
                const png_color colours[] = {{1, 2, 3}, {40, 50, 60}, {255, 0, 9}, {7, 8, 9}};
                const png_byte alpha[] = {0, 128};
                png_set_PLTE(png, info, colours, 4);
                png_set_tRNS(png, info, alpha, 2, nullptr);
              });
  EXPECT_EQ(Converted("palette.png"),
            (Raster{4, 1, 4, {1, 2, 3, 0, 40, 50, 60, 128, 255, 0, 9, 255, 7, 8, 9, 255}}));
  WriteRawPNG(At("bits.png"), 9, 1, 1, PNG_COLOR_TYPE_GRAY, false, {0b10110000, 0b10000000});
  EXPECT_EQ(Converted("bits.png"), (Raster{9, 1, 1, {255, 0, 255, 255, 0, 0, 0, 0, 255}}));
  const Raster picture = Noise(37, 29, 3);
  WriteRawPNG(At("interlaced.png"), 37, 29, 8, PNG_COLOR_TYPE_RGB, true, picture.Samples);
  EXPECT_EQ(Converted("interlaced.png"), picture);
  Fail({"convert", "interlaced.png", "--memory-limit", "2K", "-o", "x.png"}, "interlaced.png",
       "--memory-limit");

  TIFF* tiff = TIFFOpen(At("fax.tif").c_str(), "w");
  TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, 9);
  TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, 1);
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_MINISWHITE);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_CCITTFAX4);
  std::uint8_t row[] = {0b10110000, 0b10000000};
  TIFFWriteScanline(tiff, row, 0, 0);
  TIFFClose(tiff);
  EXPECT_EQ(Converted("fax.tif"), (Raster{9, 1, 1, {0, 255, 0, 0, 255, 255, 255, 255, 0}}));
}

TEST_F(Formats, MultipliedAlphaIsTakenOut) {
  WriteTIFF(At("a.tif"), {3, 1, 4, {50, 25, 0, 128, 9, 9, 9, 0, 10, 20, 30, 255}}, {.Premultiplied = true});
  EXPECT_EQ(Converted("a.tif"), (Raster{3, 1, 4, {100, 50, 0, 128, 0, 0, 0, 0, 10, 20, 30, 255}}));
}

TEST_F(Formats, AllOrientationsComeOutUpright) {
  // How "abc" over "def" stands in the file, as the EXIF tag says.
  const struct {
    int Orientation, Width, Height;
    const char* Stored;
  } cases[] = {{1, 3, 2, "abcdef"}, {2, 3, 2, "cbafed"}, {3, 3, 2, "fedcba"}, {4, 3, 2, "defabc"},
               {5, 2, 3, "adbecf"}, {6, 2, 3, "cfbead"}, {7, 2, 3, "fcebda"}, {8, 2, 3, "daebfc"}};
  // Squares of 8 pixels, as JPEG's, and enough rows for a mapped picture.
  const auto squares = [](const std::string& letters, int width, int channels) {
    Raster raster{width * 8, int(letters.size()) / width * 8, channels, {}};
    for (int y = 0; y < raster.Height; ++y)
      for (int x = 0; x < raster.Width; ++x)
        for (int c = 0; c < channels; ++c)
          raster.Samples.push_back(
              std::uint8_t((letters[std::size_t(y / 8 * width + x / 8)] - 'a') * 40 + (c == 1 ? 20 : 0)));
    return raster;
  };
  for (const auto& [orientation, width, height, stored] : cases)
    for (const int channels : {1, 3, 4})
      for (const char* store : {"memory", "mapped"}) {
        SCOPED_TRACE(testing::Message() << orientation << ' ' << channels << ' ' << store);
        const Raster upright = squares("abcdef", 3, channels), turned = squares(stored, width, channels);
        WriteTIFF(At("a.tif"), turned, {.Orientation = orientation});
        Do({"convert", "a.tif", "--store", store, "-o", "a.png"});
        EXPECT_EQ(ReadPNG(At("a.png")), upright);
        if (channels == 4) continue;
        WriteJPEG(At("a.jpg"), turned, {.Orientation = orientation});
        Do({"convert", "a.jpg", "--store", store, "-o", "b.png"});
        EXPECT_LE(Difference(ReadPNG(At("b.png")), upright), 3);
        EXPECT_THAT(Run({"info", "a.jpg"}).Out, HasSubstr("24 x 16"));
        Do({"convert", "a.jpg", "-o", "b.jpg"});
        EXPECT_THAT(Run({"info", "b.jpg"}).Out, HasSubstr("orientation: 1"));
      }
}

TEST_F(Formats, ProfileAndResolutionGoAlong) {
  const Raster picture = Waves(30, 20, 3);
  WriteJPEG(At("a.jpg"), picture, {.DensityPerInch = 300, .Profile = Profile("RGB ")});
  WriteTIFF(At("a.tif"), picture, {.DensityPerInch = 300, .Profile = Profile("RGB ")});
  Do({"convert", "a.tif", "-o", "a.png"});
  for (const char* in : {"a.jpg", "a.tif", "a.png"})
    for (const char* out : {"b.jpg", "b.tif", "b.png"}) {
      SCOPED_TRACE(std::string(in) + " to " + out);
      Do({"convert", in, "-o", out});
      const std::string info = Run({"info", out}).Out;
      EXPECT_THAT(info, HasSubstr("532 bytes, RGB"));
      // PNG counts by the metre.
      EXPECT_TRUE(info.find("300 x 300") != info.npos || info.find("299.999 x 299.999") != info.npos) << info;
      Do({"convert", in, "--format", "gray", "-o", out});
      EXPECT_THAT(Run({"info", out}).Out, HasSubstr("profile:     none"));
    }
  WriteTIFF(At("ink.tif"), Waves(9, 9, 4), {.CMYK = true, .DensityPerInch = 150});
  Do({"convert", "ink.tif", "-o", "ink.jpg"});
  EXPECT_THAT(Run({"info", "ink.jpg"}).Out, HasSubstr("150 x 150"));
}

// Catches inks that are inverted, black points left alone, and an embedded profile that isn't used.
TEST_F(Formats, CMYKBecomesTheColoursOfItsProfile) {
  const Raster ink = Waves(60, 40, 4);
  Raster inverted = ink;
  for (auto& sample : inverted.Samples) sample = std::uint8_t(255 - sample);
  const Bytes press = ReadBytes("/usr/share/color/icc/ghostscript/default_cmyk.icc");
  WriteTIFF(At("ink.tif"), ink, {.CMYK = true, .Profile = press});
  WriteJPEG(At("ink.jpg"), inverted, {.Quality = 100, .Profile = press});
  for (const auto& [intent, flags] : {std::pair{"perceptual", "-t0"}, {"relative", "-t1 -b"}}) {
    SCOPED_TRACE(intent);
    const std::string other = std::string("tificc ") + flags + " '" + At("ink.tif").string() + "' '" +
                              At("other.tif").string() + "' > /dev/null 2>&1";
    ASSERT_EQ(std::system(other.c_str()), 0);
    const Raster expected = ReadTIFF(At("other.tif"));
    for (const auto& [in, off] : {std::pair{"ink.tif", 1}, {"ink.jpg", 6}}) {
      Do({"convert", in, "--profile", "srgb", "--intent", intent, "-o", "out.png"});
      EXPECT_LE(Difference(ReadPNG(At("out.png")), expected), off) << in;
    }
  }
}

TEST_F(Formats, ArePackedAsAskedFor) {
  const Raster picture = Waves(200, 150, 3);
  WritePNG(At("a.png"), picture);
  const struct {
    Arguments Options;
    int Compression, Tile, Pages;
    bool Big;
  } cases[] = {
      {{}, COMPRESSION_LZW, 0, 1, false},
      {{"--compression", "none"}, COMPRESSION_NONE, 0, 1, false},
      {{"--compression", "9"}, COMPRESSION_ADOBE_DEFLATE, 0, 1, false},
      {{"--compression", "deflate,1", "--tile", "64"}, COMPRESSION_ADOBE_DEFLATE, 64, 1, false},
      {{"--compression", "zstd", "--bigtiff"}, COMPRESSION_ZSTD, 0, 1, true},
      {{"--compression", "jpeg", "--quality", "95"}, COMPRESSION_JPEG, 0, 1, false},
      {{"--pyramid", "--tile", "32"}, COMPRESSION_LZW, 32, 4, false},
  };
  for (const auto& [options, compression, tile, pages, big] : cases) {
    SCOPED_TRACE(testing::PrintToString(options));
    Do(Arguments{"convert", "a.png", "-o", "a.tif"} + options);
    TIFF* file = TIFFOpen(At("a.tif").c_str(), "r");
    std::uint16_t packed = 0;
    std::uint32_t edge = 0;
    TIFFGetField(file, TIFFTAG_COMPRESSION, &packed);
    TIFFGetField(file, TIFFTAG_TILEWIDTH, &edge);
    EXPECT_EQ(packed, compression);
    EXPECT_EQ(edge, tile);
    EXPECT_EQ(TIFFNumberOfDirectories(file), pages);
    EXPECT_EQ(bool(TIFFIsBigTIFF(file)), big);
    TIFFClose(file);
    EXPECT_LE(Difference(Converted("a.tif"), picture), compression == COMPRESSION_JPEG ? 8 : 0);
  }
  for (const char* level : {"0", "9"}) {
    Do({"convert", "a.png", "-o", "b.png", "--compression", level});
    EXPECT_EQ(ReadPNG(At("b.png")), picture);
    EXPECT_EQ(std::filesystem::file_size(At("b.png")) > picture.Samples.size(), *level == '0');
  }
}

}

}
