#pragma once
#include "image_file.h"

namespace picturezor::files {

std::unique_ptr<ImageWriter> WriteTIFF(int descriptor, const std::filesystem::path& target,
                                       const ImageInfo& info, const WriteOptions& options);

}
