#include <png.h>
#include <tiffio.h>

#include <cstdio>
#include <cstring>
// jpeglib.h needs FILE.
#include <jpeglib.h>

#include "command_test_support.h"

namespace picturezor::tests {

void WritePNG(const std::filesystem::path& file, const Raster& raster) {
  constexpr png_uint_32 formats[] = {0, PNG_FORMAT_GRAY, PNG_FORMAT_GA, PNG_FORMAT_RGB, PNG_FORMAT_RGBA};
  png_image image{};
  image.version = PNG_IMAGE_VERSION;
  image.width = png_uint_32(raster.Width);
  image.height = png_uint_32(raster.Height);
  image.format = formats[raster.Channels];
  ASSERT_TRUE(png_image_write_to_file(&image, file.c_str(), 0, raster.Samples.data(), 0, nullptr));
}

Raster ReadPNG(const std::filesystem::path& file) {
  png_image image{};
  image.version = PNG_IMAGE_VERSION;
  if (!png_image_begin_read_from_file(&image, file.c_str())) return {};
  Raster raster{int(image.width), int(image.height), int(PNG_IMAGE_SAMPLE_CHANNELS(image.format)), {}};
  raster.Samples.resize(PNG_IMAGE_SIZE(image));
  if (!png_image_finish_read(&image, nullptr, raster.Samples.data(), 0, nullptr)) return {};
  return raster;
}

void WriteJPEG(const std::filesystem::path& file, const Raster& raster, const JPEGExtras& extras) {
  constexpr J_COLOR_SPACE spaces[] = {JCS_UNKNOWN, JCS_GRAYSCALE, JCS_UNKNOWN, JCS_RGB, JCS_CMYK};
  std::FILE* stream = std::fopen(file.c_str(), "wb");
  jpeg_error_mgr errors;
  jpeg_compress_struct jpeg{};
  jpeg.err = jpeg_std_error(&errors);
  jpeg_create_compress(&jpeg);
  jpeg_stdio_dest(&jpeg, stream);
  jpeg.image_width = JDIMENSION(raster.Width);
  jpeg.image_height = JDIMENSION(raster.Height);
  jpeg.input_components = raster.Channels;
  jpeg.in_color_space = spaces[raster.Channels];
  jpeg_set_defaults(&jpeg);
  jpeg_set_quality(&jpeg, extras.Quality, TRUE);
  jpeg.comp_info[0].h_samp_factor = jpeg.comp_info[0].v_samp_factor = 1;
  if (extras.Progressive) jpeg_simple_progression(&jpeg);
  if (extras.DensityPerInch) {
    jpeg.density_unit = 1;
    jpeg.X_density = jpeg.Y_density = UINT16(extras.DensityPerInch);
  }
  jpeg_start_compress(&jpeg, TRUE);
  if (extras.Orientation) {
    Bytes exif{'E', 'x', 'i', 'f', 0, 0, 'I', 'I', 42, 0, 8, 0, 0, 0, 1, 0, 0x12, 1, 3, 0, 1, 0, 0, 0};
    exif.insert(exif.end(), {std::uint8_t(extras.Orientation), 0, 0, 0, 0, 0, 0, 0});
    jpeg_write_marker(&jpeg, JPEG_APP0 + 1, exif.data(), unsigned(exif.size()));
  }
  if (!extras.Profile.empty())
    jpeg_write_icc_profile(&jpeg, extras.Profile.data(), unsigned(extras.Profile.size()));
  while (jpeg.next_scanline < jpeg.image_height) {
    auto row = const_cast<JSAMPROW>(
        &raster.Samples[std::size_t(raster.Width * raster.Channels) * jpeg.next_scanline]);
    jpeg_write_scanlines(&jpeg, &row, 1);
  }
  jpeg_finish_compress(&jpeg);
  jpeg_destroy_compress(&jpeg);
  std::fclose(stream);
}

Raster ReadJPEG(const std::filesystem::path& file) {
  std::FILE* stream = std::fopen(file.c_str(), "rb");
  if (!stream) return {};
  jpeg_error_mgr errors;
  jpeg_decompress_struct jpeg{};
  jpeg.err = jpeg_std_error(&errors);
  jpeg_create_decompress(&jpeg);
  jpeg_stdio_src(&jpeg, stream);
  jpeg_read_header(&jpeg, TRUE);
  jpeg_start_decompress(&jpeg);
  Raster raster{int(jpeg.output_width), int(jpeg.output_height), jpeg.output_components, {}};
  const std::size_t row = jpeg.output_width * std::size_t(raster.Channels);
  raster.Samples.resize(row * jpeg.output_height);
  while (jpeg.output_scanline < jpeg.output_height) {
    JSAMPROW into = &raster.Samples[row * jpeg.output_scanline];
    jpeg_read_scanlines(&jpeg, &into, 1);
  }
  jpeg_finish_decompress(&jpeg);
  jpeg_destroy_decompress(&jpeg);
  std::fclose(stream);
  return raster;
}

void WriteTIFF(const std::filesystem::path& file, const Raster& raster, const TIFFExtras& extras) {
  TIFF* tiff = TIFFOpen(file.c_str(), extras.Mode.c_str());
  const int channels = raster.Channels, colours = extras.CMYK ? 4 : channels >= 3 ? 3 : 1;
  TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, raster.Width);
  TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, raster.Height);
  TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, extras.Bits);
  TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, channels);
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC,
               extras.CMYK    ? PHOTOMETRIC_SEPARATED
               : colours == 3 ? PHOTOMETRIC_RGB
                              : PHOTOMETRIC_MINISBLACK);
  TIFFSetField(tiff, TIFFTAG_PLANARCONFIG, extras.Planar ? PLANARCONFIG_SEPARATE : PLANARCONFIG_CONTIG);
  TIFFSetField(tiff, TIFFTAG_ORIENTATION, extras.Orientation);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, extras.Compression);
  TIFFSetField(tiff, TIFFTAG_FILLORDER, extras.FillOrder);
  if (extras.Tile) {
    TIFFSetField(tiff, TIFFTAG_TILEWIDTH, extras.Tile);
    TIFFSetField(tiff, TIFFTAG_TILELENGTH, extras.Tile);
  } else {
    TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, extras.RowsPerStrip);
  }
  if (channels > colours) {
    std::uint16_t kind = extras.Premultiplied ? EXTRASAMPLE_ASSOCALPHA : EXTRASAMPLE_UNASSALPHA;
    TIFFSetField(tiff, TIFFTAG_EXTRASAMPLES, 1, &kind);
  }
  if (extras.DensityPerInch > 0) {
    TIFFSetField(tiff, TIFFTAG_XRESOLUTION, extras.DensityPerInch);
    TIFFSetField(tiff, TIFFTAG_YRESOLUTION, extras.DensityPerInch);
    TIFFSetField(tiff, TIFFTAG_RESOLUTIONUNIT, RESUNIT_INCH);
  }
  if (!extras.Profile.empty())
    TIFFSetField(tiff, TIFFTAG_ICCPROFILE, unsigned(extras.Profile.size()), extras.Profile.data());
  const int planes = extras.Planar ? channels : 1, together = channels / planes, bits = extras.Bits;
  const int edge = extras.Tile ? extras.Tile : raster.Width, rows = extras.Tile ? extras.Tile : 1;
  const auto rowBytes = std::size_t(edge * together * bits + 7) / 8;
  Bytes block(rowBytes * std::size_t(rows));
  // A run of samples of one plane, as the file holds it.
  const auto put = [&](std::uint8_t* row, int at, int x, int y, int c) {
    if (x >= raster.Width || y >= raster.Height) return;
    const int v = raster.Samples[std::size_t((y * raster.Width + x) * channels + c)];
    const auto wide = std::uint16_t(v * 257 + extras.Shift);
    if (bits == 16)
      std::memcpy(row + 2 * at, &wide, 2);
    else
      row[at * bits / 8] |= std::uint8_t(v >> (8 - bits) << (8 - bits - at * bits % 8));
  };
  for (int plane = 0; plane < planes; ++plane)
    for (int top = 0; top < raster.Height; top += rows)
      for (int left = 0; left < raster.Width; left += edge) {
        std::ranges::fill(block, 0);
        for (int y = 0; y < rows; ++y)
          for (int x = 0; x < edge; ++x)
            for (int c = 0; c < together; ++c)
              put(&block[std::size_t(y) * rowBytes], x * together + c, left + x, top + y, plane + c);
        if (extras.Tile)
          TIFFWriteTile(tiff, block.data(), std::uint32_t(left), std::uint32_t(top), 0, std::uint16_t(plane));
        else
          TIFFWriteScanline(tiff, block.data(), std::uint32_t(top), std::uint16_t(plane));
      }
  TIFFClose(tiff);
}

Raster ReadTIFF(const std::filesystem::path& file) {
  TIFF* tiff = TIFFOpen(file.c_str(), "r");
  if (!tiff) return {};
  std::uint32_t width = 0, height = 0;
  std::uint16_t channels = 1, orientation = 1;
  TIFFGetField(tiff, TIFFTAG_IMAGEWIDTH, &width);
  TIFFGetField(tiff, TIFFTAG_IMAGELENGTH, &height);
  TIFFGetFieldDefaulted(tiff, TIFFTAG_SAMPLESPERPIXEL, &channels);
  TIFFGetFieldDefaulted(tiff, TIFFTAG_ORIENTATION, &orientation);
  EXPECT_EQ(orientation, 1);
  Raster raster{int(width), int(height), channels, Bytes(std::size_t(width) * height * channels)};
  for (std::uint32_t y = 0; y < height; ++y)
    TIFFReadScanline(tiff, &raster.Samples[std::size_t(width) * channels * y], y, 0);
  TIFFClose(tiff);
  return raster;
}

}
