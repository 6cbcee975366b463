#include "filters/byte_tables.h"

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>

// A table of 256 bytes is four registers. One instruction looks 64 bytes up in two of them by their low seven
// bits; the two answers are blended by the top bit. Each byte of a row has the table that its place in the
// pixel says, so the masks that choose between the tables repeat after as many vectors as a pixel has bytes.

#define ZOR_VBMI [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq,avx512vbmi")]]

namespace zor {
namespace {

struct Registers {
  __m512i Part[4];
};

ZOR_VBMI inline Registers Loaded(const SampleTable& table) {
  Registers registers;
  for (int i = 0; i < 4; ++i) registers.Part[i] = _mm512_loadu_si512(table.data() + 64 * i);
  return registers;
}

ZOR_VBMI inline __m512i LookedUp(const Registers& table, __m512i bytes) {
  return _mm512_mask_blend_epi8(_mm512_movepi8_mask(bytes),
                                _mm512_permutex2var_epi8(table.Part[0], bytes, table.Part[1]),
                                _mm512_permutex2var_epi8(table.Part[2], bytes, table.Part[3]));
}

/// The first `bytes` of a vector.
__mmask64 First(std::ptrdiff_t bytes) { return ~__mmask64{0} >> (64 - bytes); }

template <int Count>
ZOR_VBMI void MapRow(const ByteTables& tables, const Sample* in, Sample* out) {
  Registers table[Count];
  for (int t = 0; t < Count; ++t) table[t] = Loaded(*tables.Table[t]);
  int start = 0;
  for (std::ptrdiff_t i = 0; i < tables.Bytes; i += 64) {
    const __mmask64 inRow = First(std::min<std::ptrdiff_t>(64, tables.Bytes - i));
    const __m512i bytes = _mm512_maskz_loadu_epi8(inRow, in + i);
    __m512i mapped = LookedUp(table[0], bytes);
    for (int t = 1; t < Count; ++t)
      mapped = _mm512_mask_mov_epi8(mapped, tables.Of[start][t], LookedUp(table[t], bytes));
    _mm512_mask_storeu_epi8(out + i, inRow & tables.Mapped[start], mapped);
    start += 64 % tables.Step;
    if (start >= tables.Step) start -= tables.Step;
  }
}

/// Every byte of the row through one table.
ZOR_VBMI void MapAll(const SampleTable& only, std::ptrdiff_t bytes, const Sample* in, Sample* out) {
  const Registers table = Loaded(only);
  std::ptrdiff_t i = 0;
  for (; i + 64 <= bytes; i += 64) _mm512_storeu_si512(out + i, LookedUp(table, _mm512_loadu_si512(in + i)));
  if (i == bytes) return;
  const __mmask64 rest = First(bytes - i);
  _mm512_mask_storeu_epi8(out + i, rest, LookedUp(table, _mm512_maskz_loadu_epi8(rest, in + i)));
}

}

void MapBytesVBMI(const ByteTables& tables, const Sample* in, Sample* out) {
  if (tables.Uniform) return MapAll(*tables.Table[0], tables.Bytes, in, out);
  switch (tables.Count) {
    case 1: return MapRow<1>(tables, in, out);
    case 2: return MapRow<2>(tables, in, out);
    case 3: return MapRow<3>(tables, in, out);
    case 4: return MapRow<4>(tables, in, out);
  }
}

}

#else
namespace zor {

void MapBytesVBMI(const ByteTables&, const Sample*, Sample*) {}

}
#endif
