#include <bit>

#include "scale/line_sums.h"

#if defined(__x86_64__) || defined(__i386__)

// g++ 12 takes the undefined vectors of its own header for mistakes (its bug 105593).
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#pragma GCC diagnostic ignored "-Wuninitialized"
#include <immintrin.h>
#pragma GCC diagnostic pop

#define ZOR_512 [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq")]]
#define ZOR_512_INLINE [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq"), gnu::always_inline]] inline

namespace zor {
namespace {

constexpr int Lanes = 16;

/// 64 sums as bytes, or 32 of them twice, cut off and clamped by packing them twice. Packing works within a
/// quarter of a vector, so quarter q of the result holds four bytes each of quarter q of the four vectors.
template <int Vectors>
ZOR_512_INLINE __m512i Packed(const __m512* sums) {
  const __m512i low = _mm512_packs_epi32(_mm512_cvttps_epi32(sums[0]), _mm512_cvttps_epi32(sums[1]));
  if constexpr (Vectors == 2) return _mm512_packus_epi16(low, low);
  const __m512i high = _mm512_packs_epi32(_mm512_cvttps_epi32(sums[2]), _mm512_cvttps_epi32(sums[3]));
  return _mm512_packus_epi16(low, high);
}
/// Where byte `at` of packed sums belongs.
constexpr int Unpacked(int at) { return at / 4 % 4 * Lanes + at / 16 * 4 + at % 4; }

/// Makes the samples that came into doubt by the plain form.
[[gnu::noinline, gnu::cold]] void Settle(const LineSums& sums, int line, std::ptrdiff_t block,
                                         std::uint64_t doubt) {
  for (; doubt != 0; doubt &= doubt - 1) {
    const std::ptrdiff_t at = block + Unpacked(std::countr_zero(doubt));
    if (at < sums.Samples) sums.Into[line][at] = PlainSample(sums, line, at);
  }
}

/// The samples of Count lines from i on, at most Vectors * Lanes of them.
template <int Count, int Vectors>
ZOR_512_INLINE void SumBlock(const LineSums& sums, std::ptrdiff_t i) {
  const __m512i order = _mm512_set_epi32(15, 11, 7, 3, 14, 10, 6, 2, 13, 9, 5, 1, 12, 8, 4, 0);
  __m512 sum[Count][Vectors];
  for (int l = 0; l < Count; ++l)
    for (int k = 0; k < Vectors; ++k) sum[l][k] = _mm512_set1_ps(sums.Lines[l].Start);
  const float* share = sums.Shares;
  for (std::int32_t row = 0; row < sums.RowCount; ++row, share += Count) {
    const float* samples = sums.Rows[row] + i;
    for (int k = 0; k < Vectors; ++k) {
      const __m512 vector = _mm512_load_ps(samples + k * Lanes);
      // Contracted, which rounds once less than the bound allows for.
      for (int l = 0; l < Count; ++l)
        sum[l][k] = _mm512_fmadd_ps(_mm512_set1_ps(share[l]), vector, sum[l][k]);
    }
  }
  const std::ptrdiff_t left = sums.Samples - i;
  const __mmask64 stored =
      left >= Vectors * Lanes ? ~__mmask64{0} >> (64 - Vectors * Lanes) : (__mmask64{1} << left) - 1;
  for (int l = 0; l < Count; ++l) {
    const __m512i lower = Packed<Vectors>(sum[l]);
    _mm512_mask_storeu_epi8(sums.Into[l] + i, stored, _mm512_permutexvar_epi32(order, lower));
    if (sums.Lines[l].Gap == 0.0F) continue;
    const __m512 gap = _mm512_set1_ps(sums.Lines[l].Gap);
    for (int k = 0; k < Vectors; ++k) sum[l][k] = _mm512_add_ps(sum[l][k], gap);
    const __mmask64 doubt = _mm512_cmpneq_epu8_mask(lower, Packed<Vectors>(sum[l]));
    if (doubt) [[unlikely]]
      Settle(sums, l, i, doubt);
  }
}

template <int Count>
ZOR_512 void Sum(const LineSums& sums) {
  std::ptrdiff_t i = 0;
  for (; sums.Samples - i > LineSums::Block / 2; i += LineSums::Block) SumBlock<Count, 4>(sums, i);
  if (i < sums.Samples) SumBlock<Count, 2>(sums, i);
}

}

void SumLinesAVX512(const LineSums& sums) {
  switch (sums.LineCount) {
    case 1: return Sum<1>(sums);
    case 2: return Sum<2>(sums);
    default: return Sum<4>(sums);
  }
}

}

#else

namespace zor {

// No other processor takes this way.
void SumLinesAVX512(const LineSums&) {}

}

#endif
