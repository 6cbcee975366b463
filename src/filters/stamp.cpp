#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "image/arithmetic.h"

namespace zor {
namespace {

/// A smooth step from one component to another, over the samples from lower to upper.
SampleTable StampTable(double lower, double upper, int black, int white) {
  SampleTable table;
  for (int i = 0; i < 256; ++i) {
    double s;
    if (lower > i) {
      s = 0.0;
    } else if (upper <= i) {
      s = 1.0;
    } else {
      const double t = (i - lower) / (upper - lower);
      s = t * t * (3.0 - 2.0 * t);
    }
    table[i] = Sample(Truncate(s * (white - black) + black));
  }
  return table;
}

int Red(Color colour) { return colour >> 16 & 255; }
int Green(Color colour) { return colour >> 8 & 255; }
int Blue(Color colour) { return colour & 255; }

}

PictureZOR* StampFilter(PictureZOR* self, PictureZOR* dest, Double radius, Double threshold, Double softness,
                        Color Black, Color White) {
  const Held blurred(BoxBlurFilter(self, dest, radius / 3.0, 3, true, true));
  if (!blurred) return nullptr;
  const double lower = (threshold - 0.5 * softness) * 255.0, upper = (threshold + 0.5 * softness) * 255.0;
  const auto table = [&](int (*component)(Color)) {
    return StampTable(lower, upper, component(Black), component(White));
  };
  constexpr FilterRules rules{.Groups = FilterRules::GrayAndRGB, .WritesAlpha = false};
  return RunFilter(blurred.Object(), nullptr, rules, [&](const FilterCall& call) {
    const SampleTable red = table(Red), green = table(Green), blue = table(Blue);
    return MapPlanes(call, {.Gray = &green, .Red = &red, .Green = &green, .Blue = &blue});
  });
}

}
