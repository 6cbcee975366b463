#pragma once
#include "image/picture_data.h"

namespace zor {

/// Thresholds that are tiled over a picture: Side x Side cells, row by row.
struct DitherMatrix {
  std::int32_t Side;
  const Sample* Cells;
};

/// The matrix behind one of the class's constants; null for another number.
const DitherMatrix* MatrixOf(std::int32_t number);

}
