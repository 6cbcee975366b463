#include <algorithm>
#include <bit>
#include <cstring>

#include "scale/fixed_point_groups.h"
#include "scale/quotients.h"

#if defined(__x86_64__) || defined(__i386__)

// g++ 12 takes the undefined vectors of its own header for mistakes (its bug 105593).
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#pragma GCC diagnostic ignored "-Wuninitialized"
#include <immintrin.h>
#pragma GCC diagnostic pop

#define ZOR_VNNI [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq,avx512vbmi,avx512vnni")]]
#define ZOR_VNNI_INLINE \
  [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq,avx512vbmi,avx512vnni"), gnu::always_inline]] inline

namespace zor {
namespace {

/// The lowest `count` of 64 bytes.
constexpr __mmask64 Lowest(std::int64_t count) {
  return count >= VectorBytes ? ~__mmask64{0} : (__mmask64{1} << count) - 1;
}

/// Stores bytes: of each lane the lowest, in the order that a pixel has.
struct ByteWriter {
  ZOR_VNNI_INLINE ByteWriter(const PixelOrder& order, int channels, int pixels) : Count(order.Count) {
    alignas(VectorBytes) std::uint8_t index[VectorBytes] = {};
    for (int p = 0; p < pixels; ++p)
      for (int b = 0; b < Count; ++b)
        if (const int channel = order.Channel[b]; channel != PixelOrder::Zero) {
          index[p * Count + b] = std::uint8_t((p * channels + channel) * 4);
          Shown |= __mmask64{1} << (p * Count + b);
        }
    Index = _mm512_load_si512(index);
  }
  /// `room` values may be overwritten; those behind the group's own are made later.
  ZOR_VNNI_INLINE void Write(__m512i lanes, Sample* into, int count, std::int64_t room) const {
    const __m512i pixels = _mm512_maskz_permutexvar_epi8(Shown, Index, lanes);
    if (count <= 32 && room >= 32)
      _mm256_storeu_si256(reinterpret_cast<__m256i*>(into), _mm512_castsi512_si256(pixels));
    else
      _mm512_mask_storeu_epi8(into, Lowest(count), pixels);
  }

  int Count;
  __m512i Index;
  __mmask64 Shown = 0;
};

}

/// Runs groups over one row or several. Loops over rows and digits are unrolled, so that all sums stay in
/// registers.
struct GroupRunner {
  /// A lane's sum, its digits put together.
  template <int Digits>
  ZOR_VNNI_INLINE static __m512i Joined(const __m512i* digits) {
    __m512i sum = digits[0];
    if constexpr (Digits > 1) sum = _mm512_add_epi32(_mm512_slli_epi32(sum, 8), digits[1]);
    if constexpr (Digits > 2) sum = _mm512_add_epi32(_mm512_slli_epi32(sum, 8), digits[2]);
    return Digits < 3 ? _mm512_slli_epi32(sum, 8 * (3 - Digits)) : sum;
  }

  /// The parts of a pixel added up.
  ZOR_VNNI_INLINE static __m512i PartsAdded(__m512i sum, int parts, int lanesOfPart) {
    const __m512i lane = _mm512_set_epi32(15, 14, 13, 12, 11, 10, 9, 8, 7, 6, 5, 4, 3, 2, 1, 0);
    __m512i all = sum;
    for (int part = 1; part < parts; ++part)
      all = _mm512_add_epi32(
          all, _mm512_permutexvar_epi32(_mm512_add_epi32(lane, _mm512_set1_epi32(part * lanesOfPart)), sum));
    return all;
  }

  template <int Rows, int Digits>
  ZOR_VNNI static void Run(const FixedPointRows& plan, const Sample* const* from, Sample* const* into,
                           const PixelOrder& order, Columns columns) {
    const int channels = plan.Pair.Channels, lanesOfPart = plan.Pixels * channels;
    const ByteWriter writer(order, channels, plan.Pixels);
    const __m512i fraction = _mm512_set1_epi32((1 << FixedPointLine::Bits) - 1),
                  zero = _mm512_setzero_si512();
    const __m512i half = _mm512_set1_epi32(1 << (FixedPointLine::Bits - 1)), white = _mm512_set1_epi32(255);
    const std::int64_t step = std::int64_t{Taps} * plan.Parts * plan.Pair.Source.Step;

    const auto *group = plan.Groups + columns.First / plan.Pixels, *end = group;
    for (end += (columns.Count() + plan.Pixels - 1) / plan.Pixels; group != end; ++group) {
      const FixedPointRows::GroupPattern& pattern = *group->Pattern;
      const __m512i take = _mm512_load_si512(pattern.Index);
      __m512i sums[Rows][Digits];
      const Sample* source[Rows];
#pragma GCC unroll 4
      for (int r = 0; r < Rows; ++r) {
        source[r] = from[r] + plan.Lead + group->Base;
#pragma GCC unroll 4
        for (int d = 0; d < Digits; ++d) sums[r][d] = zero;
        // Only lines of three digits have a bias.
        if constexpr (Digits == 3) sums[r][2] = _mm512_load_si512(pattern.Bias);
      }
      const std::int8_t* weights = pattern.Weights();
      std::int32_t s = 0;
      for (; s < group->WholeSteps; ++s, weights += Digits * VectorBytes) {
        __m512i weight[Digits];
#pragma GCC unroll 4
        for (int d = 0; d < Digits; ++d) weight[d] = _mm512_load_si512(weights + d * VectorBytes);
#pragma GCC unroll 4
        for (int r = 0; r < Rows; ++r) {
          const __m512i taps = _mm512_permutexvar_epi8(take, _mm512_loadu_si512(source[r] + s * step));
#pragma GCC unroll 4
          for (int d = 0; d < Digits; ++d) sums[r][d] = _mm512_dpbusd_epi32(sums[r][d], taps, weight[d]);
        }
      }
      for (; s < group->Steps; ++s, weights += Digits * VectorBytes) {
        const std::int64_t left = std::max<std::int64_t>(plan.RowBytes - group->Base - s * step, 0);
#pragma GCC unroll 4
        for (int r = 0; r < Rows; ++r) {
          const __m512i taps =
              _mm512_permutexvar_epi8(take, _mm512_maskz_loadu_epi8(Lowest(left), source[r] + s * step));
#pragma GCC unroll 4
          for (int d = 0; d < Digits; ++d)
            sums[r][d] = _mm512_dpbusd_epi32(sums[r][d], taps, _mm512_load_si512(weights + d * VectorBytes));
        }
      }

      const std::int64_t at = std::int64_t{group->FirstColumn - columns.First} * writer.Count;
      const std::int64_t room = std::int64_t{columns.Count()} * writer.Count - at;
      [[maybe_unused]] const __m512i doubtful = _mm512_load_si512(pattern.Doubtful);
      [[maybe_unused]] std::uint32_t doubts[Rows];
#pragma GCC unroll 4
      for (int r = 0; r < Rows; ++r) {
        __m512i sum = Joined<Digits>(sums[r]);
        if (plan.Parts > 1) sum = PartsAdded(sum, plan.Parts, lanesOfPart);
        const __m512i value = _mm512_srai_epi32(sum, FixedPointLine::Bits);
        writer.Write(_mm512_min_epi32(_mm512_max_epi32(value, zero), white), into[r] + at,
                     group->Columns * writer.Count, room);
        if constexpr (Digits == 3)
          // Near 0 both sides give the same byte.
          doubts[r] = _mm512_mask_cmpge_epi32_mask(
              _mm512_cmplt_epu32_mask(_mm512_and_si512(sum, fraction), doubtful), sum, half);
      }
      if constexpr (Digits == 3) {
        std::uint32_t any = 0;
#pragma GCC unroll 4
        for (int r = 0; r < Rows; ++r) any |= doubts[r];
        if (any) [[unlikely]]
          for (int r = 0; r < Rows; ++r) Settle(plan, *group, doubts[r], from[r], into[r] + at, order);
      }
    }
  }

  /// Whether all source pixels of a line are the same, whatever stands between them: then every channel is
  /// flat.
  static bool IsFlat(const FixedPointRows& plan, const Contribution& line, const Sample* from) {
    const std::ptrdiff_t step = plan.Pair.Source.Step, more = line.Last() - line.First;
    const Sample* first = from + plan.Lead + line.First * step;
    return more == 0 ||
           std::memcmp(first, first + step, std::size_t((more - 1) * step + plan.Spread + 1)) == 0;
  }

  /// Makes the samples in doubt: those of flat runs, which are all, and the others by the plain form.
  [[gnu::noinline, gnu::cold]] static void Settle(const FixedPointRows& plan,
                                                  const FixedPointRows::ColumnGroup& group,
                                                  std::uint32_t doubt, const Sample* from, Sample* into,
                                                  const PixelOrder& order) {
    const PlaneList& planes = plan.Pair.Source;
    int looked = -1;
    bool flat = false;
    for (; doubt != 0; doubt &= doubt - 1) {
      const int lane = std::countr_zero(doubt), pixel = lane / plan.Pair.Channels;
      const int channel = lane % plan.Pair.Channels;
      if (pixel >= group.Columns) return;
      const Contribution& line = plan.Table[group.FirstColumn + pixel];
      const Sample* plane = from + planes.Offset[channel];
      if (pixel != looked) flat = IsFlat(plan, line, from);
      looked = pixel;
      Sample sample;
      if (const Flat of = group.Pattern->OfFlat[lane]; flat && of != Flat::Unknown) {
        sample = Sample(plane[std::ptrdiff_t{line.First} * planes.Step] - (of == Flat::Falls ? 1 : 0));
      } else {
        double sum = 0.0;
        for (std::int32_t i = 0; i < line.Count; ++i)
          sum += double(line.Entries[i].Weight) * plane[std::ptrdiff_t{line.PixelAt(i)} * planes.Step];
        sample = ExactQuotient(sum, line.Sum);
      }
      for (int b = 0; b < order.Count; ++b)
        if (order.Channel[b] == channel) into[pixel * order.Count + b] = sample;
    }
  }

  template <int Rows>
  static void RunDigits(const FixedPointRows& plan, const Sample* const* from, Sample* const* into,
                        const PixelOrder& order, Columns columns) {
    switch (plan.Digits) {
      case 1: return Run<Rows, 1>(plan, from, into, order, columns);
      case 2: return Run<Rows, 2>(plan, from, into, order, columns);
      default: return Run<Rows, 3>(plan, from, into, order, columns);
    }
  }
};

void FixedPointRows::Run(const Sample* const* from, Sample* const* into, int rows, const PixelOrder& order,
                         Columns columns) const {
  if (rows == RowsTogether) return GroupRunner::RunDigits<RowsTogether>(*this, from, into, order, columns);
  for (int r = 0; r < rows; ++r) GroupRunner::RunDigits<1>(*this, from + r, into + r, order, columns);
}

}

#else

namespace zor {

// No other processor has such a form, so none is ever built.
void FixedPointRows::Run(const Sample* const*, Sample* const*, int, const PixelOrder&, Columns) const {}

}

#endif
