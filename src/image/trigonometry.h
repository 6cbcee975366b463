#pragma once

namespace zor {

// The C library's functions may differ in the last bit from one system to the next, and what is truncated
// afterwards turns that into another sample. These give the same bits on every machine: the double nearest to
// the true value, except where that is within about 2^-25 of the middle between two doubles. The angle is in
// radians; beyond 10^5 on either side, and of NaN, the result is NaN.

double Sine(double x);
double Cosine(double x);
double Tangent(double x);

}
