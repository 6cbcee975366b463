#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "image/arithmetic.h"
#include "image/powers.h"

namespace zor {
namespace {

/// Gain by a power curve in each half of the range, mirrored at the middle, and bias by a fraction. u is 1 -
/// x.
SampleTable GainTable(double gain, double bias) {
  const double p = Logarithm(1.0 - gain) / Logarithm(0.5), b = 1.0 / bias - 2.0;
  SampleTable table;
  for (int i = 0; i < 256; ++i) {
    const double t = i / 255.0, s = 1.0 - t;
    double x = 0.0, u = 1.0;
    if (t > 0.999) {
      x = 1.0;
      u = 0.0;
    } else if (t >= 0.001) {
      x = t < 0.5 ? Power(t + t, p) * 0.5 : 1.0 - 0.5 * Power(s + s, p);
      u = 1.0 - x;
    }
    table[i] = Clamp(Truncate(x / (u * b + 1.0) * 255.0));
  }
  return table;
}

}

PictureZOR* GainFilter(PictureZOR* self, PictureZOR* dest, Double gain, Double bias) {
  return RunFilter(self, dest, {.Groups = FilterRules::GrayAndRGB}, [&](const FilterCall& call) {
    const SampleTable table = GainTable(gain, bias);
    return MapPlanes(call, EveryPlane(table));
  });
}

}
