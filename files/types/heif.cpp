#include "file_types.h"
#include "type_module.h"

// AVIF and HEIC: the same boxes around pictures packed as AV1 or HEVC.

namespace picturezor::files {

namespace {

/// Whether the brands at the beginning of a file have one of those.
bool HasBrand(std::span<const std::uint8_t> start, std::initializer_list<std::string_view> brands) {
  if (start.size() < 16 || !StartsWith(start.subspan(4), "ftyp")) return false;
  const std::size_t size = std::size_t(start[2]) << 8 | start[3];
  for (std::size_t at = 8; at + 4 <= std::min(start.size(), size); at += at == 8 ? 8 : 4)
    for (const std::string_view brand : brands)
      if (StartsWith(start.subspan(at), brand)) return true;
  return false;
}

}

const FileType AVIFType{
    .Name = "AVIF",
    .Extensions = {".avif"},
    .Holds = {Format::RGB, Format::RGBA},
    .MostEdge = 65535,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          return HasBrand(start, {"avif", "avis"});
        },
    .InOrder = false,
    .Several = true,
    .Open = [](const Input& input,
               const ReadOptions& options) { return CodeOf("heif", "AVIF").Open(input, options); },
    .Create =
        [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
           const WriteOptions& options) {
          return CodeOf("heif", "AVIF").Create(descriptor, target, info, options);
        },
};

const FileType HEICType{
    .Name = "HEIC",
    .Extensions = {".heic", ".heif"},
    .Holds = {Format::RGB, Format::RGBA},
    .MostEdge = 16384,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          return HasBrand(start, {"heic", "heix", "heim", "heis", "hevc", "mif1", "msf1"});
        },
    .InOrder = false,
    .Several = true,
    .Open = [](const Input& input,
               const ReadOptions& options) { return CodeOf("heif", "HEIC").Open(input, options); },
    .Create =
        [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
           const WriteOptions& options) {
          return CodeOf("heif", "HEIC").Create(descriptor, target, info, options);
        },
};

}
