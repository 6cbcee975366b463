#include "filters/oil_modes.h"

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>

#include <bit>

// The counts of all classes stay in registers from pixel to pixel; the compiler's own form of the plain loop
// stores and loads them. Up to 63 samples are counted, as 63 less their number in the upper six bits of a
// byte; in the lower two stands which 64 of the classes it belongs to. So the smallest byte in the same place
// of all vectors has the most samples, and the lowest class among those; the first place with the smallest
// byte of all is where the class stands in its 64.

#define ZOR_AVX2 [[gnu::target("avx2")]]

namespace zor {
namespace {

/// The smallest bytes of `Count` vectors, place by place.
template <int Count>
ZOR_AVX2 inline __m256i Smallest(const __m256i* vectors) {
  if constexpr (Count == 1)
    return *vectors;
  else
    return _mm256_min_epu8(Smallest<Count / 2>(vectors), Smallest<Count - Count / 2>(vectors + Count / 2));
}
/// The smallest of 32 bytes, as the first byte.
ZOR_AVX2 inline __m128i Smallest(__m256i bytes) {
  const __m128i half = _mm_min_epu8(_mm256_castsi256_si128(bytes), _mm256_extracti128_si256(bytes, 1));
  // The smaller of each pair of bytes as 16 bits, of which one instruction finds the smallest.
  return _mm_minpos_epu16(_mm_min_epu8(half, _mm_srli_epi16(half, 8)));
}

/// Counts down what enters, and up what leaves.
ZOR_AVX2 inline __m256i Moved(__m256i counted, const __m256i& entering, const __m256i& leaving) {
  return _mm256_sub_epi8(_mm256_add_epi8(counted, leaving), entering);
}

/// A bit for each byte that is this one.
ZOR_AVX2 inline std::uint64_t Places(__m256i bytes, __m256i wanted) {
  return std::uint32_t(_mm256_movemask_epi8(_mm256_cmpeq_epi8(bytes, wanted)));
}

template <int Vectors>
ZOR_AVX2 void FindPlaneModes(const CountedColumns& of, std::ptrdiff_t plane, Sample* modes, Sample* counts) {
  const CountedColumns columns = of;
  auto* const kept = reinterpret_cast<__m256i*>(columns.Around + plane * columns.Classes);
  // The first and the second 32 of each 64 classes.
  __m256i first[Vectors / 2], second[Vectors / 2];
  for (int v = 0; v < Vectors / 2; ++v) {
    const __m256i none = _mm256_set1_epi8(char(252 + v));
    first[v] = _mm256_sub_epi8(none, _mm256_load_si256(kept + 2 * v));
    second[v] = _mm256_sub_epi8(none, _mm256_load_si256(kept + 2 * v + 1));
  }
  for (std::ptrdiff_t x = columns.First; x < columns.End; ++x) {
    const auto* entering = reinterpret_cast<const __m256i*>(columns.Entering(x, plane));
    const auto* leaving = reinterpret_cast<const __m256i*>(columns.Leaving(x, plane));
#pragma GCC unroll 4
    for (int v = 0; v < Vectors / 2; ++v) {
      first[v] = Moved(first[v], entering[2 * v], leaving[2 * v]);
      second[v] = Moved(second[v], entering[2 * v + 1], leaving[2 * v + 1]);
    }
    if (x < 2 * columns.Range) continue;
    const __m256i low = Smallest<Vectors / 2>(first), high = Smallest<Vectors / 2>(second);
    const __m128i least = Smallest(_mm256_min_epu8(low, high));
    const __m256i everywhere = _mm256_broadcastb_epi8(least);
    const int key = _mm_cvtsi128_si32(least);
    const std::ptrdiff_t place = (x - 2 * columns.Range) * columns.Pixel + plane;
    modes[place] =
        Sample(key % 4 * 64 + std::countr_zero(Places(low, everywhere) | Places(high, everywhere) << 32));
    counts[place] = Sample(63 - key / 4);
  }
  for (int v = 0; v < Vectors / 2; ++v) {
    const __m256i none = _mm256_set1_epi8(char(252 + v));
    _mm256_store_si256(kept + 2 * v, _mm256_sub_epi8(none, first[v]));
    _mm256_store_si256(kept + 2 * v + 1, _mm256_sub_epi8(none, second[v]));
  }
}

}

void FindModesAVX2(const CountedColumns& columns, Sample* modes, Sample* counts) {
  constexpr decltype(&FindPlaneModes<8>) byClasses[] = {FindPlaneModes<2>, FindPlaneModes<4>,
                                                        FindPlaneModes<6>, FindPlaneModes<8>};
  for (std::ptrdiff_t plane = 0; plane < columns.Pixel; ++plane)
    byClasses[columns.Classes / 64 - 1](columns, plane, modes, counts);
}

}

#else
namespace zor {

void FindModesAVX2(const CountedColumns&, Sample*, Sample*) {}

}
#endif
