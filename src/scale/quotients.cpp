#include "scale/quotients.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <numeric>

namespace zor {
namespace {

/// A number times 2^bits. The tables of small pictures spend their time on it, and `ldexp` is a call.
double Times2To(int bits, double number) {
  return number * std::bit_cast<double>(std::uint64_t(1023 + bits) << 52);
}

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
  const double one = Times2To(rounding.Bits, 1.0);
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

namespace {

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
  made = {0, 0, Flat::Unknown};
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
  made = {std::int32_t(tooSmall), std::uint32_t(tooLarge + tooSmall) + 1, OfFlatRun(line)};
  return true;
}

namespace {

constexpr int MostBits = 22, MostLowBits = 15;
constexpr double MostDigit = 32766.0;

std::int32_t Rounded(double value) { return std::int32_t(value < 0.0 ? value - 0.5 : value + 0.5); }

/// A line with the digits of its entries.
struct LineDigits {
  const Contribution& Line;
  SlotLine::Digits* Of;
  SlotLine& Made;

  double ShareOf(std::int32_t entry) const { return double(Line.Entries[entry].Weight) / Line.Sum; }
  /// Counted from the even line of the first slot.
  std::int32_t Row(std::int32_t entry) const { return (Line.First & 1) + Line.Entries[entry].Pixel; }
  std::int32_t Slot(std::int32_t entry) const { return Row(entry) / LinesInSlot; }
  void PutHigh(std::int32_t entry, std::int32_t share) const {
    const std::int32_t slot = Slot(entry), line = Row(entry) % LinesInSlot, top = slot - Made.FirstTop;
    if (top >= 0 && top < Made.TopCount) {
      const std::int32_t digit = (share + (1 << (SlotLine::TopShift - 1))) >> SlotLine::TopShift;
      Made.Top[top][line] = std::int16_t(digit);
      share -= digit * (1 << SlotLine::TopShift);
    }
    Of[slot].High[line] = std::int16_t(share);
  }
  void PutLow(std::int32_t entry, std::int32_t digit) const {
    Of[Slot(entry)].Low[Row(entry) % LinesInSlot] = std::int16_t(digit);
  }
  /// Sets which slots have a third digit with so many bits. False for too many of them.
  bool SetTops(int bits) const {
    std::int32_t first = 0, end = 0;
    for (std::int32_t i = 0; i < Line.Count; ++i) {
      if (Times2To(bits, std::fabs(ShareOf(i))) <= MostDigit) continue;
      if (end == 0) first = Slot(i);
      end = Slot(i) + 1;
    }
    if (end - first > SlotLine::MostTops) return false;
    Made.FirstTop = first;
    Made.TopCount = end - first;
    std::fill_n(&Made.Top[0][0], SlotLine::MostTops * LinesInSlot, std::int16_t(0));
    return true;
  }
};

/// The bounds of q' - q in the units of the shares, which are `unit` of those that they were added up in.
struct Bounds {
  std::int32_t TooLarge, TooSmall;
  // The 3 cover the rounding of these bounds and of the plain form.
  Bounds(const Shares& sizes, double unit)
      : TooLarge(std::int32_t(sizes.TooLarge * 255.0 * unit) + 3),
        TooSmall(std::int32_t(sizes.TooSmall * 255.0 * unit) + 3) {}
  std::int32_t Both() const { return TooLarge + TooSmall; }
};

/// Whether sums of shares in units of 2^-bits, which add up to `size` in all, stay within 32 bits, also where
/// only the third digits have been added.
bool Fits(double size, int bits) {
  constexpr double ofThird = SlotLine::MostTops * LinesInSlot * 255.0 * (1 << (SlotLine::TopShift - 1));
  return Times2To(bits, (size + 0.1) * 255.0) + ofThird < 0x1p31;
}

/// What a slot's third digits cost, by and large: in cycles a vector.
constexpr double CostOfTop = 3.0;
/// The same of all that a line has, and of its doubts with so many bits.
double CostOf(const LineDigits& digits, int bits) {
  return CostOfTop * digits.Made.TopCount + Times2To(-bits, 2000.0 * 64.0 * digits.Line.Count);
}

/// The number of bits from `least` to `most` that costs least; with third digits where a few shares are much
/// larger than the others.
int BestBits(const LineDigits& digits, int least, int most) {
  int best = least;
  double cost = std::numeric_limits<double>::max();
  for (int bits = least; bits <= most && digits.SetTops(bits); ++bits)
    if (const double its = CostOf(digits, bits); its < cost) {
      best = bits;
      cost = its;
    }
  digits.SetTops(best);
  return best;
}

/// Puts a line on its lattice, in units of 2^-bits. False where that isn't exact.
bool MakeOnLattice(const LineDigits& digits, const Lattice& lattice, int bits) {
  const auto put = [&](std::int32_t i, std::int32_t share) { digits.PutHigh(i, share); };
  if (lattice.Denominator == 0 || !digits.SetTops(bits)) return false;
  digits.Made.Shift = bits;
  return RoundShares(digits.Line, lattice, {bits, 1, 0x1p24}, put);
}

/// All digits in units of 2^-bits, of shares that add up to `size` at most. False where too much is in doubt.
bool MakeAllDigits(const LineDigits& digits, int bits, double size) {
  const Contribution& line = digits.Line;
  SlotLine& made = digits.Made;
  int lowBits = MostLowBits;
  while (lowBits > 0 && !(Times2To(lowBits - 1, line.Count * 255.0) < 0x1p31)) --lowBits;
  Shares coarse, fine;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double exact = Times2To(bits, digits.ShareOf(i));
    const std::int32_t share = Rounded(exact);
    const double rest = Times2To(lowBits, exact - share);
    const std::int32_t digit = Rounded(rest);
    digits.PutHigh(i, share);
    digits.PutLow(i, digit);
    coarse.Add(share, exact);
    fine.Add(digit, rest);
  }
  const Bounds doubt(coarse, 1.0);
  made.Start = doubt.TooSmall;
  made.Shift = bits;
  made.Gap = doubt.Both();
  int fineBits = bits;
  while (fineBits < std::min(MostBits, bits + lowBits) && Fits(size, fineBits + 1)) ++fineBits;
  made.Left = fineBits - bits;
  made.Right = lowBits - made.Left;
  const Bounds fineDoubt(fine, Times2To(-made.Right, 1.0));
  // Cutting off to the right takes away less than one.
  made.FineStart = fineDoubt.TooSmall + 1;
  made.FineGap = fineDoubt.Both() + 1;
  made.FineShift = fineBits;
  // Where more than a third of all samples are in doubt, the plain form makes them all.
  return made.Gap < (1 << bits) / 3;
}

}

void MakeDigits(const Contribution& line, SlotLine::Digits* digits, SlotLine& made) {
  made.Of = digits;
  const LineDigits of{line, digits, made};
  if (line.Count == 0) return;
  if (CopiesOneLine(line)) {
    made.Shift = 14;
    of.PutHigh(0, 1 << made.Shift);
    return;
  }
  made.Plain = true;
  if (!(line.Sum > 0.0F) || line.Count > MostEntries) return;
  double largest = 0.0, positive = 0.0, negative = 0.0;
  for (std::int32_t i = 0; i < line.Count; ++i) {
    const double share = of.ShareOf(i);
    largest = std::fmax(largest, std::fabs(share));
    (share > 0.0 ? positive : negative) += std::fabs(share);
  }
  const double size = std::fmax(positive, negative);
  if (!(size < 16.0)) return;
  int most = MostBits;
  while (!Fits(size, most)) --most;
  int least = most;
  while (Times2To(least, largest) > MostDigit) --least;
  const Lattice lattice = LatticeOf(line);
  made.Plain = false;
  if (MakeOnLattice(of, lattice, least)) return;
  const int best = BestBits(of, least, most);
  const double cost = CostOf(of, best);
  if (of.SetTops(most) && CostOfTop * made.TopCount < cost && MakeOnLattice(of, lattice, most)) return;
  of.SetTops(best);
  made.OfFlat = OfFlatRun(line);
  made.Plain = AlwaysInDoubt(line) || !MakeAllDigits(of, best, size);
}

}
