#pragma once
#include <array>
#include <cstddef>

namespace zor {

// A number is carried as the sum of two doubles, the second below half a unit in the last place of the first,
// which makes about 106 bits of +, - and * alone, the same ones on every machine.

struct NumberPair {
  double High, Low = 0;
};

/// For |a| >= |b|.
constexpr NumberPair FastSum(double a, double b) {
  const double sum = a + b;
  return {sum, b - (sum - a)};
}

constexpr NumberPair Sum(double a, double b) {
  const double sum = a + b, part = sum - a;
  return {sum, (a - (sum - part)) + (b - part)};
}

/// The product of two doubles without any error, by halves of 26 bits.
constexpr NumberPair Product(double a, double b) {
  constexpr double split = 134217729;  // 2^27 + 1
  const double as = split * a, aHigh = as - (as - a), aLow = a - aHigh;
  const double bs = split * b, bHigh = bs - (bs - b), bLow = b - bHigh;
  const double product = a * b;
  return {product, ((aHigh * bHigh - product) + aHigh * bLow + aLow * bHigh) + aLow * bLow};
}

constexpr NumberPair operator+(NumberPair a, NumberPair b) {
  const NumberPair high = Sum(a.High, b.High), low = Sum(a.Low, b.Low);
  const NumberPair sum = FastSum(high.High, high.Low + low.High);
  return FastSum(sum.High, sum.Low + low.Low);
}

constexpr NumberPair operator*(NumberPair a, NumberPair b) {
  const NumberPair high = Product(a.High, b.High);
  return FastSum(high.High, high.Low + (a.High * b.Low + a.Low * b.High));
}

constexpr NumberPair operator/(NumberPair a, NumberPair b) {
  const auto less = [&](double quotient) { return a + b * NumberPair{-quotient}; };
  const double first = a.High / b.High;
  a = less(first);
  const double second = a.High / b.High;
  a = less(second);
  return FastSum(first, second) + NumberPair{a.High / b.High};
}

/// Horner's scheme. From the term `Exact` on a series is so small that doubles do.
template <std::size_t Exact, std::size_t Count>
constexpr NumberPair Series(const std::array<NumberPair, Count>& coefficients, NumberPair x) {
  double tail = 0;
  for (std::size_t i = Count; i-- > Exact;) tail = tail * x.High + coefficients[i].High;
  NumberPair sum{tail};
  for (std::size_t i = Exact; i-- > 0;) sum = sum * x + coefficients[i];
  return sum;
}

/// 1, 1, 1/2!, 1/3! ...
inline constexpr auto FactorialInverses = [] {
  std::array<NumberPair, 25> inverses{NumberPair{1}};
  for (std::size_t i = 1; i < inverses.size(); ++i) inverses[i] = inverses[i - 1] / NumberPair{double(i)};
  return inverses;
}();

}
