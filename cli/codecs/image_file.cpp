#include "codecs/image_file.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include "codecs/stream.h"
#include "failure.h"

namespace picturezor::cli {

namespace {

/// Beyond this a row of five samples a pixel would pass 2 GB.
constexpr std::int64_t MaxEdge = 400'000'000;

bool StartsWith(std::span<const std::uint8_t> bytes, std::string_view magic) {
  return bytes.size() >= magic.size() && std::memcmp(bytes.data(), magic.data(), magic.size()) == 0;
}

}

std::string NameOf(FileType type) {
  switch (type) {
    case FileType::PNG: return "PNG";
    case FileType::JPEG: return "JPEG";
    case FileType::TIFF: return "TIFF";
  }
  return {};
}

std::unique_ptr<ImageReader> OpenImage(const std::filesystem::path& file, std::int64_t memoryLimit) {
  Bytes start(8);
  {
    const Stream stream = OpenForReading(file);
    start.resize(std::fread(start.data(), 1, start.size(), stream.get()));
    if (std::ferror(stream.get())) throw Failure(file, std::strerror(errno));
  }
  if (start.empty()) throw Failure(file, "the file is empty");
  using namespace std::string_view_literals;
  if (StartsWith(start, "\x89PNG"sv)) return OpenPNG(file, memoryLimit);
  if (StartsWith(start, "\xFF\xD8"sv)) return OpenJPEG(file, memoryLimit);
  for (const auto magic : {"II*\0"sv, "MM\0*"sv, "II+\0"sv, "MM\0+"sv})
    if (StartsWith(start, magic)) return OpenTIFF(file, memoryLimit);
  throw Failure(file, "not a PNG, JPEG or TIFF image");
}

FileType TypeByExtension(const std::filesystem::path& file) {
  std::string extension = file.extension().string();
  std::ranges::transform(extension, extension.begin(),
                         [](unsigned char c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; });
  if (extension == ".png") return FileType::PNG;
  if (extension == ".jpg" || extension == ".jpeg" || extension == ".jpe") return FileType::JPEG;
  if (extension == ".tif" || extension == ".tiff") return FileType::TIFF;
  throw UsageFailure(file, "the name must end in .png, .jpg, .jpeg, .tif or .tiff");
}

Format StorableFormat(const std::filesystem::path& file, FileType type, Format pixels) {
  const bool cmyk = WithoutAlpha(pixels) == Format::CMYK;
  if (type == FileType::PNG && cmyk) throw Failure(file, "PNG can't hold CMYK; write a .tif or .jpg");
  return type == FileType::JPEG ? WithoutAlpha(pixels) : pixels;
}

void RequireStorableSize(const std::filesystem::path& file, FileType type, std::int64_t width,
                         std::int64_t height) {
  const std::int64_t edge = type == FileType::JPEG ? 65500 : MaxEdge;
  if (width > edge || height > edge)
    throw Failure(file, std::to_string(width) + " x " + std::to_string(height) + " pixels are too many: " +
                            NameOf(type) + " goes up to " + std::to_string(edge) + " in each direction");
}

std::unique_ptr<ImageWriter> CreateImage(int descriptor, const std::filesystem::path& target, FileType type,
                                         const ImageInfo& info, const WriteOptions& options) {
  switch (type) {
    case FileType::PNG: return CreatePNG(descriptor, target, info);
    case FileType::JPEG: return CreateJPEG(descriptor, target, info, options);
    case FileType::TIFF: return CreateTIFF(descriptor, target, info);
  }
  return nullptr;
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

void RequireWithinLimit(const std::filesystem::path& file, std::int64_t bytes, std::int64_t memoryLimit,
                        const std::string& what) {
  if (bytes > memoryLimit)
    throw Failure(file, what + " needs " + std::to_string((bytes >> 20) + 1) +
                            " MB at once, more than --memory-limit allows");
}

}
