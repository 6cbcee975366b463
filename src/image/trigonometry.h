#pragma once
#include <cmath>

namespace zor {

inline double Sine(double x) { return std::sin(x); }

}
