// The loops of slot_loops.h for vectors of VectorBytes bytes; included by a file for each instruction set,
// which says what that is and marks each function with LOOP or LOOP_INLINE.

#include "scale/slot_vectors.h"
// After the vectors.
#include "scale/slot_pairs.h"

namespace zor {
// Of each instruction set its own. NOLINTNEXTLINE(cert-dcl59-cpp,google-build-namespaces)
namespace {

constexpr int GroupSlots = GroupPixels / LinesInSlot;

/// The source lines of a line, counted from the first one in its first slot.
struct LineRows {
  const SlotSums& Of;
  std::ptrdiff_t Unit;

  LOOP_INLINE std::int32_t First() const { return Of.Of->First % LinesInSlot; }
  LOOP_INLINE std::int32_t End() const { return First() + Of.Of->Last() - Of.Of->First + 1; }
  LOOP_INLINE std::int32_t RowOf(std::int32_t entry) const { return First() + Of.Of->Entries[entry].Pixel; }
  LOOP_INLINE const Sample* UnitOf(std::int32_t row) const {
    return Of.Slots[row / LinesInSlot] + Unit * UnitBytes;
  }
};

LOOP_INLINE void StoreUnit(const SlotSums& sums, std::ptrdiff_t unit, Bytes samples) {
  const std::ptrdiff_t left = sums.Samples - unit * Width;
  if (left >= Width)
    Store(sums.Into + unit * Width, samples);
  else
    std::memcpy(sums.Into + unit * Width, &samples, std::size_t(left));
}

LOOP_INLINE Sample ExactSample(const SlotSums& sums, std::ptrdiff_t unit, int sample) {
  const LineRows rows{sums, unit};
  double sum = 0.0;
  for (std::int32_t i = 0; i < sums.Of->Count; ++i) {
    const std::int32_t row = rows.RowOf(i);
    sum += double(sums.Of->Entries[i].Weight) * SampleIn(rows.UnitOf(row), sample, row % LinesInSlot);
  }
  return ExactQuotient(sum, sums.Of->Sum);
}

/// Makes what is in doubt of a unit without more numbers: flat runs, and the others by the plain form.
NOINLINE LOOP void SettleUnitPlainly(const SlotSums& sums, std::ptrdiff_t unit, Bits doubts) {
  constexpr int few = 2;
  if (sums.Line->OfFlat != Flat::Unknown && std::popcount(doubts) > few) {
    const LineRows rows{sums, unit};
    const Bytes samples = Narrowed(rows.UnitOf(rows.First()), rows.First());
    Bytes differ{};
    for (std::int32_t row = rows.First() + 1; row < rows.End(); ++row)
      differ |= samples ^ Narrowed(rows.UnitOf(row), row % LinesInSlot);
    const Bits flat = doubts & ~Difference(differ, Bytes{});
    const int less = sums.Line->OfFlat == Flat::Falls ? 1 : 0;
    Sample values[Width];
    Store(values, samples);
    for (Bits left = flat; left != 0; left &= left - 1) {
      const int sample = std::countr_zero(left);
      if (const std::ptrdiff_t at = unit * Width + sample; at < sums.Samples)
        sums.Into[at] = Clamp(values[sample] - less);
    }
    doubts &= ~flat;
  }
  for (; doubts != 0; doubts &= doubts - 1) {
    const int sample = std::countr_zero(doubts);
    if (const std::ptrdiff_t at = unit * Width + sample; at < sums.Samples)
      sums.Into[at] = ExactSample(sums, unit, sample);
  }
}

/// Makes units by the plain form.
NOINLINE LOOP void SumPlain(const SlotSums& sums) {
  const LineRows rows{sums, sums.FirstUnit};
  Sample samples[SlotLoops::MostUnits * Width];
  ExactSums exact(int(sums.UnitCount) * Width);
  for (std::int32_t i = 0; i < sums.Of->Count; ++i) {
    const std::int32_t row = rows.RowOf(i);
    for (std::ptrdiff_t u = 0; u < sums.UnitCount; ++u)
      Store(samples + u * Width, Narrowed(rows.UnitOf(row) + u * UnitBytes, row % LinesInSlot));
    exact.Add(samples, sums.Of->Entries[i].Weight);
  }
  exact.Store(sums.Of->Sum, samples);
  for (std::ptrdiff_t u = 0; u < sums.UnitCount; ++u)
    StoreUnit(sums, sums.FirstUnit + u, Load<Bytes>(samples + u * Width));
}

/// What is whole of sums, between 0 and 255.
LOOP_INLINE Bytes WholeOf(const Sums* sums, int bits) {
  return Packed(Saturated(Shifted(sums[0], bits), Shifted(sums[1], bits)),
                Saturated(Shifted(sums[2], bits), Shifted(sums[3], bits)));
}
/// A bit for each sample that would be another one if its sum were less by `gap`.
LOOP_INLINE Bits DoubtsOf(Bytes whole, const Sums* sums, std::int32_t gap, int bits) {
  const Sums less[] = {sums[0] - gap, sums[1] - gap, sums[2] - gap, sums[3] - gap};
  return Difference(whole, WholeOf(less, bits));
}

template <int Units>
LOOP_INLINE void AddSlot(Sums* sums, const Sample* slot, const std::int16_t* two) {
  const auto digits = DigitsOf(two);
  // Else the compiler keeps an address for each vector of the slot, more than there are registers.
  slot = __builtin_launder(slot);
  UNROLL
  for (int u = 0; u < Units; ++u) AddProducts(sums + u * 4, slot + u * UnitBytes, digits);
}

/// Makes some units, and notes for each which of its samples are in doubt.
template <int Units>
LOOP_INLINE void SumUnits(const SlotSums& sums, std::ptrdiff_t unit, Bits* doubts) {
  const SlotLine& line = *sums.Line;
  Sums made[Units * 4];
  const std::ptrdiff_t from = unit * UnitBytes;
  if (line.TopCount == 0) {
    UNROLL
    for (Sums& sum : made) sum = Sums{} + line.Start;
  } else {
    UNROLL
    for (Sums& sum : made) sum = Sums{};
    for (std::int32_t t = 0; t < line.TopCount; ++t)
      AddSlot<Units>(made, sums.Slots[line.FirstTop + t] + from, line.Top[t]);
    UNROLL
    for (Sums& sum : made) sum = (sum << SlotLine::TopShift) + line.Start;
  }
  for (std::int32_t s = 0; s < line.Count; ++s) AddSlot<Units>(made, sums.Slots[s] + from, line.Of[s].High);
  UNROLL
  for (int u = 0; u < Units; ++u) {
    const Bytes whole = WholeOf(made + u * 4, line.Shift);
    StoreUnit(sums, unit + u, whole);
    if (line.Gap != 0) doubts[u] = DoubtsOf(whole, made + u * 4, line.Gap, line.Shift);
  }
}

/// Makes a sample with all digits.
LOOP_INLINE Sample SettledSample(const SlotSums& sums, std::ptrdiff_t unit, int sample) {
  const SlotLine& line = *sums.Line;
  SampleSums of;
  for (std::int32_t s = 0; s < line.Count; ++s) of.Add(sums.Slots[s] + unit * UnitBytes, sample, line.Of[s]);
  std::int32_t high = of.High();
  for (std::int32_t t = 0; t < line.TopCount; ++t)
    for (int i = 0; i < LinesInSlot; ++i)
      high += (line.Top[t][i] * SampleIn(sums.Slots[line.FirstTop + t] + unit * UnitBytes, sample, i))
              << SlotLine::TopShift;
  const std::int32_t upper = (high << line.Left) + (of.Low() >> line.Right) + line.FineStart;
  const std::int32_t whole = upper >> line.FineShift;
  return whole == (upper - line.FineGap) >> line.FineShift ? Clamp(whole) : ExactSample(sums, unit, sample);
}

/// Makes a unit much of which is in doubt with all digits.
NOINLINE LOOP void SettleUnit(const SlotSums& sums, std::ptrdiff_t unit) {
  const SlotLine& line = *sums.Line;
  Sums high[4] = {}, low[4] = {};
  for (std::int32_t t = 0; t < line.TopCount; ++t)
    AddProducts(high, sums.Slots[line.FirstTop + t] + unit * UnitBytes, DigitsOf(line.Top[t]));
  for (Sums& sum : high) sum <<= SlotLine::TopShift;
  for (std::int32_t s = 0; s < line.Count; ++s) {
    AddProducts(high, sums.Slots[s] + unit * UnitBytes, DigitsOf(line.Of[s].High));
    AddProducts(low, sums.Slots[s] + unit * UnitBytes, DigitsOf(line.Of[s].Low));
  }
  for (int k = 0; k < 4; ++k) high[k] = (high[k] << line.Left) + (low[k] >> line.Right) + line.FineStart;
  const Bytes whole = WholeOf(high, line.FineShift);
  StoreUnit(sums, unit, whole);
  const Bits doubts = DoubtsOf(whole, high, line.FineGap, line.FineShift);
  if (doubts != 0) SettleUnitPlainly(sums, unit, doubts);
}

/// Makes what is in doubt of a unit.
LOOP_INLINE void Settle(const SlotSums& sums, std::ptrdiff_t unit, Bits doubts) {
  // What a unit costs, whatever its width.
  constexpr int many = 5;
  if (std::popcount(doubts) > many) return SettleUnit(sums, unit);
  for (; doubts != 0; doubts &= doubts - 1) {
    const int sample = std::countr_zero(doubts);
    if (const std::ptrdiff_t at = unit * Width + sample; at < sums.Samples)
      sums.Into[at] = SettledSample(sums, unit, sample);
  }
}

LOOP void Sum(const SlotSums& sums) {
  if (sums.Line->Plain) return SumPlain(sums);
  // As many units together as there are registers for.
  constexpr int most = Width == 64 ? 4 : 2;
  Bits doubts[SlotLoops::MostUnits];
  std::ptrdiff_t done = 0;
  const std::ptrdiff_t all = sums.UnitCount, first = sums.FirstUnit;
  for (; all - done >= most && all - done != 3; done += most)
    SumUnits<most>(sums, first + done, doubts + done);
  if (all - done == 3)
    SumUnits<3>(sums, first + done, doubts + done);
  else if (most > 2 && all - done == 2)
    SumUnits<2>(sums, first + done, doubts + done);
  else if (all - done == 1)
    SumUnits<1>(sums, first + done, doubts + done);
  if (sums.Line->Gap == 0) return;
  for (std::ptrdiff_t u = 0; u < all; ++u)
    if (doubts[u] != 0) Settle(sums, first + u, doubts[u]);
}

LOOP void Widen(const Sample* even, const Sample* odd, std::ptrdiff_t units, Sample* slot) {
  for (std::ptrdiff_t u = 0; u < units; ++u)
    StoreWidened(Load<Bytes>(even + u * Width), Load<Bytes>(odd + u * Width), slot + u * UnitBytes);
}

/// Transposes squares of 16 x 16 bytes, one in each part of the vectors.
LOOP_INLINE void Transpose(Bytes (&rows)[16]) {
  for (int stage = 0; stage < 4; ++stage) {
    Bytes mixed[16];
    for (int i = 0; i < 8; ++i) {
      mixed[2 * i] = LowInterleaved(rows[i], rows[i + 8]);
      mixed[2 * i + 1] = HighInterleaved(rows[i], rows[i + 8]);
    }
    // One by one, so that they stay in registers.
    for (int i = 0; i < 16; ++i) rows[i] = mixed[i];
  }
}

using Block16 [[gnu::vector_size(16)]] = std::uint8_t;
/// 16 bytes each of rows that lie 16 apart.
#if VectorBytes > 16
LOOP_INLINE __m256i TwoParts(const Sample* const* rows, std::int64_t at) {
  const __m256i low = _mm256_castsi128_si256(Load<__m128i>(rows[0] + at));
  return _mm256_inserti128_si256(low, Load<__m128i>(rows[16] + at), 1);
}
#endif
LOOP_INLINE Bytes LoadParts(const Sample* const* rows, std::int64_t at) {
#if VectorBytes == 64
  return Bytes(_mm512_inserti64x4(_mm512_castsi256_si512(TwoParts(rows, at)), TwoParts(rows + 32, at), 1));
#elif VectorBytes == 32
  return Bytes(TwoParts(rows, at));
#else
  return Load<Bytes>(rows[0] + at);
#endif
}

/// How far ahead of what is turned the cache is asked for.
constexpr std::int64_t Ahead = 256;

/// Turns a group of columns of Width rows, `at` bytes from their start, and makes slots of them.
NOINLINE LOOP void TurnGroup(const RowsToMake& rows, const Sample* const* from, std::int64_t at,
                             Sample* into) {
  Bytes columns[16 * MostStep];
  for (int chunk = 0; chunk < rows.Step; ++chunk) {
    Bytes square[16];
    for (int r = 0; r < 16; ++r) square[r] = LoadParts(from + r, at + chunk * 16);
    // So many rows at once are more than a processor foresees. A cache line has four chunks.
    if (chunk % 4 == 0)
      for (int r = 0; r < Width; ++r) Prefetch(from[r], at + chunk * 16 + Ahead);
    Transpose(square);
    for (int j = 0; j < 16; ++j) columns[chunk * 16 + j] = square[j];
  }
  for (int x = 0; x < GroupPixels; x += LinesInSlot)
    for (int c = 0; c < rows.Channels; ++c, into += UnitBytes) {
      const Bytes* even = columns + x * rows.Step + rows.Offset[c];
      StoreWidened(*even, even[rows.Step], into);
    }
}

/// Stores pixels of Width rows: `places` samples of each, those of all rows at from[place].
NOINLINE LOOP void StoreTurned(const RowsToMake& rows, const Sample* const* from, std::ptrdiff_t places,
                               std::ptrdiff_t at) {
  for (std::ptrdiff_t k = 0; k < places; k += 16) {
    Bytes square[16];
    for (int j = 0; j < 16; ++j) square[j] = Load<Bytes>(from[k + j]);
    Transpose(square);
    const auto count = std::size_t(places - k < 16 ? places - k : 16);
    for (int r = 0; r < rows.Rows; ++r) {
      const auto* made = reinterpret_cast<const Sample*>(square + r % 16) + r / 16 * 16;
      Sample* into = rows.Into[r] + at + k;
      count == 16 ? Store(into, Load<Block16>(made)) : void(std::memcpy(into, made, count));
    }
  }
}

/// The columns that lines look at.
struct TurnedColumns {
  LOOP TurnedColumns(const RowsToMake& rows)
      : Of(rows), SlotBytes(std::ptrdiff_t{rows.Channels} * UnitBytes), SlotCount(rows.Kept * GroupSlots) {
    for (int r = 0; r < Width; ++r) From[r] = rows.From[r < rows.Rows ? r : rows.Rows - 1];
    const auto address = reinterpret_cast<Word>(rows.Scratch);
    Ring = rows.Scratch + (64 - address % 64) % 64;
    Slots = reinterpret_cast<const Sample**>(Ring + SlotCount * SlotBytes);
    for (std::int32_t s = 0; s < 2 * SlotCount; ++s) Slots[s] = Ring + s % SlotCount * SlotBytes;
  }
  /// Makes sure of the columns that a line looks at.
  LOOP_INLINE void Need(const SlotLine& line) {
    const std::int32_t end = (line.First + line.Count + GroupSlots - 1) / GroupSlots;
    if (end <= End) return;
    if (End < line.Least / GroupSlots) End = line.Least / GroupSlots;
    for (; End < end; ++End) Fill(End);
  }
  LOOP void Fill(std::int32_t group) {
    const std::int64_t at = std::int64_t{group} * GroupPixels * Of.Step;
    const std::int64_t left = Of.RowBytes - at;
    Sample* into = Ring + group % Of.Kept * GroupSlots * SlotBytes;
    if (left >= GroupPixels * Of.Step) return TurnGroup(Of, From, at, into);
    // Nothing is read beyond the end of a row.
    Sample rest[Width][GroupPixels * MostStep] = {};
    const Sample* ends[Width];
    for (int r = 0; r < Width; ++r) {
      if (left > 0) std::memcpy(rest[r], From[r] + at, std::size_t(left));
      ends[r] = rest[r];
    }
    TurnGroup(Of, ends, 0, into);
  }
  LOOP_INLINE const Sample* const* SlotsOf(const SlotLine& line) const {
    return Slots + line.First % SlotCount;
  }

  const RowsToMake& Of;
  std::ptrdiff_t SlotBytes;
  std::int32_t SlotCount, End = 0;
  Sample* Ring;
  const Sample** Slots;
  const Sample* From[Width];
};

LOOP void MakeRows(const RowsToMake& rows) {
  static constexpr Sample zeros[Width] = {};
  TurnedColumns columns(rows);
  alignas(64) Sample made[GroupPixels][5 * Width];
  const Sample* from[GroupPixels * 5 + 16];
  for (const Sample*& place : from) place = zeros;
  for (std::int64_t x = rows.Of.First; x < rows.Of.End; x += GroupPixels) {
    const int pixels = int(rows.Of.End - x < GroupPixels ? rows.Of.End - x : GroupPixels);
    for (int p = 0; p < pixels; ++p) {
      const auto at = std::int32_t(x) + p;
      const SlotLine& line = rows.Lines[at];
      if (line.Count > 0) columns.Need(line);
      Sum({&line, &rows.Table[at], columns.SlotsOf(line), 0, rows.Channels,
           std::ptrdiff_t{rows.Channels} * Width, made[p]});
      for (int b = 0; b < rows.Order.Count; ++b)
        if (const int channel = rows.Order.Channel[b]; channel != PixelOrder::Zero)
          from[p * rows.Order.Count + b] = made[p] + channel * Width;
    }
    StoreTurned(rows, from, std::ptrdiff_t{pixels} * rows.Order.Count,
                std::ptrdiff_t(x - rows.Of.First) * rows.Order.Count);
  }
}

}
}
