#include "filters/filters.h"
#include "filters/plane_tables.h"
#include "image/arithmetic.h"
#include "image/powers.h"

namespace zor {
namespace {

constexpr FilterRules WithoutAlpha{.Groups = FilterRules::GrayAndRGB, .WritesAlpha = false};
constexpr FilterRules WithAlpha{.Groups = FilterRules::GrayAndRGB};

/// 255 (i / 255)^(1 / gamma), to the nearest.
SampleTable GammaTable(double gamma) {
  SampleTable table;
  for (int i = 0; i < 256; ++i) table[i] = Clamp(Truncate(Power(i / 255.0, 1.0 / gamma) * 255.0 + 0.5));
  return table;
}

/// The gamma that a gray picture takes of three. Its parts and itself are whole numbers.
double Mix(double red, double green, double blue) {
  const std::int64_t sum = std::int64_t{77} * Truncate(red) + std::int64_t{151} * Truncate(green) +
                           std::int64_t{28} * Truncate(blue);
  return double(sum / 256);
}

/// The tables of three gammas, as far as the group has planes for them.
bool MapThree(const FilterCall& call, double red, double green, double blue, const SampleTable* alpha) {
  if (call.Of < Group::RGB) {
    const SampleTable gray = GammaTable(Mix(red, green, blue));
    return MapPlanes(call, {.Gray = &gray, .Alpha = alpha});
  }
  const SampleTable r = GammaTable(red), g = GammaTable(green), b = GammaTable(blue);
  return MapPlanes(call, {.Red = &r, .Green = &g, .Blue = &b, .Alpha = alpha});
}

}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double gamma) {
  return RunFilter(self, dest, WithoutAlpha, [&](const FilterCall& call) {
    const SampleTable table = GammaTable(gamma);
    return MapPlanes(call, {.Gray = &table, .Red = &table, .Green = &table, .Blue = &table});
  });
}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double gamma, Double alphaGamma) {
  return RunFilter(self, dest, WithAlpha, [&](const FilterCall& call) {
    const SampleTable table = GammaTable(gamma), alpha = GammaTable(alphaGamma);
    return MapPlanes(call, {.Gray = &table, .Red = &table, .Green = &table, .Blue = &table, .Alpha = &alpha});
  });
}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double redGamma, Double greenGamma,
                        Double blueGamma) {
  return RunFilter(self, dest, WithoutAlpha, [&](const FilterCall& call) {
    return MapThree(call, redGamma, greenGamma, blueGamma, nullptr);
  });
}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double redGamma, Double greenGamma,
                        Double blueGamma, Double alphaGamma) {
  return RunFilter(self, dest, WithAlpha, [&](const FilterCall& call) {
    const SampleTable alpha = GammaTable(alphaGamma);
    return MapThree(call, redGamma, greenGamma, blueGamma, &alpha);
  });
}

}
