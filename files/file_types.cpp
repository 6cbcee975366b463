#include "file_types.h"

namespace picturezor::files {

std::span<const FileType* const> FileTypes() {
  static constexpr const FileType* all[] = {
      &PNGType,      &JPEGType, &TIFFType,
#ifdef PICTUREZOR_WEBP
      &WebPType,
#endif
#ifdef PICTUREZOR_JPEG_XL
      &JPEGXLType,
#endif
#ifdef PICTUREZOR_HEIF
      &AVIFType,     &HEICType,
#endif
#ifdef PICTUREZOR_JPEG_2000
      &JPEG2000Type,
#endif
      &PNMType,
  };
  return all;
}

}
