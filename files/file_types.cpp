#include "file_types.h"

#include <array>

namespace picturezor::files {

std::span<const FileType* const> FileTypes() {
  static constexpr std::array all{&PNGType, &JPEGType, &TIFFType, &PNMType};
  return all;
}

}
