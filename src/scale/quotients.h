#pragma once
#include <cstdint>

#include "scale/contributions.h"
#include "scale/slot_lines.h"

namespace zor {

// Why sums in narrower arithmetic give the same bytes as the plain form.
//
// Let q be the real quotient of a line: the sum over its entries of w s, divided by its Sum S, for samples s
// of 0 to 255. The plain form computes q but for its own roundings, relatively below (n + 2) 2^-53 for n
// entries; it then cuts off and clamps. A fast form computes q' from rounded shares u = w / S and knows
// bounds D and E with q' - E <= q <= q' + D, the roundings of the plain form included. As s goes from 0 to
// 255, the rounded shares that are too large by d in all add between 0 and 255 d to q', and those too small
// take as much away. There are two kinds of lines.
//
// In general, the plain form's byte is that of every number between q' - E and q' + D as soon as the bytes of
// these two are the same, since cutting off and clamping never decrease. Where they differ, q' lies close to
// a whole number from 1 to 255: the sample is in doubt, and the plain form makes it. With D + E near 1/2000
// that is one sample in two thousand of a picture that isn't flat.
//
// On a lattice, all weights are whole multiples m 2^-12 and so is S, as with boxes, and with triangles of
// simple ratios; then with N the denominator that they leave, every q is a multiple of 1/N and whole numbers
// are common. The sum of m 2^-12 s is exact in the plain form, and the division rounds no quotient of two
// such numbers across a whole one. If 0 <= q' - q < 1/N, the whole number below q' is that below q, and
// nothing is ever in doubt. Weights that ought to be 0 and came out as some 2^-54 disturb a lattice; as long
// as they are positive, they only add to q, and their part counts in the bound of q' - q.

// There are two kinds of numbers that q' is made of: 22 bits after the point on processors that multiply
// bytes, and digits of 16 bits on all. With digits, the largest shares of a line decide how many bits after
// the point the high one has, so that D + E is between 1/30 and 1/1000, and nothing is in doubt on most
// lattices. Where a few shares in the middle are much larger than the others, as when a picture grows, their
// slots have a third digit above the high one, which lets it have more bits: the share is the same whole
// number, cut in two, so that bounds don't tell. A sample that is in doubt is made again with the low digit
// too, for which D + E is about a millionth: the rest of a share, times 2^15 and rounded, is that digit; its
// sum, cut off to the right, is less than one unit too small. All sums, and what they pass through on their
// way, stay below 2^31: the shares above 0 add up to so much at most, and so do those below; and third digits
// alone are off by half of one for each of their samples.

// A flat run, whose samples all have the value v, has the quotient v W / S with W the sum of the weights,
// which is so close to v that it is always in doubt. Whether W is less than S decides between v - 1 and v for
// all v above 0, provided that the two differ by more than the plain form rounds, or that nothing is rounded
// in it.

/// The lattice of a line: N, and what its disturbing weights may add to a quotient; N is 0 off any lattice.
struct Lattice {
  std::int64_t Denominator;
  double Disturbance;
};
Lattice LatticeOf(const Contribution& line);

/// Whether a line has one entry, which its Sum is the weight of: its quotients are the samples themselves,
/// exactly.
bool CopiesOneLine(const Contribution& line);

/// Whether almost all of a line comes from one of several source lines, so that its quotients are nearly
/// whole numbers and always in doubt off a lattice; or it has a Sum that nothing can be said about.
bool AlwaysInDoubt(const Contribution& line);

/// A line in whole numbers: q' = sum of Share s / 2^Bits. The sums fit 32 bits.
struct FixedPointLine {
  static constexpr int Bits = 22;
  /// Added to the sum before it is cut off: D of a line in general, 0 on a lattice.
  std::int32_t Bias;
  /// The sample is in doubt where the Bits low bits of the biased sum are below this, which is D + E.
  std::uint32_t Doubtful;
  /// What flat runs become; unknown where nothing is ever in doubt.
  Flat OfFlat;
};
/// The shares of a line, one an entry. False where they don't fit, or the line is always in doubt.
bool MakeFixedPoint(const Contribution& line, std::int32_t* shares, FixedPointLine& made);

/// A line in 16-bit numbers: digits for each of its slots, 0 before. The line is 0 before too; its slots are
/// left alone.
void MakeDigits(const Contribution& line, SlotLine::Digits* digits, SlotLine& made);

}
