#include "filters/unsharp_runs.h"

#if defined(__x86_64__) || defined(__i386__)
#ifndef __clang__
// g++ 12 takes the undefined vectors of its own header for mistakes (its bug 105593).
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#endif
#include <immintrin.h>

// 16 samples at a time in integers of 32 bits. The compiler's own form of the same loop widens 64 at once,
// which takes twice as long. A vector with a doubtful difference is made again by the formula itself, which
// is a product and a sum of doubles, each rounded: the plain loop's bits.

#define ZOR_AVX512 [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq")]]

namespace zor {
namespace {

ZOR_AVX512 inline __m256i HalfInDoubles(__m512d factor, __m256i difference, __m256i beside) {
  return _mm512_cvttpd_epi32(
      _mm512_add_pd(_mm512_mul_pd(factor, _mm512_cvtepi32_pd(difference)), _mm512_cvtepi32_pd(beside)));
}

/// factor * difference + beside, truncated.
ZOR_AVX512 __m512i InDoubles(double factor, __m512i difference, __m512i beside) {
  const __m512d k = _mm512_set1_pd(factor);
  const __m256i low = HalfInDoubles(k, _mm512_castsi512_si256(difference), _mm512_castsi512_si256(beside));
  const __m256i high =
      HalfInDoubles(k, _mm512_extracti64x4_epi64(difference, 1), _mm512_extracti64x4_epi64(beside, 1));
  return _mm512_inserti64x4(_mm512_castsi256_si512(low), high, 1);
}

template <bool AnyDoubtful>
ZOR_AVX512 void PushRun(Sample* samples, const Sample* beside, std::ptrdiff_t count,
                        const WholeFactor& factor, std::int32_t threshold) {
  const __m512i multiplier = _mm512_set1_epi32(factor.Multiplier),
                bias = _mm512_set1_epi32(WholeFactor::Bias);
  const __m512i least = _mm512_set1_epi32(threshold), middle = _mm512_set1_epi32(256);
  const __m512i one = _mm512_set1_epi32(1), zero = _mm512_setzero_si512();
  const __m512i doubtful = _mm512_loadu_si512(factor.Doubtful.data());
  const __m128i shift = _mm_cvtsi32_si128(factor.Shift);
  for (std::ptrdiff_t i = 0; i < count; i += 16) {
    const __mmask16 inRow = count - i >= 16 ? 0xFFFF : __mmask16((1 << (count - i)) - 1);
    const __m512i a = _mm512_cvtepu8_epi32(_mm_maskz_loadu_epi8(inRow, samples + i));
    const __m512i b = _mm512_cvtepu8_epi32(_mm_maskz_loadu_epi8(inRow, beside + i));
    const __m512i d = _mm512_sub_epi32(a, b);
    __m512i pushed = _mm512_add_epi32(
        b, _mm512_sra_epi32(_mm512_add_epi32(_mm512_mullo_epi32(d, multiplier), bias), shift));
    const __mmask16 moved = _mm512_cmpge_epi32_mask(_mm512_abs_epi32(d), least);
    if constexpr (AnyDoubtful) {
      // The bit of each difference; the permutation and the shift take no more than the bits that they need.
      const __m512i place = _mm512_add_epi32(d, middle);
      const __m512i word = _mm512_permutexvar_epi32(_mm512_srli_epi32(place, 5), doubtful);
      const __m512i bit = _mm512_srlv_epi32(word, _mm512_and_si512(place, _mm512_set1_epi32(31)));
      if (_mm512_mask_test_epi32_mask(moved, bit, one)) pushed = InDoubles(factor.Factor, d, b);
    }
    pushed = _mm512_mask_mov_epi32(a, moved, _mm512_max_epi32(pushed, zero));
    _mm512_mask_cvtusepi32_storeu_epi8(samples + i, inRow, pushed);
  }
}

}

void PushRunAVX512(Sample* samples, const Sample* beside, std::ptrdiff_t count, const WholeFactor& factor,
                   std::int32_t threshold) {
  factor.AnyDoubtful ? PushRun<true>(samples, beside, count, factor, threshold)
                     : PushRun<false>(samples, beside, count, factor, threshold);
}

}

#else
namespace zor {

void PushRunAVX512(Sample*, const Sample*, std::ptrdiff_t, const WholeFactor&, std::int32_t) {}

}
#endif
