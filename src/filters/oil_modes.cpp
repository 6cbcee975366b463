#include "filters/oil_modes.h"

#include "image/targets.h"

namespace zor {
namespace {

/// The counts plus a column's and less another's. The largest of them.
Sample Slide(Sample* counts, const Sample* entering, const Sample* leaving, std::ptrdiff_t classes) {
  Sample most = 0;
  for (std::ptrdiff_t j = 0; j < classes; ++j) {
    const Sample count = Sample(counts[j] + Sample(entering[j] - leaving[j]));
    counts[j] = count;
    most = most > count ? most : count;
  }
  return most;
}

/// The first class with so many samples. In bytes throughout, so that it becomes vector code.
Sample FirstWith(Sample most, const Sample* counts, const Sample* names, std::ptrdiff_t classes) {
  Sample first = 255;
  for (std::ptrdiff_t j = 0; j < classes; ++j) {
    const Sample name = Sample(names[j] | Sample(-(counts[j] != most)));
    first = first < name ? first : name;
  }
  return first;
}

void FindPlaneModes(const CountedColumns& of, std::ptrdiff_t plane, Sample* modes, Sample* counts) {
  const CountedColumns columns = of;
  Sample* const around = columns.Around + plane * columns.Classes;
  Sample names[256];
  for (int j = 0; j < 256; ++j) names[j] = Sample(j);
  for (std::ptrdiff_t x = columns.First; x < columns.End; ++x) {
    const Sample most = Slide(around, columns.Entering(x, plane), columns.Leaving(x, plane), columns.Classes);
    if (x < 2 * columns.Range) continue;
    const std::ptrdiff_t place = (x - 2 * columns.Range) * columns.Pixel + plane;
    modes[place] = FirstWith(most, around, names, columns.Classes);
    counts[place] = most;
  }
}

}

void FindModes(const CountedColumns& columns, Sample* modes, Sample* counts) {
  for (std::ptrdiff_t plane = 0; plane < columns.Pixel; ++plane)
    OnBestTarget<FindPlaneModes>(columns, plane, modes, counts);
}

}
