#include <fcntl.h>
#include <tiffio.h>
#include <unistd.h>

#include "command_test_support.h"
#include "failure.h"
#include "image_file.h"
#include "picturezor/host.h"

namespace picturezor::tests {

namespace {

class Codecs : public CommandTest {
 protected:
  static Raster AllOf(files::ImageReader& reader) {
    const files::ImageInfo& info = reader.Info();
    Raster raster{info.Width, info.Height, files::ChannelsOf(info.Pixels), {}};
    const std::size_t row = std::size_t(raster.Width) * std::size_t(raster.Channels);
    raster.Samples.resize(row * std::size_t(raster.Height));
    reader.ReadRows(raster.Samples.data(), std::ptrdiff_t(row), raster.Height);
    reader.Finish();
    return raster;
  }

  void Write(const std::string& name, const Raster& raster, const files::WriteOptions& options) {
    constexpr Format formats[] = {Format::G, Format::GA, Format::RGB, Format::RGBA};
    files::ImageInfo info;
    info.Width = raster.Width;
    info.Height = raster.Height;
    info.Pixels = formats[raster.Channels - 1];
    const int file = open(At(name).c_str(), O_RDWR | O_CREAT | O_TRUNC, 0666);
    const auto writer = files::TypeByExtension(name).Create(file, name, info, options);
    writer->WriteRows(raster.Samples.data(), std::ptrdiff_t(raster.Width) * raster.Channels, raster.Height);
    writer->Finish();
    close(file);
  }

  std::unique_ptr<files::ImageReader> Open(const std::string& name) {
    return files::OpenImage(At(name), {.MemoryLimit = 64 << 20});
  }
};

Raster PartOf(const Raster& whole, int x, int y, int width, int height) {
  Raster part{width, height, whole.Channels, {}};
  for (int row = y; row < y + height; ++row) {
    const auto start = whole.Samples.begin() + (std::ptrdiff_t(row) * whole.Width + x) * whole.Channels;
    part.Samples.insert(part.Samples.end(), start, start + std::ptrdiff_t(width) * whole.Channels);
  }
  return part;
}

TEST_F(Codecs, TheBytesDontDependOnTheThreads) {
  using files::Compression;
  const struct {
    const char* Name;
    files::WriteOptions Options;
    bool Exact = true;
  } cases[] = {
      {"a.png", {}},
      {"stored.png", {.Level = 0}},
      {"runs.png", {.Level = 1}},
      {"patient.png", {.Level = 9}},
      {"a.jpg", {}, false},
      {"a.tif", {}},
      {"plain.tif", {.Packing = Compression::None, .Tile = 32}},
      {"deflate.tif", {.Packing = Compression::Deflate, .Tile = 64, .Big = true}},
      {"zstd.tif", {.Packing = Compression::Zstd}},
      {"jpeg.tif", {.Packing = Compression::JPEG}, false},
      {"tiles.tif", {.Packing = Compression::JPEG, .Tile = 48}, false},
  };
  // Noise is a photograph to PNG, and the same row again and again a drawing; both are several blocks.
  Raster picture = Noise(700, 1300, 3);
  for (std::size_t i = 700 * 650 * 3; i < picture.Samples.size(); ++i)
    picture.Samples[i] = picture.Samples[i - 700 * 3];
  for (const auto& [name, options, exact] : cases) {
    SCOPED_TRACE(name);
    Bytes first;
    for (const int threads : {1, 2, 5}) {
      auto asked = options;
      asked.Threads = threads;
      Write(name, picture, asked);
      if (threads == 1) first = ReadBytes(At(name));
      EXPECT_TRUE(ReadBytes(At(name)) == first) << threads;
    }
    EXPECT_EQ(AllOf(*Open(name)) == picture, exact);
    EXPECT_TRUE(At(name).extension() != ".png" || ReadPNG(At(name)) == picture);
  }
}

TEST_F(Codecs, APartIsThatOfTheWhole) {
  const Raster picture = Noise(53, 47, 3);
  WritePNG(At("a.png"), picture);
  WriteTIFF(At("plain.tif"), picture);
  WriteTIFF(At("strips.tif"), picture, {.Compression = 5});
  WriteTIFF(At("strip.tif"), picture, {.Compression = 5, .RowsPerStrip = 1000});
  WriteTIFF(At("tiles.tif"), picture, {.Compression = 5, .Tile = 16});
  WriteTIFF(At("planes.tif"), picture, {.Compression = 5, .Tile = 16, .Planar = true});
  Write("a.jpg", picture, {.Quality = 75});
  for (const char* name :
       {"a.png", "a.jpg", "plain.tif", "strips.tif", "strip.tif", "tiles.tif", "planes.tif"})
    for (const Rect& part :
         {Rect{0, 0, 53, 47}, Rect{0, 40, 53, 7}, Rect{17, 15, 20, 18}, Rect{52, 46, 1, 1}}) {
      SCOPED_TRACE(testing::Message() << name << ' ' << part.X << ' ' << part.Y);
      EXPECT_EQ(AllOf(*files::PartOf(Open(name), part)),
                PartOf(AllOf(*Open(name)), part.X, part.Y, part.Width, part.Height));
    }
  const auto tiles = Open("tiles.tif");
  ASSERT_TRUE(tiles->StartsAnywhere());
  for (const int y : {30, 3, 17}) {
    tiles->Select({5, y, 40, 9});
    EXPECT_EQ(AllOf(*tiles), PartOf(picture, 5, y, 40, 9)) << y;
  }
}

TEST_F(Codecs, AReducedJPEGIsLargeEnough) {
  WriteJPEG(At("a.jpg"), Waves(201, 99, 3));
  const struct {
    int Least[2], Size[2];
  } cases[] = {{{201, 99}, {201, 99}}, {{102, 20}, {201, 99}}, {{101, 50}, {101, 50}},
               {{101, 51}, {201, 99}}, {{51, 25}, {51, 25}},   {{1, 1}, {26, 13}}};
  for (const auto& [least, size] : cases) {
    const auto reader = Open("a.jpg");
    reader->Reduce(least[0], least[1]);
    EXPECT_EQ(reader->Info().Width, size[0]);
    EXPECT_EQ(reader->Info().Height, size[1]);
    AllOf(*reader);
  }
}

TEST_F(Codecs, APyramidHoldsHalvesByBox) {
  Host::Load(PICTUREZOR_MODULE);
  Raster picture{64, 64, 1, Bytes(64 * 64)};
  for (std::size_t i = 0; i < picture.Samples.size(); ++i) picture.Samples[i] = i / 64 % 2 ? 200 : 100;
  Write("a.tif", picture, {.Tile = 16, .Pyramid = true});
  EXPECT_EQ(AllOf(*Open("a.tif")), picture);
  TIFF* file = TIFFOpen(At("a.tif").c_str(), "r");
  for (const int edge : {64, 32, 16}) {
    std::uint32_t width = 0, kind = 0;
    TIFFGetField(file, TIFFTAG_IMAGEWIDTH, &width);
    TIFFGetFieldDefaulted(file, TIFFTAG_SUBFILETYPE, &kind);
    EXPECT_EQ(width, edge);
    EXPECT_EQ(kind, edge == 64 ? 0 : FILETYPE_REDUCEDIMAGE);
    Bytes tile(16 * 16);
    TIFFReadEncodedTile(file, 0, tile.data(), 256);
    EXPECT_EQ(tile == Bytes(256, 150), edge < 64);
    EXPECT_EQ(TIFFReadDirectory(file), edge > 16);
  }
  TIFFClose(file);
}

TEST_F(Codecs, WhatATypeCantPackIsRefused) {
  using files::Compression;
  EXPECT_THROW(Write("a.png", Noise(9, 9, 3), {.Packing = Compression::LZW}), files::UsageFailure);
  EXPECT_THROW(Write("a.tif", Noise(9, 9, 3), {.Tile = 20}), files::UsageFailure);
  EXPECT_THROW(Write("a.tif", Noise(9, 9, 4), {.Packing = Compression::JPEG}), files::Failure);
  EXPECT_THROW(Write("a.tif", Noise(9, 9, 1), {.Packing = Compression::WebP}), files::Failure);
}

}

}
