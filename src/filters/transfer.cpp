#include <algorithm>

#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "frame/host_services.h"

namespace zor {
namespace {

constexpr FilterRules WithoutAlpha{.Groups = FilterRules::GrayAndRGB, .WritesAlpha = false};
constexpr FilterRules WithAlpha{.Groups = FilterRules::GrayAndRGB};

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
  return RunFilter(self, dest, WithoutAlpha, [&](const FilterCall& call) {
    const SampleTable table = TransferTable(gray);
    return MapPlanes(call, {.Gray = &table, .Red = &table, .Green = &table, .Blue = &table});
  });
}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* gray, IntegerArray* alpha) {
  return RunFilter(self, dest, WithAlpha, [&](const FilterCall& call) {
    const SampleTable table = TransferTable(gray), a = TransferTable(alpha);
    return MapPlanes(call, {.Gray = &table, .Red = &table, .Green = &table, .Blue = &table, .Alpha = &a});
  });
}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* red, IntegerArray* green,
                           IntegerArray* blue) {
  return RunFilter(self, dest, WithoutAlpha, [&](const FilterCall& call) {
    const SampleTable r = TransferTable(red), g = TransferTable(green), b = TransferTable(blue);
    return MapPlanes(call, {.Gray = &g, .Red = &r, .Green = &g, .Blue = &b});
  });
}

PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* red, IntegerArray* green,
                           IntegerArray* blue, IntegerArray* alpha) {
  return RunFilter(self, dest, WithAlpha, [&](const FilterCall& call) {
    const SampleTable r = TransferTable(red), g = TransferTable(green), b = TransferTable(blue),
                      a = TransferTable(alpha);
    return MapPlanes(call, {.Gray = &g, .Red = &r, .Green = &g, .Blue = &b, .Alpha = &a});
  });
}

}
