// Slots of two source lines, as numbers of 16 bits; for slot_loops_body.h.

namespace zor {
namespace {

constexpr int LinesInSlot = 2;

#if defined(__SSE2__) || VectorBytes == 32

// An instruction multiplies numbers by twos and adds the two products, so the numbers of a sample lie side by
// side.

LOOP_INLINE int SampleIn(const Sample* unit, int sample, int line) {
  const int place = sample % 16 / 4 * (Width / 2) + sample / 16 * 8 + sample % 4 * 2 + line;
  std::int16_t number;
  std::memcpy(&number, unit + place * int(sizeof number), sizeof number);
  return number;
}
LOOP_INLINE void StoreWidened(Bytes even, Bytes odd, Sample* unit) {
  const Bytes low = LowInterleaved(even, odd), high = HighInterleaved(even, odd), zero{};
  Store(unit, LowInterleaved(low, zero));
  Store(unit + Width, HighInterleaved(low, zero));
  Store(unit + Width * 2, LowInterleaved(high, zero));
  Store(unit + Width * 3, HighInterleaved(high, zero));
}
LOOP_INLINE Bytes Narrowed(const Sample* unit, int line) {
  Sums of[4];
  for (int k = 0; k < 4; ++k) {
    of[k] = Load<Sums>(unit + k * Width);
    of[k] = (line == 0 ? of[k] & 0xFFFF : of[k] >> 16) - SlotLine::Middle;
  }
  return Packed(Saturated(of[0], of[1]), Saturated(of[2], of[3])) ^ Sample(SlotLine::Middle);
}
LOOP_INLINE Numbers DigitsOf(const std::int16_t* two) {
  std::int32_t both;
  std::memcpy(&both, two, sizeof both);
  return Numbers(Sums{} + both);
}
LOOP_INLINE void AddProducts(Sums* sums, const Sample* unit, Numbers digits) {
  for (int k = 0; k < 4; ++k) {
    const auto numbers = Load<Numbers>(unit + k * Width);
#if VectorBytes == 32
    sums[k] += Sums(__builtin_ia32_pmaddwd256(numbers, digits));
#else
    sums[k] += Sums(__builtin_ia32_pmaddwd128(numbers, digits));
#endif
  }
}

#else

// Elsewhere half a unit has the numbers of its even line first, then those of the odd one.

LOOP_INLINE int SampleIn(const Sample* unit, int sample, int line) {
  std::int16_t number;
  std::memcpy(&number, unit + (sample / 8 * 16 + line * 8 + sample % 8) * int(sizeof number), sizeof number);
  return number;
}
using HalfBytes [[gnu::vector_size(8)]] = std::uint8_t;
using HalfNumbers [[gnu::vector_size(8)]] = std::int16_t;
LOOP_INLINE void StoreWidened(const Bytes& even, const Bytes& odd, Sample* unit) {
  for (int half = 0; half < 2; ++half)
    for (int line = 0; line < 2; ++line) {
      const auto* bytes = reinterpret_cast<const Sample*>(line == 0 ? &even : &odd) + half * 8;
      Store(unit + (half * 2 + line) * Width, __builtin_convertvector(Load<HalfBytes>(bytes), Numbers));
    }
}
LOOP_INLINE Bytes Narrowed(const Sample* unit, int line) {
  return Packed(Load<Numbers>(unit + line * Width), Load<Numbers>(unit + (2 + line) * Width));
}
LOOP_INLINE const std::int16_t* DigitsOf(const std::int16_t* two) { return two; }
LOOP_INLINE void AddProducts(Sums* sums, const Sample* unit, const std::int16_t* digits) {
  for (int k = 0; k < 4; ++k)
    for (int line = 0; line < 2; ++line) {
      const auto numbers = Load<HalfNumbers>(unit + (k / 2 * 2 + line) * Width + k % 2 * 8);
#ifdef __ARM_NEON
      sums[k] = Sums(vmlal_n_s16(int32x4_t(sums[k]), int16x4_t(numbers), digits[line]));
#else
      sums[k] += __builtin_convertvector(numbers, Sums) * std::int32_t{digits[line]};
#endif
    }
}

#endif

LOOP_INLINE Sample ExactSample(const SlotSums& sums, std::ptrdiff_t unit, int sample);
LOOP_INLINE void StoreUnit(const SlotSums& sums, std::ptrdiff_t unit, Bytes samples);
NOINLINE LOOP void SettleUnitPlainly(const SlotSums& sums, std::ptrdiff_t unit, std::uint32_t doubts);

/// Sums as samples less Middle, cut off.
LOOP_INLINE Bytes WholeOf(Numbers low, Numbers high) {
  return Packed(low >> SlotLine::FractionBits, high >> SlotLine::FractionBits);
}

/// Makes some units, and notes for each which of its samples are in doubt.
template <int Units>
LOOP_INLINE void SumUnits(const SlotSums& sums, std::ptrdiff_t unit, std::uint32_t* doubts) {
  const SlotLine& line = *sums.Line;
  Sums made[Units * 4];
  for (Sums& sum : made) sum = Sums{} + line.Start;
  for (std::int32_t s = 0; s < line.Count; ++s) {
    const auto digits = DigitsOf(line.Of[s].High);
    const Sample* slot = sums.Slots[s] + unit * UnitBytes;
    for (int u = 0; u < Units; ++u) AddProducts(made + u * 4, slot + u * UnitBytes, digits);
  }
  for (int u = 0; u < Units; ++u) {
    const Sums* sum = made + u * 4;
    const Numbers low = Saturated(sum[0] >> line.Shift, sum[1] >> line.Shift);
    const Numbers high = Saturated(sum[2] >> line.Shift, sum[3] >> line.Shift);
    const Bytes upper = WholeOf(low, high);
    StoreUnit(sums, unit + u, upper ^ Sample(SlotLine::Middle));
    if (line.Gap == 0) continue;
    const Numbers gap = Numbers{} + std::int16_t(line.Gap);
    doubts[u] = Difference(upper, WholeOf(Less(low, gap), Less(high, gap)));
  }
}

/// Makes a sample with both digits.
LOOP_INLINE Sample SettledSample(const SlotSums& sums, std::ptrdiff_t unit, int sample) {
  const SlotLine& line = *sums.Line;
  std::int32_t high = 0, low = 0;
  for (std::int32_t s = 0; s < line.Count; ++s) {
    const SlotLine::Digits& digits = line.Of[s];
    const Sample* slot = sums.Slots[s] + unit * UnitBytes;
    const std::int32_t even = SampleIn(slot, sample, 0), odd = SampleIn(slot, sample, 1);
    high += even * digits.High[0] + odd * digits.High[1];
    low += even * digits.Low[0] + odd * digits.Low[1];
  }
  const std::int32_t upper = (high << line.Left) + (low >> line.Right) + line.FineStart;
  const int shift = line.FineShift + SlotLine::FractionBits;
  const std::int32_t whole = upper >> shift;
  if (whole == (upper - line.FineGap) >> shift) return Clamp(whole + SlotLine::Middle);
  return ExactSample(sums, unit, sample);
}

/// Makes a unit much of which is in doubt with both digits.
NOINLINE LOOP void SettleUnit(const SlotSums& sums, std::ptrdiff_t unit) {
  const SlotLine& line = *sums.Line;
  Sums high[4] = {}, upper[4] = {}, lower[4];
  for (std::int32_t s = 0; s < line.Count; ++s) {
    AddProducts(high, sums.Slots[s] + unit * UnitBytes, DigitsOf(line.Of[s].High));
    AddProducts(upper, sums.Slots[s] + unit * UnitBytes, DigitsOf(line.Of[s].Low));
  }
  for (int k = 0; k < 4; ++k) {
    upper[k] = (high[k] << line.Left) + (upper[k] >> line.Right) + line.FineStart;
    lower[k] = (upper[k] - line.FineGap) >> line.FineShift;
    upper[k] = upper[k] >> line.FineShift;
  }
  const Bytes whole = WholeOf(Saturated(upper[0], upper[1]), Saturated(upper[2], upper[3]));
  StoreUnit(sums, unit, whole ^ Sample(SlotLine::Middle));
  const std::uint32_t doubts =
      Difference(whole, WholeOf(Saturated(lower[0], lower[1]), Saturated(lower[2], lower[3])));
  if (doubts != 0) SettleUnitPlainly(sums, unit, doubts);
}

/// Makes what is in doubt of a unit.
LOOP_INLINE void Settle(const SlotSums& sums, std::ptrdiff_t unit, std::uint32_t doubts) {
  if (__builtin_popcount(doubts) > Width / 4) return SettleUnit(sums, unit);
  for (; doubts != 0; doubts &= doubts - 1) {
    const int sample = __builtin_ctz(doubts);
    if (const std::ptrdiff_t at = unit * Width + sample; at < sums.Samples)
      sums.Into[at] = SettledSample(sums, unit, sample);
  }
}

LOOP_INLINE bool HasDoubts(const SlotLine& line) { return line.Gap != 0; }

}
}
