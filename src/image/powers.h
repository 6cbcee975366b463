#pragma once

namespace zor {

// The C library's `pow` and `log` may differ in the last bit from one system to the next, and tables that
// truncate turn that into another sample. These give the same bits on every machine: the double nearest to
// the true value, except where that is within about 2^-40 of the middle between two doubles.

/// The natural logarithm. Of 0 minus infinity, below 0 NaN.
double Logarithm(double value);

/// base^exponent for a base of 0 or above; NaN for one below. The special cases are those of C's `pow`: x^0
/// and 1^y are 1, whatever the other is. Below 2^-1022 the last bit may be off.
double Power(double base, double exponent);

}
