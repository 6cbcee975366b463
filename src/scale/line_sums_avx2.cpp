#include "scale/line_sums.h"

#if defined(__x86_64__) || defined(__i386__)

#include <immintrin.h>

#include <bit>

#define ZOR_AVX2 [[gnu::target("avx2,fma")]]
#define ZOR_AVX2_INLINE [[gnu::target("avx2,fma"), gnu::always_inline]] inline

namespace zor {
namespace {

constexpr int Lanes = 8, Vectors = 4, Part = Lanes * Vectors;

/// 32 sums as bytes, cut off and clamped by packing them twice, in their order.
ZOR_AVX2_INLINE __m256i Packed(const __m256* sums) {
  const __m256i low = _mm256_packs_epi32(_mm256_cvttps_epi32(sums[0]), _mm256_cvttps_epi32(sums[1]));
  const __m256i high = _mm256_packs_epi32(_mm256_cvttps_epi32(sums[2]), _mm256_cvttps_epi32(sums[3]));
  // Packing works within half a vector.
  return _mm256_permutevar8x32_epi32(_mm256_packus_epi16(low, high),
                                     _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7));
}

/// Makes the samples that came into doubt by the plain form.
[[gnu::noinline, gnu::cold]] void Settle(const LineSums& sums, int line, std::ptrdiff_t part,
                                         std::uint32_t doubt) {
  for (; doubt != 0; doubt &= doubt - 1) {
    const std::ptrdiff_t at = part + std::countr_zero(doubt);
    if (at < sums.Samples) sums.Into[line][at] = PlainSample(sums, line, at);
  }
}

/// Stores 32 samples, and settles what is in doubt.
ZOR_AVX2_INLINE void Store(const LineSums& sums, int line, std::ptrdiff_t i, __m256* sum) {
  const __m256i lower = Packed(sum);
  Sample* into = sums.Into[line] + i;
  if (sums.Samples - i >= Part) {
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(into), lower);
  } else {
    alignas(Part) Sample bytes[Part];
    _mm256_store_si256(reinterpret_cast<__m256i*>(bytes), lower);
    for (std::ptrdiff_t at = 0; at < sums.Samples - i; ++at) into[at] = bytes[at];
  }
  if (sums.Lines[line].Gap == 0.0F) return;
  const __m256 gap = _mm256_set1_ps(sums.Lines[line].Gap);
  for (int k = 0; k < Vectors; ++k) sum[k] = _mm256_add_ps(sum[k], gap);
  const auto same = std::uint32_t(_mm256_movemask_epi8(_mm256_cmpeq_epi8(lower, Packed(sum))));
  if (~same != 0) [[unlikely]]
    Settle(sums, line, i, ~same);
}

/// The samples of Count lines from i on, at most Parts * Part of them.
template <int Count, int Parts>
ZOR_AVX2_INLINE void SumBlock(const LineSums& sums, int first, std::ptrdiff_t i) {
  __m256 sum[Count][Parts * Vectors];
  for (int l = 0; l < Count; ++l)
    for (__m256& vector : sum[l]) vector = _mm256_set1_ps(sums.Lines[first + l].Start);
  const float* share = sums.Shares + first;
  for (std::int32_t row = 0; row < sums.RowCount; ++row, share += sums.LineCount) {
    const float* samples = sums.Rows[row] + i;
    for (int k = 0; k < Parts * Vectors; ++k) {
      const __m256 vector = _mm256_load_ps(samples + k * Lanes);
      // Contracted, which rounds once less than the bound allows for.
      for (int l = 0; l < Count; ++l)
        sum[l][k] = _mm256_fmadd_ps(_mm256_broadcast_ss(share + l), vector, sum[l][k]);
    }
  }
  for (int l = 0; l < Count; ++l)
    for (int p = 0; p < Parts; ++p) Store(sums, first + l, i + p * Part, sum[l] + p * Vectors);
}

/// Count lines from `first` on.
template <int Count>
ZOR_AVX2_INLINE void Sum(const LineSums& sums, int first) {
  // As many sums as there are registers for.
  constexpr int Parts = 2 / Count;
  std::ptrdiff_t i = 0;
  for (; sums.Samples - i > (Parts - 1) * Part; i += Parts * Part) SumBlock<Count, Parts>(sums, first, i);
  if (i < sums.Samples) SumBlock<Count, 1>(sums, first, i);
}

}

ZOR_AVX2 void SumLinesAVX2(const LineSums& sums) {
  if (sums.LineCount == 1) return Sum<1>(sums, 0);
  for (int line = 0; line < sums.LineCount; line += 2) Sum<2>(sums, line);
}

}

#else

namespace zor {

// No other processor takes this way.
void SumLinesAVX2(const LineSums&) {}

}

#endif
