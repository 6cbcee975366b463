#include "filters/byte_tables.h"

#include "image/targets.h"

namespace zor {

ByteTables::ByteTables(const PlaneList& planes, const std::array<const SampleTable*, 5>& tables,
                       std::int32_t width)
    : Step(planes.Step) {
  const auto first = planes.Offset.begin(), end = first + planes.Count;
  const std::int32_t lowest = *std::min_element(first, end);
  Bytes = std::ptrdiff_t{width - 1} * Step + *std::max_element(first, end) - lowest + 1;
  At.fill(-1);
  for (int c = 0; c < planes.Count; ++c) {
    const int t = int(std::find(Table.begin(), Table.begin() + Count, tables[c]) - Table.begin());
    if (t == Count) Table[Count++] = tables[c];
    At[std::size_t(planes.Offset[c] - lowest)] = t;
  }
  for (int start = 0; start < Step; ++start)
    for (int i = 0; i < 64; ++i)
      if (const int t = At[std::size_t((start + i) % Step)]; t >= 0) {
        Mapped[start] |= std::uint64_t{1} << i;
        Of[start][t] |= std::uint64_t{1} << i;
      }
  Uniform = Count == 1 && planes.Count == Step;
}

std::ptrdiff_t MapBytes(const ByteTables& tables, const Sample* in, Sample* out) {
  const std::ptrdiff_t width = (tables.Bytes + tables.Step - 1) / tables.Step;
  if (CurrentTarget == Target::AVX512VBMI) return MapBytesVBMI(tables, in, out), width;
  std::ptrdiff_t i =
      CurrentTarget == Target::Plain ? MapBytesNEON(tables, in, out) : MapBytesAVX2(tables, in, out);
  if (!tables.Uniform) return i / tables.Step;
  const SampleTable& table = *tables.Table[0];
  // Eight look-ups before the first of them is written, so that none waits for a write.
  constexpr std::ptrdiff_t Many = 8;
  for (; i + Many <= tables.Bytes; i += Many) {
    Sample mapped[Many];
    for (std::ptrdiff_t k = 0; k < Many; ++k) mapped[k] = table[in[i + k]];
    for (std::ptrdiff_t k = 0; k < Many; ++k) out[i + k] = mapped[k];
  }
  for (; i < tables.Bytes; ++i) out[i] = table[in[i]];
  return width;
}

}
