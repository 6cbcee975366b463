#include "image_file.h"

#include <algorithm>
#include <cstring>

#include "failure.h"

namespace picturezor::files {

namespace {

/// Beyond this a row of five samples a pixel would pass 2 GB.
constexpr std::int64_t MaxEdge = 400'000'000;

}

bool StartsWith(std::span<const std::uint8_t> bytes, std::string_view magic) {
  return bytes.size() >= magic.size() && std::memcmp(bytes.data(), magic.data(), magic.size()) == 0;
}

const std::map<std::string, Compression>& Compressions() {
  static const std::map<std::string, Compression> all{
      {"none", Compression::None}, {"lzw", Compression::LZW},   {"deflate", Compression::Deflate},
      {"zstd", Compression::Zstd}, {"jpeg", Compression::JPEG}, {"webp", Compression::WebP}};
  return all;
}

void ImageReader::SetBits(int bits) {
  About.Bits = bits;
  if (bits > 8) About.Notes.push_back(std::to_string(bits) + " bits per sample reduced to 8");
}

void ImageReader::ReadRows(std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count) {
  for (std::int32_t i = 0; i < count; ++i, rows += stride) ReadRow(rows);
}

void ImageWriter::WriteRows(const std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count) {
  for (std::int32_t i = 0; i < count; ++i, rows += stride) WriteRow(rows);
}

Format StorableFormat(const std::filesystem::path& file, const FileType& type, Format pixels) {
  // Gray is RGB without loss.
  const Format colour = WithoutAlpha(pixels);
  const Format wider = colour == Format::G ? Format::RGB : colour;
  for (const Format format : {pixels, HasAlpha(pixels) ? WithAlpha(wider) : wider, colour, wider})
    if (std::ranges::find(type.Holds, format) != type.Holds.end()) return format;
  throw Failure(file, std::string(type.Name) + " can't hold " + Describe(pixels) + "; write a .tif or .jpg");
}

void RequireStorableSize(const std::filesystem::path& file, const FileType& type, std::int64_t width,
                         std::int64_t height) {
  const std::int64_t edge = std::min(type.MostEdge, MaxEdge);
  if (width > edge || height > edge)
    throw Failure(file, std::to_string(width) + " x " + std::to_string(height) + " pixels are too many: " +
                            type.Name + " goes up to " + std::to_string(edge) + " in each direction");
}

int ChannelsOf(Format format) { return BytesPerPixel(format); }

bool HasAlpha(Format format) {
  return format == Format::GA || format == Format::RGBA || format == Format::CMYKA;
}

Format WithoutAlpha(Format format) {
  switch (format) {
    case Format::GA: return Format::G;
    case Format::RGBA: return Format::RGB;
    case Format::CMYKA: return Format::CMYK;
    default: return format;
  }
}

Format WithAlpha(Format format) {
  switch (format) {
    case Format::G: return Format::GA;
    case Format::RGB: return Format::RGBA;
    case Format::CMYK: return Format::CMYKA;
    default: return format;
  }
}

std::string Describe(Format format) {
  const Format colour = WithoutAlpha(format);
  const std::string name = colour == Format::G ? "gray" : colour == Format::RGB ? "RGB" : "CMYK";
  return HasAlpha(format) ? name + " with alpha" : name;
}

bool ProfileFits(std::span<const std::uint8_t> profile, Format format) {
  if (profile.size() < 128) return false;
  const Format colour = WithoutAlpha(format);
  return StartsWith(profile.subspan(16), colour == Format::G     ? "GRAY"
                                         : colour == Format::RGB ? "RGB "
                                                                 : "CMYK");
}

void RequirePlausible(const std::filesystem::path& file, std::int64_t width, std::int64_t height,
                      std::int64_t fileSize, double pixelsPerByte) {
  const std::string size = std::to_string(width) + " x " + std::to_string(height) + " pixels";
  if (width < 1 || height < 1) throw Failure(file, "the image has no pixels");
  if (width > MaxEdge || height > MaxEdge) throw Failure(file, size + " are too many");
  if (double(width) * double(height) > double(fileSize) * pixelsPerByte)
    throw Failure(file,
                  "corrupt: it claims " + size + ", which " + std::to_string(fileSize) + " bytes can't hold");
}

void RequirePage(const Input& input, const ReadOptions& options, int pages) {
  if (options.Page >= pages)
    throw Failure(input.Name(), "there " +
                                    (pages == 1 ? std::string("is one picture")
                                                : "are " + std::to_string(pages) + " pictures") +
                                    " in it");
}

void TakeAlphaOut(std::uint8_t* row, std::int64_t width, int channels) {
  for (std::int64_t x = 0; x < width; ++x, row += channels) {
    const int alpha = row[channels - 1];
    for (int c = 0; c < channels - 1; ++c)
      row[c] = std::uint8_t(alpha ? std::min(255, (row[c] * 255 + alpha / 2) / alpha) : 0);
  }
}

void RequireWithinLimit(const std::filesystem::path& file, std::int64_t bytes, std::int64_t memoryLimit,
                        const std::string& what) {
  if (bytes > memoryLimit)
    throw Failure(file, what + " needs " + std::to_string((bytes >> 20) + 1) +
                            " MB at once, more than --memory-limit allows");
}

}
