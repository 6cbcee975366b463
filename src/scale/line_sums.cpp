#include "scale/line_sums.h"

#include <algorithm>
#include <cstring>

#include "image/targets.h"
#include "scale/exact_passes.h"

namespace zor {
namespace {

// Four vectors of 16 lanes a block, whatever the instruction set.
constexpr int Lanes = 16, Vectors = 4, Block = Vectors * Lanes;
using Floats [[gnu::vector_size(Lanes * 4)]] = float;
using Integers [[gnu::vector_size(Lanes * 4)]] = std::int32_t;
using Bytes [[gnu::vector_size(Lanes)]] = Sample;

/// What becomes of sums: cut off and clamped.
inline void StoreBytes(const Floats& sums, Sample* into) {
  Integers whole = __builtin_convertvector(sums, Integers);
  whole = whole < 0 ? 0 : whole;
  whole = whole > 255 ? 255 : whole;
  const Bytes bytes = __builtin_convertvector(whole, Bytes);
  std::memcpy(into, &bytes, sizeof bytes);
}

void SumLine(const LineSums* sums, int line) {
  const auto [start, gap] = sums->Lines[line];
  for (std::ptrdiff_t i = 0; i < sums->Samples; i += Block) {
    Floats sum[Vectors];
    for (int k = 0; k < Vectors; ++k) sum[k] = Floats{} + start;
    for (std::int32_t row = 0; row < sums->RowCount; ++row) {
      const float share = sums->Shares[row * sums->LineCount + line];
      const auto* samples = reinterpret_cast<const Floats*>(sums->Rows[sums->FirstRow + row] + i);
      for (int k = 0; k < Vectors; ++k) sum[k] += share * samples[k];
    }
    Sample lower[Block], upper[Block];
    for (int k = 0; k < Vectors; ++k) StoreBytes(sum[k], lower + k * Lanes);
    const std::ptrdiff_t count = std::min<std::ptrdiff_t>(Block, sums->Samples - i);
    if (gap > 0.0F) {
      for (int k = 0; k < Vectors; ++k) StoreBytes(sum[k] + gap, upper + k * Lanes);
      if (std::memcmp(lower, upper, Block) != 0)
        for (std::ptrdiff_t at = 0; at < count; ++at)
          if (lower[at] != upper[at]) lower[at] = PlainSample(*sums->Of[line], sums->Rows, i + at);
    }
    std::memcpy(sums->Into[line] + i, lower, std::size_t(count));
  }
}

}

Sample PlainSample(const Contribution& line, const RowRing& rows, std::ptrdiff_t at) {
  double sum = 0.0;
  for (std::int32_t t = 0; t < line.Count; ++t)
    sum += double(line.Entries[t].Weight) * double(rows[line.Entries[t].Pixel][at]);
  return ExactQuotient(sum, line.Sum);
}

void SumLines(const LineSums& sums) {
  if (CurrentTarget >= Target::AVX512) return SumLinesAVX512(sums);
  for (int line = 0; line < sums.LineCount; ++line) OnBestTarget<SumLine>(&sums, line);
}

}
