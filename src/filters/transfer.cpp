#include <algorithm>

#include "filters/curves.h"
#include "filters/filters.h"
#include "frame/host_services.h"

namespace zor {
namespace {

/// The low 8 bits of the elements 0 to 255; 0 where there is none.
SampleTable TransferTable(IntegerArray* array) {
  SampleTable table{};
  if (!array) return table;
  const std::int32_t last = std::min(RuntimeUBound(array), 255);
  for (std::int32_t i = 0; i <= last; ++i) table[i] = Sample(RuntimeDirectReadIntArray(array, i));
  return table;
}

}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* gray) {
  return MapCurves(self, dest, TransferTable, {gray, gray, gray, {}});
}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* gray, IntegerArray* alpha) {
  return MapCurves(self, dest, TransferTable, {gray, gray, gray, alpha});
}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* red, IntegerArray* green,
                           IntegerArray* blue) {
  return MapCurves(self, dest, TransferTable, {red, green, blue, {}});
}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* red, IntegerArray* green,
                           IntegerArray* blue, IntegerArray* alpha) {
  return MapCurves(self, dest, TransferTable, {red, green, blue, alpha});
}

}
