#include "image/powers.h"

#include <array>
#include <cmath>
#include <cstddef>
#include <limits>

// A number is carried as the sum of two doubles, the second below half a unit in the last place of the first,
// which makes about 106 bits of +, - and * alone. Logarithm and exponential are their series, after the
// argument has been brought near 1 and near 0 by powers of two.

namespace zor {
namespace {

constexpr double Infinity = std::numeric_limits<double>::infinity();
constexpr double NotANumber = std::numeric_limits<double>::quiet_NaN();

struct Pair {
  double High, Low = 0;
};

/// For |a| >= |b|.
constexpr Pair FastSum(double a, double b) {
  const double sum = a + b;
  return {sum, b - (sum - a)};
}

constexpr Pair Sum(double a, double b) {
  const double sum = a + b, part = sum - a;
  return {sum, (a - (sum - part)) + (b - part)};
}

/// The product of two doubles without any error, by halves of 26 bits.
constexpr Pair Product(double a, double b) {
  constexpr double split = 134217729;  // 2^27 + 1
  const double as = split * a, aHigh = as - (as - a), aLow = a - aHigh;
  const double bs = split * b, bHigh = bs - (bs - b), bLow = b - bHigh;
  const double product = a * b;
  return {product, ((aHigh * bHigh - product) + aHigh * bLow + aLow * bHigh) + aLow * bLow};
}

constexpr Pair operator+(Pair a, Pair b) {
  const Pair high = Sum(a.High, b.High), low = Sum(a.Low, b.Low);
  const Pair sum = FastSum(high.High, high.Low + low.High);
  return FastSum(sum.High, sum.Low + low.Low);
}

constexpr Pair operator*(Pair a, Pair b) {
  const Pair high = Product(a.High, b.High);
  return FastSum(high.High, high.Low + (a.High * b.Low + a.Low * b.High));
}

constexpr Pair operator/(Pair a, Pair b) {
  const auto less = [&](double quotient) { return a + b * Pair{-quotient}; };
  const double first = a.High / b.High;
  a = less(first);
  const double second = a.High / b.High;
  a = less(second);
  return FastSum(first, second) + Pair{a.High / b.High};
}

constexpr Pair Log2{0x1.62e42fefa39efp-1, 0x1.abc9e3b39803fp-56};

/// Horner's scheme. From the term `Exact` on a series is so small that doubles do.
template <std::size_t Exact, std::size_t Count>
constexpr Pair Series(const std::array<Pair, Count>& coefficients, Pair x) {
  double tail = 0;
  for (std::size_t i = Count; i-- > Exact;) tail = tail * x.High + coefficients[i].High;
  Pair sum{tail};
  for (std::size_t i = Exact; i-- > 0;) sum = sum * x + coefficients[i];
  return sum;
}

/// 1, 1/3, 1/5 ...
constexpr auto OddInverses = [] {
  std::array<Pair, 22> inverses{};
  for (std::size_t i = 0; i < inverses.size(); ++i) inverses[i] = Pair{1} / Pair{double(2 * i + 1)};
  return inverses;
}();

/// 1, 1, 1/2!, 1/3! ...
constexpr auto FactorialInverses = [] {
  std::array<Pair, 25> inverses{Pair{1}};
  for (std::size_t i = 1; i < inverses.size(); ++i) inverses[i] = inverses[i - 1] / Pair{double(i)};
  return inverses;
}();

/// Of a finite number above 0. With value = m 2^e and s = (m - 1) / (m + 1) it is e log 2 + 2 (s + s^3/3 +
/// s^5/5 + ...), where |s| < 0.172.
Pair LogarithmPair(double value) {
  int exponent;
  double m = std::frexp(value, &exponent);
  if (m < 0.7071) {
    m *= 2;
    --exponent;
  }
  const Pair s = Pair{m - 1} / Sum(m, 1);
  const Pair near = s * Series<11>(OddInverses, s * s);
  return Log2 * Pair{double(exponent)} + near + near;
}

/// As 2^k e^f, with |f| < 0.347.
double Exponential(Pair x) {
  if (x.High > 710) return Infinity;
  if (x.High < -746) return 0;
  const double k = std::floor(x.High / Log2.High + 0.5);
  const Pair f = x + Log2 * Pair{-k};
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
  const Pair logarithm = LogarithmPair(base);
  const double about = logarithm.High * exponent;
  if (!(about < 800 && about > -800)) return grows ? Infinity : 0;
  return Exponential(logarithm * Pair{exponent});
}

}
