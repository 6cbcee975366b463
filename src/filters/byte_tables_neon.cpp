#include "filters/byte_tables.h"

#ifdef __aarch64__
#include <arm_neon.h>

// One instruction looks 16 bytes up in a quarter of a table; where a byte isn't there, another leaves the
// sample as it is. Pixels are taken apart and put together by what loads and stores them.

namespace zor {
namespace {

struct Quarters {
  uint8x16x4_t Of[4];
};

void LoadQuarters(const SampleTable& table, Quarters& quarters) {
  for (int i = 0; i < 4; ++i) quarters.Of[i] = vld1q_u8_x4(table.data() + 64 * i);
}

inline uint8x16_t LookedUp(const Quarters& table, uint8x16_t bytes) {
  uint8x16_t found = vqtbl4q_u8(table.Of[0], bytes);
  for (int i = 1; i < 4; ++i)
    found = vqtbx4q_u8(found, table.Of[i], veorq_u8(bytes, vdupq_n_u8(std::uint8_t(64 * i))));
  return found;
}

template <int Step>
auto LoadPixels(const Sample* from) {
  if constexpr (Step == 3)
    return vld3q_u8(from);
  else
    return vld4q_u8(from);
}
void StorePixels(Sample* into, const uint8x16x3_t& pixels) { vst3q_u8(into, pixels); }
void StorePixels(Sample* into, const uint8x16x4_t& pixels) { vst4q_u8(into, pixels); }

/// Pixels of 3 or 4 bytes, each byte through the table of its place.
template <int Step>
std::ptrdiff_t MapPixels(const ByteTables& tables, const Sample* in, Sample* out) {
  Quarters quarters[4];
  for (int t = 0; t < tables.Count; ++t) LoadQuarters(*tables.Table[std::size_t(t)], quarters[t]);
  constexpr std::ptrdiff_t together = 16 * Step;
  std::ptrdiff_t i = 0;
  for (; i + together <= tables.Bytes; i += together) {
    const auto pixels = LoadPixels<Step>(in + i);
    auto made = LoadPixels<Step>(out + i);
    for (int c = 0; c < Step; ++c)
      if (const int t = tables.At[std::size_t(c)]; t >= 0) made.val[c] = LookedUp(quarters[t], pixels.val[c]);
    StorePixels(out + i, made);
  }
  return i;
}

}

std::ptrdiff_t MapBytesNEON(const ByteTables& tables, const Sample* in, Sample* out) {
  if (!tables.Uniform)
    return tables.Step == 3   ? MapPixels<3>(tables, in, out)
           : tables.Step == 4 ? MapPixels<4>(tables, in, out)
                              : 0;
  Quarters table;
  LoadQuarters(*tables.Table[0], table);
  constexpr std::ptrdiff_t together = 16;
  std::ptrdiff_t i = 0;
  for (; i + together <= tables.Bytes; i += together) vst1q_u8(out + i, LookedUp(table, vld1q_u8(in + i)));
  return i;
}

}

#else
namespace zor {

std::ptrdiff_t MapBytesNEON(const ByteTables&, const Sample*, Sample*) { return 0; }

}
#endif
