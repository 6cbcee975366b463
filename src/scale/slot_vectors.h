// Vectors of VectorBytes bytes for slot_loops_body.h.

#include <bit>
#include <cstring>
#include <limits>
#include <type_traits>

#if defined(__SSE2__) || VectorBytes > 16
// g++ 12 takes the undefined vectors of its own header for mistakes (its bug 105593).
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#pragma GCC diagnostic ignored "-Wuninitialized"
#include <immintrin.h>
#pragma GCC diagnostic pop
/// An instruction by its name without the width.
#if VectorBytes == 64
#define WIDE(name) _mm512_##name
#elif VectorBytes == 32
#define WIDE(name) _mm256_##name
#else
#define WIDE(name) _mm_##name
#endif
#endif

/// Before a loop over vectors that are so few that they stay in registers, which the compiler sees once the
/// loop is gone.
#define UNROLL _Pragma("GCC unroll 16")

namespace zor {
// Of each instruction set its own. NOLINTNEXTLINE(cert-dcl59-cpp,google-build-namespaces)
namespace {

constexpr int Width = VectorBytes, Parts = Width / 16;
using Bytes [[gnu::vector_size(Width)]] = std::uint8_t;
using Numbers [[gnu::vector_size(Width)]] = std::int16_t;
using Sums [[gnu::vector_size(Width)]] = std::int32_t;
/// A bit for each sample of a unit.
using Bits = std::conditional_t<(Width > 32), std::uint64_t, std::uint32_t>;

template <class Vector>
LOOP_INLINE Vector Load(const void* from) {
  Vector vector;
  std::memcpy(&vector, from, sizeof vector);
  return vector;
}
template <class Vector>
LOOP_INLINE void Store(void* into, const Vector& vector) {
  std::memcpy(into, &vector, sizeof vector);
}

#ifdef WIDE

#if VectorBytes == 64
using Register = __m512i;
#elif VectorBytes == 32
using Register = __m256i;
#else
using Register = __m128i;
#endif

// Parts of 16 bytes are interleaved each by itself.
LOOP_INLINE Bytes LowInterleaved(Bytes a, Bytes b) {
  return Bytes(WIDE(unpacklo_epi8)(Register(a), Register(b)));
}
LOOP_INLINE Bytes HighInterleaved(Bytes a, Bytes b) {
  return Bytes(WIDE(unpackhi_epi8)(Register(a), Register(b)));
}
LOOP_INLINE Numbers Saturated(Sums a, Sums b) { return Numbers(WIDE(packs_epi32)(Register(a), Register(b))); }
/// Numbers kept within 0 and 255.
LOOP_INLINE Bytes Packed(Numbers a, Numbers b) { return Bytes(WIDE(packus_epi16)(Register(a), Register(b))); }
/// A bit for each byte that differs.
LOOP_INLINE Bits Difference(Bytes a, Bytes b) {
#if VectorBytes == 64
  return _mm512_cmpneq_epi8_mask(Register(a), Register(b));
#elif VectorBytes == 32
  return ~Bits(_mm256_movemask_epi8(_mm256_cmpeq_epi8(Register(a), Register(b))));
#else
  return Bits(_mm_movemask_epi8(_mm_cmpeq_epi8(Register(a), Register(b)))) ^ 0xFFFF;
#endif
}

#else

LOOP_INLINE Bytes LowInterleaved(Bytes a, Bytes b) {
  return __builtin_shufflevector(a, b, 0, 16, 1, 17, 2, 18, 3, 19, 4, 20, 5, 21, 6, 22, 7, 23);
}
LOOP_INLINE Bytes HighInterleaved(Bytes a, Bytes b) {
  return __builtin_shufflevector(a, b, 8, 24, 9, 25, 10, 26, 11, 27, 12, 28, 13, 29, 14, 30, 15, 31);
}
LOOP_INLINE Numbers Saturated(Sums a, Sums b) {
#ifdef __ARM_NEON
  return Numbers(vcombine_s16(vqmovn_s32(int32x4_t(a)), vqmovn_s32(int32x4_t(b))));
#else
  Numbers all;
  for (int i = 0; i < 4; ++i) {
    all[i] = std::int16_t(a[i] < -32768 ? -32768 : a[i] > 32767 ? 32767 : a[i]);
    all[i + 4] = std::int16_t(b[i] < -32768 ? -32768 : b[i] > 32767 ? 32767 : b[i]);
  }
  return all;
#endif
}
LOOP_INLINE Bytes Packed(Numbers a, Numbers b) {
#ifdef __ARM_NEON
  return Bytes(vcombine_u8(vqmovun_s16(int16x8_t(a)), vqmovun_s16(int16x8_t(b))));
#else
  Bytes all;
  for (int k = 0; k < 8; ++k) {
    all[k] = Clamp(a[k]);
    all[k + 8] = Clamp(b[k]);
  }
  return all;
#endif
}
LOOP_INLINE Bits Difference(Bytes a, Bytes b) {
  using Words [[gnu::vector_size(Width)]] = std::uint64_t;
  const auto differ = Words(a != b);
  if ((differ[0] | differ[1]) == 0) return 0;
  Bits bits = 0;
  for (int i = 0; i < Width; ++i) bits |= Bits(a[i] != b[i]) << i;
  return bits;
}

#endif

/// Sums divided by 2^bits and rounded down.
LOOP_INLINE Sums Shifted(Sums sums, int bits) {
#if VectorBytes > 16
  // With a count for each number this is one step on all processors, with one for all it is two on some.
  return Sums(WIDE(srav_epi32)(Register(sums), WIDE(set1_epi32)(bits)));
#else
  return sums >> bits;
#endif
}

constexpr int UnitBytes = Width * SlotLoops::SampleBytes;

}
}
