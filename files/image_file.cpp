#include "image_file.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include "failure.h"
#include "stream.h"

namespace picturezor::files {

namespace {

/// Beyond this a row of five samples a pixel would pass 2 GB.
constexpr std::int64_t MaxEdge = 400'000'000;

std::string Listed(const std::vector<std::string>& words) {
  std::string text;
  for (std::size_t i = 0; i < words.size(); ++i)
    text += (i == 0 ? "" : i + 1 == words.size() ? " or " : ", ") + words[i];
  return text;
}

}

bool StartsWith(std::span<const std::uint8_t> bytes, std::string_view magic) {
  return bytes.size() >= magic.size() && std::memcmp(bytes.data(), magic.data(), magic.size()) == 0;
}

void ImageReader::ReadRows(std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count) {
  for (std::int32_t i = 0; i < count; ++i, rows += stride) ReadRow(rows);
}

void ImageWriter::WriteRows(const std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t count) {
  for (std::int32_t i = 0; i < count; ++i, rows += stride) WriteRow(rows);
}

std::unique_ptr<ImageReader> OpenImage(const std::filesystem::path& file, const ReadOptions& options) {
  Bytes start(64);
  {
    const Stream stream = OpenForReading(file);
    start.resize(std::fread(start.data(), 1, start.size(), stream.get()));
    if (std::ferror(stream.get())) throw Failure(file, std::strerror(errno));
  }
  if (start.empty()) throw Failure(file, "the file is empty");
  std::vector<std::string> names;
  for (const FileType* type : FileTypes()) {
    if (type->Begins(start)) return type->Open(file, options);
    names.emplace_back(type->Name);
  }
  throw Failure(file, "not a " + Listed(names) + " image");
}

const FileType& TypeByExtension(const std::filesystem::path& file) {
  std::string extension = file.extension().string();
  std::ranges::transform(extension, extension.begin(),
                         [](unsigned char c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; });
  std::vector<std::string> endings;
  for (const FileType* type : FileTypes())
    for (const std::string_view ending : type->Extensions) {
      if (extension == ending) return *type;
      endings.emplace_back(ending);
    }
  throw UsageFailure(file, "the name must end in " + Listed(endings));
}

Format StorableFormat(const std::filesystem::path& file, const FileType& type, Format pixels) {
  for (const Format format : {pixels, WithoutAlpha(pixels)})
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

void RequireWithinLimit(const std::filesystem::path& file, std::int64_t bytes, std::int64_t memoryLimit,
                        const std::string& what) {
  if (bytes > memoryLimit)
    throw Failure(file, what + " needs " + std::to_string((bytes >> 20) + 1) +
                            " MB at once, more than --memory-limit allows");
}

}
