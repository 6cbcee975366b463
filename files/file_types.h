#pragma once
#include "image_file.h"

namespace picturezor::files {

// Each stands in the file of its name under types/.
extern const FileType PNGType, JPEGType, TIFFType, PNMType, WebPType, JPEGXLType, AVIFType, HEICType,
    JPEG2000Type, SlideType;

}
