#pragma once
#include <cstring>
#include <utility>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

#include "image/picture_data.h"
#include "image/targets.h"

namespace zor {

// Pixels that change places go through vectors of 16 bytes, written with the compiler's own shuffles, which
// every machine has. Some take many instructions where a processor can't shuffle bytes freely.

using Block = Sample __attribute__((vector_size(16)));
constexpr std::ptrdiff_t BlockBytes = 16;
/// The same as four lanes.
using Quads = std::uint32_t __attribute__((vector_size(16)));

inline Block LoadBlock(const Sample* from) {
  Block block;
  std::memcpy(&block, from, BlockBytes);
  return block;
}
inline void StoreBlock(Sample* into, Block block) { std::memcpy(into, &block, BlockBytes); }

constexpr std::ptrdiff_t CacheLine = 64;
/// How far an address is behind the start of its cache line.
inline std::ptrdiff_t InCacheLine(const Sample* at) {
  return std::ptrdiff_t(reinterpret_cast<Word>(at) % CacheLine);
}

/// Asks for the cache line of an address, which may be anywhere.
inline void Prefetch(const Sample* from, std::ptrdiff_t ahead) {
  __builtin_prefetch(reinterpret_cast<const void*>(reinterpret_cast<Word>(from) + Word(ahead)));
}

/// Stores a block past the caches where the machine can, so that a line isn't read before it is written. All
/// blocks of a cache line in a row, from its start on; and `EndStream` after the last one.
inline void StreamBlock(Sample* into, Block block) {
#ifdef __SSE2__
  _mm_stream_si128(reinterpret_cast<__m128i*>(into), __m128i(block));
#else
  StoreBlock(into, block);
#endif
}
/// A result of so many bytes leaves no room in the caches for itself and its source: it is streamed.
constexpr std::ptrdiff_t Streamed = 8 << 20;
/// Lets other threads see what was streamed.
inline void EndStream() {
#ifdef __SSE2__
  _mm_sfence();
#endif
}

/// Element j of the result is element Pick(j) of a and b in a row.
template <auto Pick, class Vector>
Vector Shuffled(Vector a, Vector b) {
  return [&]<std::size_t... J>(std::index_sequence<J...>) {
    return __builtin_shufflevector(a, b, Pick(int(J))...);
  }
  (std::make_index_sequence<sizeof(Vector) / sizeof(a[0])>{});
}

/// Of two vectors, the elements of the low or the high halves by turns.
template <int Side, int Half>
constexpr int Interleaved(int j) {
  return j % 2 * Side + Half * Side / 2 + j / 2;
}

/// Transposes a square. A stage interleaves the rows of the first half with those of the second.
template <class Vector, int Side>
void TransposeSquare(Vector (&rows)[Side]) {
  for (int stage = 1; stage < Side; stage *= 2) {
    Vector mixed[Side];
    for (int i = 0; i < Side / 2; ++i) {
      mixed[2 * i] = Shuffled<Interleaved<Side, 0>>(rows[i], rows[i + Side / 2]);
      mixed[2 * i + 1] = Shuffled<Interleaved<Side, 1>>(rows[i], rows[i + Side / 2]);
    }
    // One by one, so that they stay in registers.
    for (int i = 0; i < Side; ++i) rows[i] = mixed[i];
  }
}

/// Whether bytes are shuffled in one instruction.
inline bool ShufflesBytes() {
#ifdef __aarch64__
  return true;
#else
  return CurrentTarget != Target::Plain;
#endif
}

}
