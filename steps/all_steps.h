#pragma once
#include "step.h"

namespace picturezor::steps {

/// Each stands in a file of its name.
extern const Step Scale, Crop, Convert, Mirror, Rotate, Combine;
extern const Step Invert, AutoLevel, Solarize, Gamma, Gain, Transfer, Matrix, Blur, SoftBlur, Stamp, Unsharp,
    Oil, Diffuse, Engrave, Neon, Dither;

}
