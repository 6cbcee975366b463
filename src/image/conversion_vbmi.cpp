#include <algorithm>

#include "image/byte_blocks.h"
#include "image/conversion.h"

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
ZOR_VBMI inline __m512i Shuffled(__m512i order, __m512i bytes) {
  // With a mask, since the compiler warns of its own header's form without one.
  return _mm512_maskz_permutexvar_epi8(~__mmask64{0}, order, bytes);
}

/// A row in the making: `Width` pixels from From into Into are left.
struct Row {
  const Sample* From;
  std::int32_t FromStep;
  Sample* Into;
  std::int32_t IntoStep, Width;

  void Advance(std::int32_t pixels) {
    From += std::ptrdiff_t{pixels} * FromStep;
    Into += std::ptrdiff_t{pixels} * IntoStep;
    Width -= pixels;
  }
  /// The pixels to the first one that begins a cache line. 0 where none does, and in short rows.
  std::int32_t ToCacheLine() const {
    constexpr std::int32_t few = 128;
    for (std::int32_t x = 0; x < CacheLine && Width > few; ++x)
      if (InCacheLine(Into + std::ptrdiff_t{x} * IntoStep) == 0) return x;
    return 0;
  }
};

/// Some pixels at the left, in shuffles of which only the bytes in `written` are stored.
ZOR_VBMI inline void ShuffleSome(const Registers& by, std::int32_t pixels, __mmask64 written, Row& row,
                                 std::int32_t some) {
  while (some > 0) {
    const std::int32_t count = std::min(pixels, some);
    const __m512i bytes = _mm512_maskz_loadu_epi8(Lowest(count * row.FromStep), row.From);
    _mm512_mask_storeu_epi8(row.Into, written & Lowest(count * row.IntoStep), Shuffled(by, bytes));
    row.Advance(count);
    some -= count;
  }
}

/// Whether each byte becomes three alike.
bool IsTriple(const ByteShuffle& shuffle, const Row& row) {
  return row.FromStep == 1 && row.IntoStep == 3 &&
         std::all_of(shuffle.From, shuffle.From + 3, [](Sample from) { return from == 0; });
}

/// Each byte three times. A shuffle of whole pixels would leave one byte of its 64 empty, and so no store but
/// the first could be a cache line.
ZOR_VBMI void Triple(Row& row) {
  alignas(64) Sample places[3 * 64];
  for (int i = 0; i < 3 * 64; ++i) places[i] = Sample(i / 3);
  const __m512i first = _mm512_load_si512(places), second = _mm512_load_si512(places + 64),
                third = _mm512_load_si512(places + 128);
  for (; row.Width >= 64; row.Advance(64)) {
    const __m512i bytes = _mm512_loadu_si512(row.From);
    _mm512_storeu_si512(row.Into, Shuffled(first, bytes));
    _mm512_storeu_si512(row.Into + 64, Shuffled(second, bytes));
    _mm512_storeu_si512(row.Into + 128, Shuffled(third, bytes));
  }
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
  Row row{from, fromStep, into, intoStep, width};
  if (whole) {
    ShuffleSome(by, pixels, written, row, row.ToCacheLine());
    if (IsTriple(shuffle, row)) Triple(row);
    // What a shuffle leaves in the bytes behind its pixels, the next one overwrites.
    for (const std::int32_t most = 64 / std::min(fromStep, intoStep); row.Width > most; row.Advance(pixels))
      _mm512_storeu_si512(row.Into, Shuffled(by, _mm512_loadu_si512(row.From)));
  }
  ShuffleSome(by, pixels, written, row, row.Width);
}

}

#else

namespace zor {

void ShuffleWide(const ByteShuffle&, const Sample*, std::int32_t, Sample*, std::int32_t, std::int32_t, bool) {
}

}

#endif
