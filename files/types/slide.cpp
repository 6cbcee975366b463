#include <algorithm>

#include "file_types.h"
#include "type_module.h"

// Scans of microscopes, of several makers.

namespace picturezor::files {

const FileType SlideType{
    .Name = "slide",
    .Extensions = {".svs", ".ndpi", ".mrxs", ".scn", ".bif", ".vms", ".vmu", ".svslide"},
    .Holds = {Format::RGB},
    .MostEdge = INT32_MAX,
    .Begins = [](std::span<const std::uint8_t>) { return true; },
    // Some of them are ordinary TIFF or JPEG files at the beginning.
    .Is =
        [](const Input& input) {
          const std::string ending = input.Path().extension().string();
          return std::ranges::find(SlideType.Extensions, ending) != SlideType.Extensions.end() &&
                 CodeOf("slide", "Slide").Is(input);
        },
    .InOrder = false,
    .Parts = true,
    .Open = [](const Input& input,
               const ReadOptions& options) { return CodeOf("slide", "Slide").Open(input, options); },
    .Create = nullptr,
};

}
