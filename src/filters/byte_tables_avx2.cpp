#include <algorithm>

#include "filters/byte_tables.h"

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>

// A table of 256 bytes is 16 parts, and one instruction looks 32 bytes up in a part by their low four bits.
// The upper four choose among the answers: two of neighbouring parts come as the first and, where bit 4 is
// set, its difference from the second; the rest is a tree of blends. Where the bytes of a pixel have several
// tables, 32 pixels are sorted by planes first, and their bytes brought back into order afterwards.

#define ZOR_AVX2 [[gnu::target("avx2"), gnu::always_inline]]

namespace zor {
namespace {

/// The parts of a table in both halves of a vector: the even ones, and how the odd ones differ from them.
struct Parts {
  __m256i Even[8], ToOdd[8];
};

const __m128i* At(const Sample* bytes) { return reinterpret_cast<const __m128i*>(bytes); }
__m128i* At(Sample* bytes) { return reinterpret_cast<__m128i*>(bytes); }

ZOR_AVX2 inline __m256i Part(const SampleTable& table, int i) {
  return _mm256_broadcastsi128_si256(_mm_loadu_si128(At(table.data() + 16 * i)));
}
ZOR_AVX2 inline void LoadParts(const SampleTable& table, Parts& parts) {
  for (int i = 0; i < 8; ++i) {
    parts.Even[i] = Part(table, 2 * i);
    parts.ToOdd[i] = _mm256_xor_si256(parts.Even[i], Part(table, 2 * i + 1));
  }
}

/// Bytes as indices: a look-up gives 0 where the top bit of one is set. Bits 5 to 7 stand at the top too.
struct Indices {
  __m256i Even, Odd, Bit5, Bit6, Bit7;
};

ZOR_AVX2 inline __m256i InTwo(const Parts& table, int i, const Indices& at) {
  return _mm256_xor_si256(_mm256_shuffle_epi8(table.Even[i], at.Even),
                          _mm256_shuffle_epi8(table.ToOdd[i], at.Odd));
}
ZOR_AVX2 inline __m256i InFour(const Parts& table, int i, const Indices& at) {
  return _mm256_blendv_epi8(InTwo(table, i, at), InTwo(table, i + 1, at), at.Bit5);
}
ZOR_AVX2 inline __m256i InEight(const Parts& table, int i, const Indices& at) {
  return _mm256_blendv_epi8(InFour(table, i, at), InFour(table, i + 2, at), at.Bit6);
}
ZOR_AVX2 inline __m256i LookedUp(const Parts& table, __m256i bytes) {
  const __m256i top = _mm256_set1_epi8(char(128)), even = _mm256_andnot_si256(top, bytes),
                odd = _mm256_or_si256(even, _mm256_andnot_si256(_mm256_slli_epi16(bytes, 3), top));
  const Indices at{even, odd, _mm256_slli_epi16(bytes, 2), _mm256_slli_epi16(bytes, 1), bytes};
  return _mm256_blendv_epi8(InEight(table, 0, at), InEight(table, 4, at), at.Bit7);
}

ZOR_AVX2 inline __m256i Load(const Sample* from) {
  return _mm256_loadu_si256(reinterpret_cast<const __m256i*>(from));
}
ZOR_AVX2 inline void Store(Sample* into, __m256i bytes) {
  _mm256_storeu_si256(reinterpret_cast<__m256i*>(into), bytes);
}

/// Every byte through one table. Gives how many are done.
[[gnu::target("avx2")]] std::ptrdiff_t MapAll(const ByteTables& tables, const Sample* in, Sample* out) {
  Parts table;
  LoadParts(*tables.Table[0], table);
  std::ptrdiff_t i = 0;
  for (; i + 32 <= tables.Bytes; i += 32) Store(out + i, LookedUp(table, Load(in + i)));
  return i;
}

/// Dword c of the result is place c of four pixels.
template <int Step>
ZOR_AVX2 inline __m256i ByPlaces(__m256i pixels) {
  const __m128i order = Step == 4 ? _mm_setr_epi8(0, 4, 8, 12, 1, 5, 9, 13, 2, 6, 10, 14, 3, 7, 11, 15)
                                  : _mm_setr_epi8(0, 3, 6, 9, 1, 4, 7, 10, 2, 5, 8, 11, 12, 13, 14, 15);
  return _mm256_shuffle_epi8(pixels, _mm256_broadcastsi128_si256(order));
}
template <int Step>
ZOR_AVX2 inline __m256i ByPixels(__m256i places) {
  const __m128i order = Step == 4 ? _mm_setr_epi8(0, 4, 8, 12, 1, 5, 9, 13, 2, 6, 10, 14, 3, 7, 11, 15)
                                  : _mm_setr_epi8(0, 4, 8, 1, 5, 9, 2, 6, 10, 3, 7, 11, 12, 13, 14, 15);
  return _mm256_shuffle_epi8(places, _mm256_broadcastsi128_si256(order));
}

/// Of 4 x 4 dwords in either half.
ZOR_AVX2 inline void Transpose(__m256i (&rows)[4]) {
  const __m256i a = _mm256_unpacklo_epi32(rows[0], rows[1]), b = _mm256_unpacklo_epi32(rows[2], rows[3]),
                c = _mm256_unpackhi_epi32(rows[0], rows[1]), d = _mm256_unpackhi_epi32(rows[2], rows[3]);
  rows[0] = _mm256_unpacklo_epi64(a, b);
  rows[1] = _mm256_unpackhi_epi64(a, b);
  rows[2] = _mm256_unpacklo_epi64(c, d);
  rows[3] = _mm256_unpackhi_epi64(c, d);
}

/// Eight pixels, four in either half.
template <int Step>
ZOR_AVX2 inline __m256i LoadPixels(const Sample* from) {
  if constexpr (Step == 4) return Load(from);
  return _mm256_loadu2_m128i(At(from + 4 * Step), At(from));
}
template <int Step>
ZOR_AVX2 inline void StorePixels(Sample* into, __m256i pixels) {
  if constexpr (Step == 4) return Store(into, pixels);
  _mm256_storeu2_m128i(At(into + 4 * Step), At(into), pixels);
}

/// Pixels of 3 or 4 bytes, each byte through the table of its place. What is written behind pixels of 3 bytes
/// is what was read there, and so right in place; elsewhere the next pixels come over it, or it stays as it
/// was. Gives how many bytes are done.
template <int Step>
[[gnu::target("avx2")]] std::ptrdiff_t MapPixels(const ByteTables& tables, const Sample* in, Sample* out) {
  constexpr int eight = 8 * Step, vectors = 4, behind = 16 - 4 * Step;
  Parts parts[4];
  for (int t = 0; t < tables.Count; ++t) LoadParts(*tables.Table[t], parts[t]);
  alignas(32) Sample written[32];
  for (int b = 0; b < 32; ++b) written[b] = b % 16 < 4 * Step && tables.At[b % 16 % Step] >= 0 ? 255 : 0;
  const __m256i mask = Load(written);
  const bool whole = std::all_of(tables.At.begin(), tables.At.begin() + Step, [](int t) { return t >= 0; });
  std::ptrdiff_t i = 0;
  for (; i + vectors * eight + behind <= tables.Bytes; i += vectors * eight) {
    __m256i rows[vectors];
    for (int v = 0; v < vectors; ++v) rows[v] = ByPlaces<Step>(LoadPixels<Step>(in + i + v * eight));
    Transpose(rows);
    for (int c = 0; c < Step; ++c)
      if (tables.At[std::size_t(c)] >= 0) rows[c] = LookedUp(parts[tables.At[std::size_t(c)]], rows[c]);
    Transpose(rows);
    for (int v = 0; v < vectors; ++v) {
      rows[v] = ByPixels<Step>(rows[v]);
      if (!whole) rows[v] = _mm256_blendv_epi8(LoadPixels<Step>(out + i + v * eight), rows[v], mask);
    }
    for (int v = 0; v < vectors; ++v) StorePixels<Step>(out + i + v * eight, rows[v]);
  }
  return i;
}

}

std::ptrdiff_t MapBytesAVX2(const ByteTables& tables, const Sample* in, Sample* out) {
  if (tables.Uniform) return MapAll(tables, in, out);
  if (tables.Step == 3) return MapPixels<3>(tables, in, out);
  if (tables.Step == 4) return MapPixels<4>(tables, in, out);
  return 0;
}

}

#else
namespace zor {

std::ptrdiff_t MapBytesAVX2(const ByteTables&, const Sample*, Sample*) { return 0; }

}
#endif
