// Slots of one source line in single precision; for slot_loops_body.h.

namespace zor {
namespace {

constexpr int LinesInSlot = 1;
using Floats [[gnu::vector_size(Width)]] = float;

LOOP_INLINE int SampleIn(const Sample* unit, int sample, int) {
  const int place = sample % 16 / 4 * (Width / 4) + sample / 16 * 4 + sample % 4;
  float number;
  std::memcpy(&number, unit + place * int(sizeof number), sizeof number);
  return int(number);
}
LOOP_INLINE void StoreWidened(Bytes bytes, Bytes, Sample* unit) {
  const Bytes zero{}, low = LowInterleaved(bytes, zero), high = HighInterleaved(bytes, zero);
  Store(unit, __builtin_convertvector(Sums(LowInterleaved(low, zero)), Floats));
  Store(unit + Width, __builtin_convertvector(Sums(HighInterleaved(low, zero)), Floats));
  Store(unit + Width * 2, __builtin_convertvector(Sums(LowInterleaved(high, zero)), Floats));
  Store(unit + Width * 3, __builtin_convertvector(Sums(HighInterleaved(high, zero)), Floats));
}
/// What is whole of numbers, between 0 and 255.
LOOP_INLINE Bytes WholeOf(const Floats* of) {
  Sums whole[4];
  for (int k = 0; k < 4; ++k) whole[k] = Sums(__builtin_ia32_cvttps2dq256(of[k]));
  return Bytes(__builtin_ia32_packuswb256(Saturated(whole[0], whole[1]), Saturated(whole[2], whole[3])));
}
LOOP_INLINE Bytes Narrowed(const Sample* unit, int) {
  Floats of[4];
  for (int k = 0; k < 4; ++k) of[k] = Load<Floats>(unit + k * Width);
  return WholeOf(of);
}

LOOP_INLINE void StoreUnit(const SlotSums& sums, std::ptrdiff_t unit, Bytes samples);
NOINLINE LOOP void SettleUnitPlainly(const SlotSums& sums, std::ptrdiff_t unit, std::uint32_t doubts);

/// Makes some units, and notes for each which of its samples are in doubt.
template <int Units>
LOOP_INLINE void SumUnits(const SlotSums& sums, std::ptrdiff_t unit, std::uint32_t* doubts) {
  const SlotLine& line = *sums.Line;
  Floats made[Units * 4];
  for (Floats& sum : made) sum = Floats{} + line.SingleStart;
  for (std::int32_t s = 0; s < line.Count; ++s) {
    const Floats share = Floats{} + line.Shares[s];
    const Sample* slot = sums.Slots[s] + unit * UnitBytes;
    // Contracted, which rounds once less than the bound allows for.
    for (int k = 0; k < Units * 4; ++k)
      made[k] = __builtin_ia32_vfmaddps256(share, Load<Floats>(slot + k * Width), made[k]);
  }
  for (int u = 0; u < Units; ++u) {
    Floats* sum = made + u * 4;
    const Bytes lower = WholeOf(sum);
    StoreUnit(sums, unit + u, lower);
    if (line.SingleGap == 0.0F) continue;
    for (int k = 0; k < 4; ++k) sum[k] += line.SingleGap;
    doubts[u] = Difference(lower, WholeOf(sum));
  }
}

/// Makes what is in doubt of a unit.
LOOP_INLINE void Settle(const SlotSums& sums, std::ptrdiff_t unit, std::uint32_t doubts) {
  SettleUnitPlainly(sums, unit, doubts);
}

LOOP_INLINE bool HasDoubts(const SlotLine& line) { return line.SingleGap != 0.0F; }

}
}
