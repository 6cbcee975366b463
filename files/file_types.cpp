#include "file_types.h"

namespace picturezor::files {

std::span<const FileType* const> FileTypes() {
  // clang-format off
  static constexpr const FileType* all[] = {
#ifdef PICTUREZOR_SLIDE
      &SlideType,
#endif
      &PNGType,
      &JPEGType,
      &TIFFType,
#ifdef PICTUREZOR_WEBP
      &WebPType,
#endif
#ifdef PICTUREZOR_JPEG_XL
      &JPEGXLType,
#endif
#ifdef PICTUREZOR_HEIF
      &AVIFType,
      &HEICType,
#endif
#ifdef PICTUREZOR_JPEG_2000
      &JPEG2000Type,
#endif
      &PNMType,
  };
  // clang-format on
  return all;
}

}
