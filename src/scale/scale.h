#pragma once
#include "frame/method.h"

namespace zor {

/// The kernels of `Scale`, by their mode.
inline constexpr ConstantRecord KernelConstants[] = {
    {"ScaleTriangle", 0, 1}, {"ScaleBox", 0, 2},   {"ScaleLanczos3", 0, 3}, {"ScaleLanczos8", 0, 4},
    {"ScaleMitchell", 0, 5}, {"ScalePoly3", 0, 6}, {"ScaleCubic", 0, 7},
};

}
