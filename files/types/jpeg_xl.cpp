#include "jpeg_xl.h"

#include "file_types.h"
#include "type_module.h"

namespace picturezor::files {

const FileType JPEGXLType{
    .Name = "JPEG XL",
    .Extensions = {".jxl"},
    .Holds = {Format::G, Format::GA, Format::RGB, Format::RGBA},
    .MostEdge = 1 << 30,
    .Begins =
        [](std::span<const std::uint8_t> start) {
          return StartsWith(start, BoxedMagic) || StartsWith(start, BareMagic);
        },
    .InOrder = false,
    .Several = true,
    .Open = [](const Input& input,
               const ReadOptions& options) { return CodeOf("jpeg_xl", "JPEGXL").Open(input, options); },
    .Create =
        [](int descriptor, const std::filesystem::path& target, const ImageInfo& info,
           const WriteOptions& options) {
          return CodeOf("jpeg_xl", "JPEGXL").Create(descriptor, target, info, options);
        },
};

}
