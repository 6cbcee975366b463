#include <algorithm>

#include "image/byte_blocks.h"
#include "image/conversion.h"

#ifdef __aarch64__
#include <arm_neon.h>
#elif defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>
#endif

namespace zor {
namespace {

/// Byte b of the result is byte order[b], 0 where that is 128 or more. Fast where `ShufflesBytes`.
ZOR_FOR("avx2")
inline Block Moved(Block bytes, Block order) {
#ifdef __aarch64__
  return Block(vqtbl1q_u8(uint8x16_t(bytes), uint8x16_t(order)));
#elif defined(__x86_64__) || defined(__i386__)
  return Block(_mm_shuffle_epi8(__m128i(bytes), __m128i(order)));
#else
  return __builtin_shuffle(bytes, order) & Block(order < 128);
#endif
}

}

ZOR_FOR("avx2")
std::int32_t ShuffleRow(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                        std::int32_t intoStep, std::int32_t width) {
  const Block order = LoadBlock(shuffle.From), flip = LoadBlock(shuffle.Flip);
  const std::int32_t pixels = shuffle.Pixels, end = Starts(width, std::min(fromStep, intoStep), 16);
  std::int32_t x = 0;
  // What a shuffle leaves in the bytes behind its pixels, the next one or the plain loop overwrites.
#pragma GCC unroll 4
  for (; x < end; x += pixels) {
    StoreBlock(into, Moved(LoadBlock(from), order) ^ flip);
    from += pixels * fromStep;
    into += pixels * intoStep;
  }
  return x;
}

ZOR_FOR("avx2")
std::int32_t ShuffleInto(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                         std::int32_t intoStep, std::int32_t width) {
  const Block order = LoadBlock(shuffle.From), flip = LoadBlock(shuffle.Flip),
              write = LoadBlock(shuffle.Write);
  const std::int32_t pixels = shuffle.Pixels, end = Starts(width, std::min(fromStep, intoStep), 16);
  std::int32_t x = 0;
#pragma GCC unroll 4
  for (; x < end; x += pixels) {
    const Block moved = Moved(LoadBlock(from), order) ^ flip;
    StoreBlock(into, (moved & write) | (LoadBlock(into) & ~write));
    from += pixels * fromStep;
    into += pixels * intoStep;
  }
  return x;
}

// Luma is 77 r + 151 g + 28 b, divided by 256.

#ifdef __aarch64__

namespace {

template <int Step>
std::int32_t LumaOfSteps(const Sample* from, const std::int32_t (&places)[3], Sample* into,
                         std::int32_t width) {
  uint8x8_t weights[Step];
  for (uint8x8_t& weight : weights) weight = vdup_n_u8(0);
  constexpr std::uint8_t ofColours[3] = {77, 151, 28};
  for (int c = 0; c < 3; ++c) weights[places[c]] = vdup_n_u8(ofColours[c]);
  constexpr std::int32_t together = 16;
  std::int32_t x = 0;
  for (; x + together <= width; x += together, from += Step * together, into += together) {
    const auto pixels = [&] {
      if constexpr (Step == 3)
        return vld3q_u8(from);
      else
        return vld4q_u8(from);
    }();
    uint16x8_t low = vmull_u8(vget_low_u8(pixels.val[0]), weights[0]),
               high = vmull_u8(vget_high_u8(pixels.val[0]), weights[0]);
    for (int i = 1; i < Step; ++i) {
      low = vmlal_u8(low, vget_low_u8(pixels.val[i]), weights[i]);
      high = vmlal_u8(high, vget_high_u8(pixels.val[i]), weights[i]);
    }
    vst1q_u8(into, vcombine_u8(vshrn_n_u16(low, 8), vshrn_n_u16(high, 8)));
  }
  return x;
}

}

std::int32_t LumaRow(const Sample* from, std::int32_t step, const std::int32_t (&places)[3], Sample* into,
                     std::int32_t width) {
  return step == 3 ? LumaOfSteps<3>(from, places, into, width) : LumaOfSteps<4>(from, places, into, width);
}

#elif defined(__x86_64__) || defined(__i386__)

namespace {

/// The shuffle that lines up 4 pixels as red, green four times, then blue, green four times.
__m128i PairsOfFour(std::int32_t step, const std::int32_t (&places)[3]) {
  alignas(16) Sample order[16];
  for (int x = 0; x < 4; ++x) {
    order[2 * x] = Sample(x * step + places[0]);
    order[8 + 2 * x] = Sample(x * step + places[2]);
    order[2 * x + 1] = order[8 + 2 * x + 1] = Sample(x * step + places[1]);
  }
  return __m128i(LoadBlock(order));
}

/// For 8 pixels, in each half of the register: four times 77 red + 51 green, then 28 blue + 100 green. No sum
/// is larger than 128 * 255, so none saturates.
ZOR_FOR("avx2")
inline __m256i WeighedEight(const Sample* from, std::int32_t step, __m256i order, __m256i weights) {
  const __m256i pixels = _mm256_inserti128_si256(_mm256_castsi128_si256(__m128i(LoadBlock(from))),
                                                 __m128i(LoadBlock(from + 4 * step)), 1);
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

// The weight of green is split in two so that each fits a signed byte.
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

#else

std::int32_t LumaRow(const Sample*, std::int32_t, const std::int32_t (&)[3], Sample*, std::int32_t) {
  return 0;
}

#endif

}
