#include <algorithm>

#include "image/conversion.h"
#include "image/targets.h"

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>

namespace zor {
namespace {

const __m128i* At(const Sample* bytes) { return reinterpret_cast<const __m128i*>(bytes); }
__m128i* At(Sample* bytes) { return reinterpret_cast<__m128i*>(bytes); }

/// How many pixels, from the left, may be the first of a run of `bytes` bytes.
std::int32_t Starts(std::int32_t width, std::int32_t step, std::int32_t bytes) {
  return width - (bytes + step - 1) / step + 1;
}

}

ZOR_FOR("avx2")
std::int32_t ShuffleRow(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                        std::int32_t intoStep, std::int32_t width) {
  const __m128i order = _mm_load_si128(At(shuffle.From)), flip = _mm_load_si128(At(shuffle.Flip));
  const std::int32_t pixels = shuffle.Pixels, end = Starts(width, std::min(fromStep, intoStep), 16);
  std::int32_t x = 0;
  // What a shuffle leaves in the bytes behind its pixels, the next one or the plain loop overwrites.
#pragma GCC unroll 4
  for (; x < end; x += pixels) {
    _mm_storeu_si128(At(into), _mm_xor_si128(_mm_shuffle_epi8(_mm_loadu_si128(At(from)), order), flip));
    from += pixels * fromStep;
    into += pixels * intoStep;
  }
  return x;
}

ZOR_FOR("avx2")
std::int32_t ShuffleInto(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                         std::int32_t intoStep, std::int32_t width) {
  const __m128i order = _mm_load_si128(At(shuffle.From)), flip = _mm_load_si128(At(shuffle.Flip)),
                write = _mm_load_si128(At(shuffle.Write));
  const std::int32_t pixels = shuffle.Pixels, end = Starts(width, std::min(fromStep, intoStep), 16);
  std::int32_t x = 0;
#pragma GCC unroll 4
  for (; x < end; x += pixels) {
    const __m128i moved = _mm_xor_si128(_mm_shuffle_epi8(_mm_loadu_si128(At(from)), order), flip);
    _mm_storeu_si128(At(into), _mm_blendv_epi8(_mm_loadu_si128(At(into)), moved, write));
    from += pixels * fromStep;
    into += pixels * intoStep;
  }
  return x;
}

namespace {

/// The shuffle that lines up 4 pixels as red, green four times, then blue, green four times.
__m128i PairsOfFour(std::int32_t step, const std::int32_t (&places)[3]) {
  alignas(16) Sample order[16];
  for (int x = 0; x < 4; ++x) {
    order[2 * x] = Sample(x * step + places[0]);
    order[8 + 2 * x] = Sample(x * step + places[2]);
    order[2 * x + 1] = order[8 + 2 * x + 1] = Sample(x * step + places[1]);
  }
  return _mm_load_si128(At(order));
}

/// For 8 pixels, in each half of the register: four times 77 red + 51 green, then 28 blue + 100 green. No sum
/// is larger than 128 * 255, so none saturates.
ZOR_FOR("avx2")
inline __m256i WeighedEight(const Sample* from, std::int32_t step, __m256i order, __m256i weights) {
  const __m256i pixels = _mm256_inserti128_si256(_mm256_castsi128_si256(_mm_loadu_si128(At(from))),
                                                 _mm_loadu_si128(At(from + 4 * step)), 1);
  return _mm256_maddubs_epi16(_mm256_shuffle_epi8(pixels, order), weights);
}

/// The luma of 16 pixels as 16-bit numbers, pixels 0-3, 8-11, 4-7, 12-15. The sums of both halves are below
/// 65536.
ZOR_FOR("avx2")
inline __m256i LumaOfSixteen(const Sample* from, std::int32_t step, __m256i order, __m256i weights) {
  const __m256i a = WeighedEight(from, step, order, weights),
                b = WeighedEight(from + 8 * step, step, order, weights);
  return _mm256_srli_epi16(_mm256_add_epi16(_mm256_unpacklo_epi64(a, b), _mm256_unpackhi_epi64(a, b)), 8);
}

}

// 77 r + 151 g + 28 b, where the weight of green is split in two so that each fits a signed byte.
ZOR_FOR("avx2")
std::int32_t LumaRow(const Sample* from, std::int32_t step, const std::int32_t (&places)[3], Sample* into,
                     std::int32_t width) {
  const __m256i order = _mm256_broadcastsi128_si256(PairsOfFour(step, places));
  const __m256i weights = _mm256_broadcastsi128_si256(
      _mm_setr_epi8(77, 51, 77, 51, 77, 51, 77, 51, 28, 100, 28, 100, 28, 100, 28, 100));
  // Packing leaves four pixels in each 32 bits: 0 8 16 24 4 12 20 28.
  const __m256i inOrder = _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7);
  const std::int32_t end = Starts(width, step, 28 * step + 16);
  std::int32_t x = 0;
  for (; x < end; x += 32, from += 32 * step, into += 32) {
    const __m256i packed = _mm256_packus_epi16(LumaOfSixteen(from, step, order, weights),
                                               LumaOfSixteen(from + 16 * step, step, order, weights));
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(into), _mm256_permutevar8x32_epi32(packed, inOrder));
  }
  return x;
}

}

#else

namespace zor {

std::int32_t ShuffleRow(const ByteShuffle&, const Sample*, std::int32_t, Sample*, std::int32_t,
                        std::int32_t) {
  return 0;
}
std::int32_t ShuffleInto(const ByteShuffle&, const Sample*, std::int32_t, Sample*, std::int32_t,
                         std::int32_t) {
  return 0;
}
std::int32_t LumaRow(const Sample*, std::int32_t, const std::int32_t (&)[3], Sample*, std::int32_t) {
  return 0;
}

}

#endif
