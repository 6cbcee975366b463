#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <tiffio.h>

#include <algorithm>

#include "failure.h"
#include "image_file.h"
#include "temporary_files.h"

namespace picturezor::files {

namespace {

constexpr std::int32_t Width = 300, Height = 200, Tile = 64;

/// The sample of a level at a place; levels differ so that one can't stand for another.
std::uint8_t SampleOf(std::int32_t level, std::int32_t x, std::int32_t y, int c) {
  return std::uint8_t(x * (level + 1) + 3 * y + 85 * c + 17 * level);
}

void WriteLevel(TIFF* file, std::int32_t level, bool tiled) {
  const std::int32_t width = Width >> level, height = Height >> level;
  TIFFSetField(file, TIFFTAG_IMAGEWIDTH, width);
  TIFFSetField(file, TIFFTAG_IMAGELENGTH, height);
  TIFFSetField(file, TIFFTAG_BITSPERSAMPLE, 8);
  TIFFSetField(file, TIFFTAG_SAMPLESPERPIXEL, 3);
  TIFFSetField(file, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_RGB);
  TIFFSetField(file, TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG);
  TIFFSetField(file, TIFFTAG_COMPRESSION, COMPRESSION_LZW);
  TIFFSetField(file, TIFFTAG_IMAGEDESCRIPTION, "Aperio Image\r\n300x200 (64x64)|AppMag = 20|MPP = 0.5");
  const std::int32_t columns = tiled ? Tile : width, rows = tiled ? Tile : height;
  if (tiled) {
    TIFFSetField(file, TIFFTAG_TILEWIDTH, Tile);
    TIFFSetField(file, TIFFTAG_TILELENGTH, Tile);
  } else {
    TIFFSetField(file, TIFFTAG_ROWSPERSTRIP, height);
  }
  Bytes block(std::size_t(columns * rows * 3));
  for (std::int32_t top = 0; top < height; top += rows)
    for (std::int32_t left = 0; left < width; left += columns) {
      for (std::int32_t i = 0; i < columns * rows * 3; ++i)
        block[std::size_t(i)] = SampleOf(level, left + i / 3 % columns, top + i / 3 / columns, i % 3);
      if (tiled)
        TIFFWriteTile(file, block.data(), std::uint32_t(left), std::uint32_t(top), 0, 0);
      else
        TIFFWriteEncodedStrip(file, 0, block.data(), tmsize_t(block.size()));
    }
  TIFFWriteDirectory(file);
}

/// What a scanner writes: the picture in tiles, a thumbnail in one strip, and a copy of half the size in
/// tiles.
void WriteSlide(const std::string& path) {
  TIFF* file = TIFFOpen(path.c_str(), "w");
  WriteLevel(file, 0, true);
  WriteLevel(file, 2, false);
  WriteLevel(file, 1, true);
  TIFFClose(file);
}

void ExpectRows(ImageReader& reader, std::int32_t level, const Rect& part) {
  Bytes row(std::size_t(part.Width) * 3), expected(row.size());
  for (std::int32_t y = part.Y; y < part.Y + part.Height; ++y) {
    reader.ReadRow(row.data());
    for (std::size_t i = 0; i < row.size(); ++i)
      expected[i] = SampleOf(level, part.X + std::int32_t(i / 3), y, int(i % 3));
    ASSERT_EQ(row, expected) << "row " << y;
  }
}

// Catches a slide that is taken for a TIFF of pages, a level for another one, and places that are counted in
// the wrong level.
TEST(Slides, AreReadByLevelAndRegion) {
  if (std::ranges::none_of(FileTypes(),
                           [](const FileType* type) { return type->Name == std::string("slide"); }))
    GTEST_SKIP() << "not built";
  const PrivateDirectory directory("/tmp");
  const std::string path = (directory.Path() / "a.svs").string();
  WriteSlide(path);
  const Input input(path);
  const ReadOptions options{.MemoryLimit = 64 << 20};
  auto reader = OpenImage(input, options);
  const ImageInfo& info = reader->Info();
  ASSERT_STREQ(info.Type->Name, "slide");
  EXPECT_EQ(info.Pages, 1);
  ASSERT_EQ(info.Levels.size(), 1u);
  EXPECT_EQ(info.Levels[0].Width, 150);
  // Half a micrometre a pixel.
  ASSERT_TRUE(info.Density);
  EXPECT_DOUBLE_EQ(info.Density->X, 50800);
  ExpectRows(*reader, 0, {0, 0, Width, Height});
  for (const Rect& part : {Rect{70, 61, 130, 70}, Rect{299, 199, 1, 1}, Rect{0, 10, 300, 3}}) {
    ASSERT_TRUE(reader->Select(part));
    ExpectRows(*reader, 0, part);
  }
  const struct { std::int32_t Least, Width, Level; } cases[] = {{151, 300, 0}, {150, 150, 1}, {20, 150, 1}};
  for (const auto& [least, width, level] : cases) {
    SCOPED_TRACE(least);
    reader = OpenImage(input, options);
    reader->Reduce(least, 1);
    ASSERT_EQ(reader->Info().Width, width);
    ExpectRows(*reader, level, {0, 0, width, Height >> level});
    ASSERT_TRUE(reader->Select({31, 17, 90, 66}));
    ExpectRows(*reader, level, {31, 17, 90, 66});
  }
  std::filesystem::resize_file(path, std::filesystem::file_size(path) / 2);
  EXPECT_THROW(OpenImage(Input(path), options), Failure);
  std::filesystem::remove(path);
}

}

}
