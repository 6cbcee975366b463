#include "image/byte_blocks.h"
#include "image/conversion.h"

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace zor {

#ifdef __SSE2__

namespace {

// Pixels as words of four bytes, four at a time, which needs no shuffles.

constexpr int QuadBytes = 4, Together = 4;

/// Four pixels of one byte, four times each; or of three or four, the first three or all of each.
template <int Step>
__m128i ReadFour(const Sample* from) {
  if constexpr (Step == 1) {
    std::int32_t bytes;
    std::memcpy(&bytes, from, sizeof bytes);
    const __m128i gray = _mm_cvtsi32_si128(bytes), twice = _mm_unpacklo_epi8(gray, gray);
    return _mm_unpacklo_epi16(twice, twice);
  }
  const auto bytes = __m128i(LoadBlock(from));
  if constexpr (Step == QuadBytes) return bytes;
  const __m128i low = _mm_unpacklo_epi32(bytes, _mm_srli_si128(bytes, 3)),
                high = _mm_unpacklo_epi32(_mm_srli_si128(bytes, 6), _mm_srli_si128(bytes, 9));
  return _mm_unpacklo_epi64(low, high);
}

/// The first three or all bytes of each; of the 16 bytes that are written those behind hold nothing.
template <int Step>
void WriteFour(Sample* into, __m128i quads) {
  if constexpr (Step == 3) {
    const __m128i even = _mm_and_si128(quads, _mm_set_epi32(0, 0xFFFFFF, 0, 0xFFFFFF)),
                  odd = _mm_and_si128(_mm_srli_epi64(quads, 8),
                                      _mm_set_epi32(0xFFFF, -0x1000000, 0xFFFF, -0x1000000));
    const __m128i sixes = _mm_or_si128(even, odd);
    quads = _mm_or_si128(_mm_move_epi64(sixes), _mm_slli_si128(_mm_srli_si128(sixes, 8), 6));
  }
  StoreBlock(into, Block(quads));
}

/// The bytes of each the other way round.
__m128i Reversed(__m128i quads) {
  const __m128i swapped = _mm_or_si128(_mm_slli_epi16(quads, 8), _mm_srli_epi16(quads, 8));
  constexpr int otherHalf = _MM_SHUFFLE(2, 3, 0, 1);
  return _mm_shufflehi_epi16(_mm_shufflelo_epi16(swapped, otherHalf), otherHalf);
}

/// A shuffle of four bytes as a turn: byte b goes to byte (b + Bytes) % 4, of all of them the other way round
/// if IsReversed.
struct QuadTurn {
  bool IsReversed = false;
  int Bytes = 0;

  bool Is(const ByteShuffle& shuffle) const {
    for (int b = 0; b < QuadBytes; ++b) {
      const int from = shuffle.From[b];
      if (from < 128 && ((IsReversed ? QuadBytes - 1 - from : from) + Bytes) % QuadBytes != b) return false;
    }
    return true;
  }
};

/// The turn that a shuffle is; of Bytes 4 where it is none.
QuadTurn TurnOf(const ByteShuffle& shuffle) {
  QuadTurn turn;
  for (; turn.Bytes < QuadBytes; ++turn.Bytes)
    for (const bool reversed : {false, true}) {
      turn.IsReversed = reversed;
      if (turn.Is(shuffle)) return turn;
    }
  return turn;
}

__m128i FourTimes(const Sample (&quad)[QuadBytes]) {
  std::int32_t word;
  std::memcpy(&word, quad, sizeof word);
  return _mm_set1_epi32(word);
}

/// Rows whose pixels are turned.
struct TurnedQuads {
  const ByteShuffle& Shuffle;
  QuadTurn Turn;
  const Sample* From;
  Sample* Into;
  std::int32_t Width;

  template <int FromStep, int IntoStep, bool IsReversed, bool Whole>
  std::int32_t Run() const {
    Sample takes[QuadBytes], writes[QuadBytes], flips[QuadBytes];
    for (int b = 0; b < QuadBytes; ++b) {
      takes[b] = Shuffle.From[b] < 128 ? 255 : 0;
      writes[b] = Shuffle.Write[b];
      flips[b] = Shuffle.Flip[b];
    }
    const __m128i taken = FourTimes(takes), written = FourTimes(writes), flip = FourTimes(flips),
                  up = _mm_cvtsi32_si128(Turn.Bytes * 8), down = _mm_cvtsi32_si128(32 - Turn.Bytes * 8);
    const std::int32_t end =
        Starts(Width, FromStep == 3 || IntoStep == 3 ? 3 : QuadBytes, Together * QuadBytes);
    const Sample* from = From;
    Sample* into = Into;
    std::int32_t x = 0;
    for (; x < end; x += Together, from += Together * FromStep, into += Together * IntoStep) {
      __m128i quads = ReadFour<FromStep>(from);
      if constexpr (IsReversed) quads = Reversed(quads);
      if constexpr (FromStep > 1) quads = _mm_or_si128(_mm_sll_epi32(quads, up), _mm_srl_epi32(quads, down));
      quads = _mm_xor_si128(_mm_and_si128(quads, taken), flip);
      if constexpr (!Whole) quads = _mm_or_si128(quads, _mm_andnot_si128(written, __m128i(LoadBlock(into))));
      WriteFour<IntoStep>(into, quads);
    }
    return x;
  }
  template <int FromStep, int IntoStep, bool Whole>
  std::int32_t RunEither() const {
    return FromStep > 1 && Turn.IsReversed ? Run<FromStep, IntoStep, true, Whole>()
                                           : Run<FromStep, IntoStep, false, Whole>();
  }
  template <int FromStep>
  std::int32_t RunInto(std::int32_t intoStep, bool whole) const {
    // What isn't written whole must not be read behind a store.
    if (intoStep == 3) return whole ? RunEither<FromStep, 3, true>() : 0;
    return whole ? RunEither<FromStep, QuadBytes, true>() : RunEither<FromStep, QuadBytes, false>();
  }
};

template <int Step>
std::int32_t LumaOfSteps(const Sample* from, const std::int32_t (&places)[3], Sample* into,
                         std::int32_t width) {
  constexpr std::int16_t ofColours[3] = {77, 151, 28};
  std::int16_t weights[QuadBytes] = {};
  for (int c = 0; c < 3; ++c) weights[places[c]] = ofColours[c];
  const __m128i even = _mm_set1_epi32(weights[0] | weights[2] << 16),
                odd = _mm_set1_epi32(weights[1] | weights[3] << 16), low = _mm_set1_epi16(0xFF);
  const auto luma = [&](const Sample* four) {
    const __m128i pixels = ReadFour<Step>(four);
    const __m128i sums = _mm_add_epi32(_mm_madd_epi16(_mm_and_si128(pixels, low), even),
                                       _mm_madd_epi16(_mm_srli_epi16(pixels, 8), odd));
    return _mm_srli_epi32(sums, 8);
  };
  constexpr std::int32_t together = 16;
  const std::int32_t end = Starts(width, Step, 12 * Step + together);
  std::int32_t x = 0;
  for (; x < end; x += together, from += together * Step, into += together) {
    const __m128i first = _mm_packs_epi32(luma(from), luma(from + 4 * Step)),
                  last = _mm_packs_epi32(luma(from + 8 * Step), luma(from + 12 * Step));
    StoreBlock(into, Block(_mm_packus_epi16(first, last)));
  }
  return x;
}

}

std::int32_t ShuffleQuads(const ByteShuffle& shuffle, const Sample* from, std::int32_t fromStep, Sample* into,
                          std::int32_t intoStep, std::int32_t width, bool whole) {
  // One byte goes to wherever it has to.
  const QuadTurn turn = fromStep == 1 ? QuadTurn{} : TurnOf(shuffle);
  if (turn.Bytes == QuadBytes || intoStep < 3 || intoStep > QuadBytes) return 0;
  const TurnedQuads rows{shuffle, turn, from, into, width};
  switch (fromStep) {
    case 1: return rows.RunInto<1>(intoStep, whole);
    case 3: return rows.RunInto<3>(intoStep, whole);
    case 4: return rows.RunInto<4>(intoStep, whole);
    default: return 0;
  }
}

std::int32_t LumaOfQuads(const Sample* from, std::int32_t step, const std::int32_t (&places)[3], Sample* into,
                         std::int32_t width) {
  return step == 3 ? LumaOfSteps<3>(from, places, into, width) : LumaOfSteps<4>(from, places, into, width);
}

#else

std::int32_t ShuffleQuads(const ByteShuffle&, const Sample*, std::int32_t, Sample*, std::int32_t,
                          std::int32_t, bool) {
  return 0;
}

std::int32_t LumaOfQuads(const Sample*, std::int32_t, const std::int32_t (&)[3], Sample*, std::int32_t) {
  return 0;
}

#endif

}
