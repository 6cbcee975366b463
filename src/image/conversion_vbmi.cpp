#include <algorithm>

#include "image/conversion.h"
#include "image/targets.h"

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>

#define ZOR_VBMI [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq,avx512vbmi")]]

namespace zor {
namespace {

/// The lowest `count` bits, 64 at most.
constexpr __mmask64 Lowest(std::int32_t count) {
  return count < 64 ? (__mmask64{1} << count) - 1 : ~__mmask64{0};
}

struct Registers {
  __m512i Order, Flip;
  __mmask64 Moved;
};

ZOR_VBMI inline __m512i Shuffled(const Registers& by, __m512i bytes) {
  return _mm512_xor_si512(_mm512_maskz_permutexvar_epi8(by.Moved, by.Order, bytes), by.Flip);
}

}

ZOR_VBMI
void ShuffleWide(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                 std::int32_t intoStep, std::int32_t width, bool whole) {
  const __m512i order = _mm512_load_si512(shuffle.From);
  const Registers by{order, _mm512_load_si512(shuffle.Flip), ~_mm512_movepi8_mask(order)};
  const std::int32_t pixels = shuffle.Pixels;
  const __mmask64 written =
      whole ? Lowest(pixels * intoStep) : _mm512_movepi8_mask(_mm512_load_si512(shuffle.Write));
  std::int32_t x = 0;
  if (whole)
    // What a shuffle leaves in the bytes behind its pixels, the next one overwrites.
    for (const std::int32_t end = width - 64 / std::min(fromStep, intoStep); x < end; x += pixels) {
      _mm512_storeu_si512(into + std::ptrdiff_t{x} * intoStep,
                          Shuffled(by, _mm512_loadu_si512(from + std::ptrdiff_t{x} * fromStep)));
    }
  for (; x < width; x += pixels) {
    const std::int32_t count = std::min(pixels, width - x);
    const __m512i bytes =
        _mm512_maskz_loadu_epi8(Lowest(count * fromStep), from + std::ptrdiff_t{x} * fromStep);
    _mm512_mask_storeu_epi8(into + std::ptrdiff_t{x} * intoStep, written & Lowest(count * intoStep),
                            Shuffled(by, bytes));
  }
}

}

#else

namespace zor {

void ShuffleWide(const ByteShuffle&, const Sample*, std::int32_t, Sample*, std::int32_t, std::int32_t, bool) {
}

}

#endif
