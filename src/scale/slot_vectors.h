// Vectors of VectorBytes bytes for slot_loops_body.h.

#include <cstring>
#include <limits>

namespace zor {
namespace {

constexpr int Width = VectorBytes, Parts = Width / 16;
using Bytes [[gnu::vector_size(Width)]] = std::uint8_t;
using Numbers [[gnu::vector_size(Width)]] = std::int16_t;
using Sums [[gnu::vector_size(Width)]] = std::int32_t;

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

// Parts of 16 bytes are interleaved each by itself.
LOOP_INLINE Bytes LowInterleaved(Bytes a, Bytes b) {
#if VectorBytes == 32
  return __builtin_shufflevector(a, b, 0, 32, 1, 33, 2, 34, 3, 35, 4, 36, 5, 37, 6, 38, 7, 39, 16, 48, 17, 49,
                                 18, 50, 19, 51, 20, 52, 21, 53, 22, 54, 23, 55);
#else
  return __builtin_shufflevector(a, b, 0, 16, 1, 17, 2, 18, 3, 19, 4, 20, 5, 21, 6, 22, 7, 23);
#endif
}
LOOP_INLINE Bytes HighInterleaved(Bytes a, Bytes b) {
#if VectorBytes == 32
  return __builtin_shufflevector(a, b, 8, 40, 9, 41, 10, 42, 11, 43, 12, 44, 13, 45, 14, 46, 15, 47, 24, 56,
                                 25, 57, 26, 58, 27, 59, 28, 60, 29, 61, 30, 62, 31, 63);
#else
  return __builtin_shufflevector(a, b, 8, 24, 9, 25, 10, 26, 11, 27, 12, 28, 13, 29, 14, 30, 15, 31);
#endif
}

#if defined(__SSE2__) || VectorBytes == 32

LOOP_INLINE Numbers Saturated(Sums a, Sums b) {
#if VectorBytes == 32
  return __builtin_ia32_packssdw256(a, b);
#else
  return __builtin_ia32_packssdw128(a, b);
#endif
}
/// Numbers that fit, as bytes with a sign.
LOOP_INLINE Bytes Packed(Numbers a, Numbers b) {
#if VectorBytes == 32
  return Bytes(__builtin_ia32_packsswb256(a, b));
#else
  return Bytes(__builtin_ia32_packsswb128(a, b));
#endif
}
LOOP_INLINE Numbers Less(Numbers a, Numbers b) {
#if VectorBytes == 32
  return __builtin_ia32_psubsw256(a, b);
#else
  return __builtin_ia32_psubsw128(a, b);
#endif
}
/// A bit for each byte that differs.
LOOP_INLINE std::uint32_t Difference(Bytes a, Bytes b) {
  using Chars [[gnu::vector_size(Width)]] = char;
#if VectorBytes == 32
  return ~std::uint32_t(__builtin_ia32_pmovmskb256(Chars(a == b)));
#else
  return ~std::uint32_t(__builtin_ia32_pmovmskb128(Chars(a == b))) & 0xFFFF;
#endif
}

#else

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
  using HalfChars [[gnu::vector_size(8)]] = std::int8_t;
  const HalfChars halves[] = {__builtin_convertvector(a, HalfChars), __builtin_convertvector(b, HalfChars)};
  return Load<Bytes>(halves);
}
LOOP_INLINE Numbers Less(Numbers a, Numbers b) {
#ifdef __ARM_NEON
  return Numbers(vqsubq_s16(int16x8_t(a), int16x8_t(b)));
#else
  // What is taken away is no more than what a byte holds.
  const Numbers least = b + std::numeric_limits<std::int16_t>::min();
  return (a < least ? least : a) - b;
#endif
}
LOOP_INLINE std::uint32_t Difference(Bytes a, Bytes b) {
  using Words [[gnu::vector_size(Width)]] = std::uint64_t;
  const auto differ = Words(a != b);
  if ((differ[0] | differ[1]) == 0) return 0;
  std::uint32_t bits = 0;
  for (int i = 0; i < Width; ++i) bits |= std::uint32_t(a[i] != b[i]) << i;
  return bits;
}

#endif

constexpr int UnitBytes = Width * SlotLoops::SampleBytes;

}
}
