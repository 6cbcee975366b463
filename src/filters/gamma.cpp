#include "filters/curves.h"
#include "filters/filters.h"
#include "image/arithmetic.h"
#include "image/powers.h"

namespace zor {
namespace {

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

/// One gamma for the colours; without one for alpha, alpha is left alone.
PictureZOR* MapGamma(PictureZOR* self, PictureZOR* dest, double gamma, std::optional<double> alpha) {
  return MapCurves<double>(self, dest, GammaTable, {gamma, gamma, gamma, alpha});
}
/// One for each colour.
PictureZOR* MapGammas(PictureZOR* self, PictureZOR* dest, double red, double green, double blue,
                      std::optional<double> alpha) {
  if (DataOf(self).IsGray) return MapGamma(self, dest, Mix(red, green, blue), alpha);
  return MapCurves<double>(self, dest, GammaTable, {red, green, blue, alpha});
}

}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double gamma) {
  return MapGamma(self, dest, gamma, {});
}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double gamma, Double alphaGamma) {
  return MapGamma(self, dest, gamma, alphaGamma);
}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double redGamma, Double greenGamma,
                        Double blueGamma) {
  return MapGammas(self, dest, redGamma, greenGamma, blueGamma, {});
}

PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double redGamma, Double greenGamma,
                        Double blueGamma, Double alphaGamma) {
  return MapGammas(self, dest, redGamma, greenGamma, blueGamma, alphaGamma);
}

}
