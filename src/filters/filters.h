#pragma once
#include "frame/method.h"

namespace zor {

/// The matrices of `DitherFilter`.
inline constexpr ConstantRecord DitherConstants[] = {
    {"DitherMagic2x2Matrix", 0, 1},   {"DitherMagic4x4Matrix", 0, 2},      {"DitherOrdered4x4Matrix", 0, 3},
    {"DitherLines4x4Matrix", 0, 4},   {"Dither90Halftone6x6Matrix", 0, 5}, {"DitherOrdered6x6Matrix", 0, 6},
    {"DitherOrdered8x8Matrix", 0, 7}, {"DitherCluster3Matrix", 0, 8},      {"DitherCluster4Matrix", 0, 9},
    {"DitherCluster8Matrix", 0, 10},
};

}
