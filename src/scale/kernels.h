#pragma once
#include <cstdint>

namespace zor {

/// The resampling kernels, by the `mode` of `Scale`.
enum class ScaleKernel : std::int32_t {
  Triangle = 1,
  Box,
  Lanczos3,
  Lanczos8,
  Mitchell,
  Poly3,
  Cubic,
};

/// Whether an integer is one of them.
inline bool IsKernel(std::int32_t mode) { return mode >= 1 && mode <= 7; }

/// How far from the centre of an output line source lines are looked for, in source lines where the picture
/// grows and in output lines where it shrinks.
double SearchRadius(ScaleKernel kernel);

/// The kernel's value at the distance `a`, 0 or more; false beyond its reach. Triangle and the windowed sincs
/// (Lanczos) are textbook. Mitchell is the filter of Mitchell and Netravali, "Reconstruction Filters in
/// Computer Graphics", 1988, with B and C both 1/3; Poly3 is cubic convolution after Keys, "Cubic Convolution
/// Interpolation for Digital Image Processing", 1981, with the parameter -0.75; Cubic is Keys' cubic of three
/// pieces.
bool KernelValue(ScaleKernel kernel, double a, double& value);

}
