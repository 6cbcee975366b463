#include "tiff_encoder.h"

#include <algorithm>

#include "failure.h"

namespace picturezor::files {

namespace {

std::uint16_t CodeOf(Compression packing) {
  switch (packing) {
    case Compression::None: return COMPRESSION_NONE;
    case Compression::Deflate: return COMPRESSION_ADOBE_DEFLATE;
    case Compression::Zstd: return COMPRESSION_ZSTD;
    case Compression::JPEG: return COMPRESSION_JPEG;
    case Compression::WebP: return COMPRESSION_WEBP;
    default: return COMPRESSION_LZW;
  }
}

}

void SetShape(TIFFHandle& file, const TIFFShape& shape) {
  const Format colour = WithoutAlpha(shape.Pixels);
  const bool jpeg = shape.Packing == Compression::JPEG;
  if (shape.Reduced) file.Set(TIFFTAG_SUBFILETYPE, FILETYPE_REDUCEDIMAGE);
  file.Set(TIFFTAG_IMAGEWIDTH, std::uint32_t(shape.Width));
  file.Set(TIFFTAG_IMAGELENGTH, std::uint32_t(shape.Height));
  file.Set(TIFFTAG_BITSPERSAMPLE, 8);
  file.Set(TIFFTAG_SAMPLESPERPIXEL, ChannelsOf(shape.Pixels));
  file.Set(TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG);
  file.Set(TIFFTAG_ORIENTATION, ORIENTATION_TOPLEFT);
  file.Set(TIFFTAG_COMPRESSION, CodeOf(shape.Packing));
  file.Set(TIFFTAG_PHOTOMETRIC, colour == Format::G      ? PHOTOMETRIC_MINISBLACK
                                : colour == Format::CMYK ? PHOTOMETRIC_SEPARATED
                                : jpeg                   ? PHOTOMETRIC_YCBCR
                                                         : PHOTOMETRIC_RGB);
  if (HasAlpha(shape.Pixels)) {
    std::uint16_t kind = EXTRASAMPLE_UNASSALPHA;
    file.Set(TIFFTAG_EXTRASAMPLES, 1, &kind);
  }
  if (shape.Tile) {
    file.Set(TIFFTAG_TILEWIDTH, std::uint32_t(shape.Tile));
    file.Set(TIFFTAG_TILELENGTH, std::uint32_t(shape.Tile));
  } else {
    file.Set(TIFFTAG_ROWSPERSTRIP, std::uint32_t(shape.RowsPerStrip));
  }
  switch (shape.Packing) {
    case Compression::JPEG:
      file.Set(TIFFTAG_JPEGQUALITY, shape.Quality);
      if (colour != Format::RGB) break;
      file.Set(TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
      if (shape.Quality >= 90) file.Set(TIFFTAG_YCBCRSUBSAMPLING, 1, 1);
      break;
    case Compression::WebP: file.Set(TIFFTAG_WEBP_LEVEL, shape.Quality); break;
    case Compression::Deflate:
      if (shape.Level) file.Set(TIFFTAG_ZIPQUALITY, *shape.Level);
      [[fallthrough]];
    case Compression::Zstd:
      if (shape.Level && shape.Packing == Compression::Zstd)
        file.Set(TIFFTAG_ZSTD_LEVEL, std::max(1, *shape.Level));
      [[fallthrough]];
    case Compression::LZW: file.Set(TIFFTAG_PREDICTOR, PREDICTOR_HORIZONTAL); break;
    default: break;
  }
}

TIFFEncoder::TIFFEncoder(const std::filesystem::path& target, const TIFFShape& shape)
    : Tiled(shape.Tile > 0) {
  File = TIFFHandle::CreateInMemory(target, Written);
  // A file of one piece, which is written again and again.
  TIFFShape piece = shape;
  if (!Tiled) piece.Height = shape.RowsPerStrip;
  SetShape(*File, piece);
}

Bytes TIFFEncoder::Pack(std::span<std::uint8_t> samples) {
  Written.clear();
  const auto size = tmsize_t(samples.size());
  File->Check((Tiled ? TIFFWriteEncodedTile(*File, 0, samples.data(), size)
                     : TIFFWriteEncodedStrip(*File, 0, samples.data(), size)) == size);
  return std::move(Written);
}

Bytes TIFFEncoder::Tables() const {
  std::uint32_t size = 0;
  const std::uint8_t* tables = nullptr;
  if (TIFFGetField(*File, TIFFTAG_JPEGTABLES, &size, &tables) != 1) return {};
  return {tables, tables + size};
}

}
