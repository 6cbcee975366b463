#include "image/powers.h"

#include <array>
#include <cmath>
#include <cstddef>
#include <limits>

#include "image/number_pair.h"

// Logarithm and exponential are their series, after the argument has been brought near 1 and near 0 by powers
// of two.

namespace zor {
namespace {

constexpr double Infinity = std::numeric_limits<double>::infinity();
constexpr double NotANumber = std::numeric_limits<double>::quiet_NaN();

constexpr NumberPair Log2{0x1.62e42fefa39efp-1, 0x1.abc9e3b39803fp-56};

/// 1, 1/3, 1/5 ...
constexpr auto OddInverses = [] {
  std::array<NumberPair, 22> inverses{};
  for (std::size_t i = 0; i < inverses.size(); ++i)
    inverses[i] = NumberPair{1} / NumberPair{double(2 * i + 1)};
  return inverses;
}();

/// Of a finite number above 0. With value = m 2^e and s = (m - 1) / (m + 1) it is e log 2 + 2 (s + s^3/3 +
/// s^5/5 + ...), where |s| < 0.172.
NumberPair LogarithmPair(double value) {
  int exponent;
  double m = std::frexp(value, &exponent);
  if (m < 0.7071) {
    m *= 2;
    --exponent;
  }
  const NumberPair s = NumberPair{m - 1} / Sum(m, 1);
  const NumberPair near = s * Series<11>(OddInverses, s * s);
  return Log2 * NumberPair{double(exponent)} + near + near;
}

/// As 2^k e^f, with |f| < 0.347.
double Exponential(NumberPair x) {
  if (x.High > 710) return Infinity;
  if (x.High < -746) return 0;
  const double k = std::floor(x.High / Log2.High + 0.5);
  const NumberPair f = x + Log2 * NumberPair{-k};
  return std::ldexp(Series<14>(FactorialInverses, f).High, int(k));
}

}

double Logarithm(double value) {
  if (value == 0) return -Infinity;
  if (value == Infinity) return value;
  return value > 0 ? LogarithmPair(value).High : NotANumber;
}

double Power(double base, double exponent) {
  if (exponent == 0 || base == 1) return 1;
  if (exponent != exponent || !(base >= 0)) return NotANumber;
  const bool grows = (base > 1) == (exponent > 0);
  if (base == 0 || base == Infinity || exponent == Infinity || exponent == -Infinity)
    return grows ? Infinity : 0;
  // So large an exponent decides alone, and its products would leave the range of doubles.
  const NumberPair logarithm = LogarithmPair(base);
  const double about = logarithm.High * exponent;
  if (!(about < 800 && about > -800)) return grows ? Infinity : 0;
  return Exponential(logarithm * NumberPair{exponent});
}

}
