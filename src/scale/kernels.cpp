#include "scale/kernels.h"

#include "image/trigonometry.h"

namespace zor {
namespace {

constexpr double Pi = 3.141592653589793;

double Sinc(double t) {
  if (t == 0.0) return 1.0;
  const double p = t * Pi;
  return Sine(p) / p;
}

bool Lanczos(double a, double reach, double perReach, double& value) {
  if (!(a < reach)) return false;
  value = Sinc(a) * Sinc(perReach);
  return true;
}

bool Mitchell(double a, double& value) {
  const double s = a * a;
  if (a < 1.0)
    value = ((a * s) * 7.0 + s * -12.0 + 16.0 / 3.0) / 6.0;
  else if (a < 2.0)
    value = ((a * s) * (-7.0 / 3.0) + s * 12.0 + a * -20.0 + 32.0 / 3.0) / 6.0;
  else
    return false;
  return true;
}

bool Poly3(double a, double& value) {
  if (a < 1.0)
    value = a * (a * (a * 1.25 - 2.25)) + 1.0;
  else if (a < 2.0)
    value = a * (a * (a * -0.75 + 3.75) - 6.0) + 3.0;
  else
    return false;
  return true;
}

bool Cubic(double a, double& value) {
  const double s = a * a;
  if (a <= 1.0)
    value = a * (s * (4.0 / 3.0)) + s * (-7.0 / 3.0) + 1.0;
  else if (a <= 2.0)
    value = a * (s * (-7.0 / 12.0)) + s * 3.0 + a * (-59.0 / 12.0) + 2.5;
  else if (a <= 3.0)
    value = a * (s * (1.0 / 12.0)) + s * (-2.0 / 3.0) + a * 1.75 - 1.5;
  else
    return false;
  return true;
}

}

double SearchRadius(ScaleKernel kernel) {
  switch (kernel) {
    case ScaleKernel::Triangle: return 1.0;
    case ScaleKernel::Box: return 0.5;
    case ScaleKernel::Lanczos8: return 8.0;
    case ScaleKernel::Mitchell: return 2.0;
    // Twice as far as it reaches; what lies beyond gives no entry.
    case ScaleKernel::Poly3: return 4.0;
    case ScaleKernel::Lanczos3:
    case ScaleKernel::Cubic: return 3.0;
  }
  return 0.0;
}

bool KernelValue(ScaleKernel kernel, double a, double& value) {
  switch (kernel) {
    case ScaleKernel::Triangle: value = 1.0 - a; return a < 1.0;
    case ScaleKernel::Box: value = 1.0; return a <= 0.5;
    case ScaleKernel::Lanczos3: return Lanczos(a, 3.0, a / 3.0, value);
    case ScaleKernel::Lanczos8: return Lanczos(a, 8.0, a * 0.125, value);
    case ScaleKernel::Mitchell: return Mitchell(a, value);
    case ScaleKernel::Poly3: return Poly3(a, value);
    case ScaleKernel::Cubic: return Cubic(a, value);
  }
  return false;
}

}
