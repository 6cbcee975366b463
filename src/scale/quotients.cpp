#include "scale/quotients.h"

#include <cmath>
#include <numeric>

namespace zor {
namespace {

constexpr double LatticeUnit = 4096.0;  // 2^12 multiples make 1
constexpr float Disturbing = 0x1p-26F;

/// The weight as a multiple of the lattice's unit; a disturbing one is 0 of them. False for none.
bool Multiple(float weight, std::int64_t& multiple) {
  multiple = 0;
  if (weight > 0.0F && weight < Disturbing) return true;
  const double units = double(weight) * LatticeUnit;
  if (!(std::fabs(units) < 0x1p30)) return false;
  multiple = std::int64_t(units);
  return double(multiple) == units;
}

/// A line's shares, those above 0 and those below, and how far they lie above or below what they stand for;
/// the sizes of each summed up.
struct Shares {
  double Positive = 0.0, Negative = 0.0, TooLarge = 0.0, TooSmall = 0.0;
  void Add(double share, double exact) {
    (share > 0.0 ? Positive : Negative) += std::fabs(share);
    (share > exact ? TooLarge : TooSmall) += std::fabs(share - exact);
  }
  double Size() const { return Positive + Negative; }
};

std::int64_t RoundedUp(std::int64_t a, std::int64_t b) { return a >= 0 ? (a + b - 1) / b : -(-a / b); }

constexpr double One = 1 << FixedPointLine::Bits;

/// The plain form of a line of more entries may round by more than a unit of the fixed point: with shares of
/// 4 in all, by (n + 2) 2^-53 times 4 times 255.
constexpr std::int32_t MostEntries = 1 << 20;

/// The shares of a line on a lattice, each rounded up to a multiple of `unit`. False where they pass 24 bits,
/// or the quotients grow by so much that one could reach the next whole number.
bool RoundShares(const Contribution& line, const Lattice& lattice, std::int32_t unit, std::int32_t* shares) {
  std::int64_t sum = 0;
  Multiple(line.Sum, sum);
  double tooLarge = 0.0, positive = 0.0, negative = 0.0;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    std::int64_t multiple = 0;
    Multiple(line.Entries[i].Weight, multiple);
    const double exact = double(multiple) / double(sum) * One;
    if (!(std::fabs(exact) < 127 * 65536.0)) return false;
    const std::int64_t rounded = RoundedUp(multiple << FixedPointLine::Bits, sum * unit) * unit;
    shares[i] = std::int32_t(rounded);
    tooLarge += double(rounded) - exact;
    (rounded > 0 ? positive : negative) += std::fabs(double(rounded));
  }
  if (!(std::fmax(positive, negative) * 255.0 < 2147483647.0)) return false;
  return (255.0 * tooLarge + lattice.Disturbance * One + 2.0) * double(lattice.Denominator) < One;
}

}

Lattice LatticeOf(const Contribution& line) {
  std::int64_t units = 0;
  if (!Multiple(line.Sum, units) || units <= 0) return {};
  std::int64_t divisor = units;
  double disturbance = 0.0;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    std::int64_t multiple = 0;
    if (!Multiple(line.Entries[i].Weight, multiple)) return {};
    divisor = std::gcd(divisor, multiple);
    if (multiple == 0) disturbance += double(line.Entries[i].Weight) * 255.0 / line.Sum;
  }
  return {units / divisor, disturbance};
}

bool CopiesOneLine(const Contribution& line) {
  return line.Count == 1 && line.Entries[0].Weight == line.Sum && line.Sum != 0.0F;
}

bool AlwaysInDoubt(const Contribution& line) {
  if (line.Count == 0) return false;
  if (!(line.Sum > 0.0F)) return true;
  double largest = 0.0, all = 0.0;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double size = std::fabs(double(line.Entries[i].Weight));
    all += size;
    largest = size > largest ? size : largest;
  }
  return line.Count > 1 && (all - largest) * 255.0 < line.Sum * 0x1p-8;
}

bool MakeFixedPoint(const Contribution& line, std::int32_t* shares, FixedPointLine& made) {
  made = {0, 0};
  if (line.Count == 0) return true;
  if (CopiesOneLine(line)) {
    shares[0] = 1 << FixedPointLine::Bits;
    return true;
  }
  if (!(line.Sum > 0.0F)) return false;
  // On a lattice as few digits as will do.
  if (const Lattice lattice = LatticeOf(line); lattice.Denominator > 0)
    for (const std::int32_t unit : {65536, 256, 1})
      if (RoundShares(line, lattice, unit, shares)) return true;
  if (AlwaysInDoubt(line) || line.Count > MostEntries) return false;
  Shares sizes;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double exact = double(line.Entries[i].Weight) / line.Sum * One;
    if (!(std::fabs(exact) < 127 * 65536.0)) return false;
    shares[i] = std::int32_t(exact < 0.0 ? exact - 0.5 : exact + 0.5);
    sizes.Add(shares[i], exact);
  }
  // The 3 cover the rounding of these bounds and of the plain form.
  const double tooLarge = std::floor(sizes.TooLarge * 255.0) + 3.0;
  const double tooSmall = std::floor(sizes.TooSmall * 255.0) + 3.0;
  // A sum lies between the two; what happens on the way to it may pass 32 bits, and comes back.
  const double farthest = std::fmax(sizes.Positive, sizes.Negative) * 255.0 + tooLarge + tooSmall;
  if (!(farthest < 2147483647.0) || !(tooLarge + tooSmall < One / 2)) return false;
  made = {std::int32_t(tooSmall), std::uint32_t(tooLarge + tooSmall) + 1};
  return true;
}

bool MakeFloat(const Contribution& line, float* shares, std::int32_t firstRow, int stride, FloatLine& made) {
  made = {0.0F, 0.0F};
  if (line.Count == 0) return true;
  if (CopiesOneLine(line)) {
    shares[std::ptrdiff_t{line.First - firstRow} * stride] = 1.0F;
    return true;
  }
  if (!(line.Sum > 0.0F)) return false;
  Shares sizes;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double exact = double(line.Entries[i].Weight) / line.Sum;
    const auto share = float(exact);
    shares[std::ptrdiff_t{line.PixelAt(i) - firstRow} * stride] = share;
    sizes.Add(share, exact);
  }
  // A product and a sum an entry round by 2^-24 of what they give at most; N. J. Higham, "Accuracy and
  // Stability of Numerical Algorithms", 2002, lemma 3.1. Rows between the entries add nothing and round
  // nothing. 2^-14 covers the roundings of Start and Gap.
  const double rounding = (line.Count + 3) * 0x1p-24 * 1.01;
  const double error = std::fmax(sizes.TooLarge, sizes.TooSmall);
  const double bound = 255.0 * (error + sizes.Size() * rounding) + 0x1p-14;
  if (!(sizes.Size() < 64.0)) return false;
  const Lattice lattice = LatticeOf(line);
  if (lattice.Denominator > 0 && (2.0 * bound + lattice.Disturbance) * double(lattice.Denominator) < 0.5) {
    made.Start = float(bound + lattice.Disturbance);
    return true;
  }
  if (AlwaysInDoubt(line) || !(bound < 0.125)) return false;
  made = {float(-bound), float(2.0 * bound)};
  return true;
}

}
