#pragma once
#include "image_file.h"

namespace picturezor::files {

// Each stands in the file of its name under types/. Not all are built: see FileTypes.
extern const FileType PNGType, JPEGType, TIFFType, PNMType, WebPType, JPEGXLType, JPEG2000Type, AVIFType,
    HEICType, SlideType;

}
