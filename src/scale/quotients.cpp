#include "scale/quotients.h"

#include <algorithm>
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

/// What shares on a lattice are rounded up to: multiples of `Unit` in units of 2^-Bits, each below Most.
struct Rounding {
  int Bits;
  std::int32_t Unit;
  double Most;
};

/// Puts the shares of a line on a lattice: put(entry, share). False where one is too large, or the quotients
/// grow by so much that one could reach the next whole number.
template <class Put>
bool RoundShares(const Contribution& line, const Lattice& lattice, const Rounding& rounding, Put&& put) {
  const double one = std::ldexp(1.0, rounding.Bits);
  std::int64_t sum = 0;
  Multiple(line.Sum, sum);
  double tooLarge = 0.0, positive = 0.0, negative = 0.0;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    std::int64_t multiple = 0;
    Multiple(line.Entries[i].Weight, multiple);
    const double exact = double(multiple) / double(sum) * one;
    if (!(std::fabs(exact) < rounding.Most)) return false;
    const std::int64_t rounded = RoundedUp(multiple << rounding.Bits, sum * rounding.Unit) * rounding.Unit;
    put(i, std::int32_t(rounded));
    tooLarge += double(rounded) - exact;
    (rounded > 0 ? positive : negative) += std::fabs(double(rounded));
  }
  if (!(std::fmax(positive, negative) * 255.0 < 2147483647.0)) return false;
  // The 0.01 covers the rounding of the sums here.
  return (255.0 * tooLarge + lattice.Disturbance * one + 0.01) * double(lattice.Denominator) < one;
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
      if (RoundShares(line, lattice, {FixedPointLine::Bits, unit, 127 * 65536.0},
                      [&](std::int32_t i, std::int32_t share) { shares[i] = share; }))
        return true;
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

namespace {

constexpr int MostBits = 22, MostLowBits = 15;
constexpr double MostDigit = 32766.0;
/// Where more than a third of all samples are in doubt, the plain form makes them all.
constexpr std::int32_t MostGap = (1 << SlotLine::FractionBits) / 3;

std::int32_t Rounded(double value) { return std::int32_t(value < 0.0 ? value - 0.5 : value + 0.5); }

/// A line with the digits of its entries.
struct LineDigits {
  const Contribution& Line;
  SlotLine::Digits* Of;
  std::int16_t& High(std::int32_t entry) const { return Of[Row(entry) / 2].High[Row(entry) % 2]; }
  std::int16_t& Low(std::int32_t entry) const { return Of[Row(entry) / 2].Low[Row(entry) % 2]; }
  /// Counted from the even line of the first pair.
  std::int32_t Row(std::int32_t entry) const { return (Line.First & 1) + Line.Entries[entry].Pixel; }
};

/// What a flat run becomes, if that is the same for all values but 0.
Flat OfFlatRun(const Contribution& line) {
  double sum = 0.0;
  // Up to 16 weights below 2 that are multiples of 2^-40, times 255: none of the sums has more than 53 bits.
  bool exact = line.Count <= 16;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double weight = line.Entries[i].Weight, units = weight * 0x1p40;
    exact = exact && std::fabs(weight) < 2.0 && double(std::int64_t(units)) == units;
    sum += weight;
  }
  const double above = sum - double(line.Sum);
  // With shares of 64 in all at most.
  if (!exact && !(std::fabs(above) > double(line.Sum) * (line.Count + 3) * 0x1p-46)) return Flat::Unknown;
  return above < 0.0 ? Flat::Falls : Flat::Stays;
}

/// The bounds of q' - q in the units of the shares, which are `unit` of those that they were added up in.
struct Bounds {
  std::int32_t TooLarge, TooSmall;
  // The 3 cover the rounding of these bounds and of the plain form.
  Bounds(const Shares& sizes, double unit)
      : TooLarge(std::int32_t(sizes.TooLarge * 255.0 * unit) + 3),
        TooSmall(std::int32_t(sizes.TooSmall * 255.0 * unit) + 3) {}
  std::int32_t Both() const { return TooLarge + TooSmall; }
};

/// Sets what sums begin with and how they are cut off.
void SetUnits(int bits, std::int32_t bias, SlotLine& made) {
  made.Start = bias - (SlotLine::Middle << bits);
  made.Shift = bits - SlotLine::FractionBits;
}

/// Whether sums of shares in units of 2^-bits, which add up to `size` in all, stay within 32 bits.
bool Fits(double size, int bits) { return std::ldexp((size + 0.6) * 255.0, bits) < 0x1p31; }

/// Two digits in units of 2^-bits, of shares that add up to `size` at most. False where too much is in doubt.
bool MakeTwoDigits(const LineDigits& digits, int bits, double size, SlotLine& made) {
  const Contribution& line = digits.Line;
  const double one = std::ldexp(1.0, bits);
  int lowBits = MostLowBits;
  while (lowBits > 0 && !(std::ldexp(line.Count * 255.0, lowBits - 1) < 0x1p31)) --lowBits;
  Shares coarse, fine;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double exact = double(line.Entries[i].Weight) / line.Sum * one;
    const std::int32_t share = Rounded(exact);
    const double rest = std::ldexp(exact - share, lowBits);
    const std::int32_t digit = Rounded(rest);
    digits.High(i) = std::int16_t(share);
    digits.Low(i) = std::int16_t(digit);
    coarse.Add(share, exact);
    fine.Add(digit, rest);
  }
  const Bounds doubt(coarse, 1.0);
  SetUnits(bits, doubt.TooSmall, made);
  made.Gap = (doubt.Both() >> made.Shift) + 1;
  int fineBits = bits;
  while (fineBits < std::min(MostBits, bits + lowBits) && Fits(size, fineBits + 1)) ++fineBits;
  made.Left = fineBits - bits;
  made.Right = lowBits - made.Left;
  const Bounds fineDoubt(fine, std::ldexp(1.0, -made.Right));
  // Cutting off to the right takes away less than one.
  made.FineStart = fineDoubt.TooSmall + 1 - (SlotLine::Middle << fineBits);
  made.FineGap = fineDoubt.Both() + 1;
  made.FineShift = fineBits - SlotLine::FractionBits;
  return made.Gap <= MostGap;
}

}

void MakeDigits(const Contribution& line, SlotLine::Digits* digits, SlotLine& made) {
  made.Of = digits;
  const LineDigits of{line, digits};
  if (line.Count == 0 || CopiesOneLine(line)) {
    constexpr int bits = 14;
    SetUnits(bits, 0, made);
    if (line.Count > 0) of.High(0) = 1 << bits;
    return;
  }
  made.Plain = true;
  if (!(line.Sum > 0.0F) || line.Count > MostEntries) return;
  double largest = 0.0, positive = 0.0, negative = 0.0;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double share = double(line.Entries[i].Weight) / line.Sum;
    largest = std::fmax(largest, std::fabs(share));
    (share > 0.0 ? positive : negative) += std::fabs(share);
  }
  const double size = std::fmax(positive, negative);
  if (!(size < 16.0)) return;
  int bits = MostBits;
  while (std::ldexp(largest, bits) > MostDigit || !Fits(size, bits)) --bits;
  const auto put = [&](std::int32_t i, std::int32_t share) { of.High(i) = std::int16_t(share); };
  if (const Lattice lattice = LatticeOf(line);
      lattice.Denominator > 0 && RoundShares(line, lattice, {bits, 1, MostDigit}, put)) {
    SetUnits(bits, 0, made);
    made.Plain = false;
    return;
  }
  made.OfFlat = OfFlatRun(line);
  made.Plain = AlwaysInDoubt(line) || !MakeTwoDigits(of, bits, size, made);
}

void MakeSingle(const Contribution& line, float* shares, SlotLine& made) {
  made.Shares = shares;
  if (line.Count == 0) return;
  if (CopiesOneLine(line)) {
    shares[0] = 1.0F;
    return;
  }
  made.Plain = true;
  if (!(line.Sum > 0.0F)) return;
  Shares sizes;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double exact = double(line.Entries[i].Weight) / line.Sum;
    const auto share = float(exact);
    shares[line.Entries[i].Pixel] = share;
    sizes.Add(share, exact);
  }
  // A product and a sum an entry round by 2^-24 of what they give at most; N. J. Higham, "Accuracy and
  // Stability of Numerical Algorithms", 2002, lemma 3.1. Source lines between the entries add nothing and
  // round nothing. 2^-14 covers the roundings of the start and of the gap.
  const double rounding = (line.Count + 3) * 0x1p-24 * 1.01;
  const double error = std::fmax(sizes.TooLarge, sizes.TooSmall);
  const double bound = 255.0 * (error + sizes.Size() * rounding) + 0x1p-14;
  if (!(sizes.Size() < 64.0)) return;
  const Lattice lattice = LatticeOf(line);
  if (lattice.Denominator > 0 && (2.0 * bound + lattice.Disturbance) * double(lattice.Denominator) < 0.5) {
    made.SingleStart = float(bound + lattice.Disturbance);
    made.Plain = false;
    return;
  }
  made.OfFlat = OfFlatRun(line);
  made.Plain = AlwaysInDoubt(line) || !(bound < 0.125);
  made.SingleStart = float(-bound);
  made.SingleGap = float(2.0 * bound);
}

}
