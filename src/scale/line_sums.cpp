#include "scale/line_sums.h"

#include <algorithm>
#include <cstring>

#include "image/targets.h"
#include "scale/exact_passes.h"

namespace zor {
namespace {

// What every processor with vectors has.
constexpr int Lanes = 4, Vectors = 8, Block = Lanes * Vectors;
using Floats [[gnu::vector_size(Lanes * sizeof(float))]] = float;

/// What becomes of sums: cut off and clamped.
void StoreBytes(const Floats* sums, float added, Sample* into) {
  float values[Block];
  std::memcpy(values, sums, sizeof values);
  for (int i = 0; i < Block; ++i) {
    const float sum = values[i] + added, least = sum > 0.0F ? sum : 0.0F;
    into[i] = Sample(std::int32_t(least < 255.0F ? least : 255.0F));
  }
}

/// The samples of a line from i on, at most Block of them.
void SumBlock(const LineSums& sums, int line, std::ptrdiff_t i) {
  const auto [start, gap] = sums.Lines[line];
  Floats sum[Vectors];
  for (int k = 0; k < Vectors; ++k) sum[k] = Floats{} + start;
  for (std::int32_t row = 0; row < sums.RowCount; ++row) {
    const float share = sums.Shares[row * sums.LineCount + line];
    const auto* samples = reinterpret_cast<const Floats*>(sums.Rows[row] + i);
    for (int k = 0; k < Vectors; ++k) sum[k] += share * samples[k];
  }
  Sample lower[Block], upper[Block];
  StoreBytes(sum, 0.0F, lower);
  const std::ptrdiff_t count = std::min<std::ptrdiff_t>(Block, sums.Samples - i);
  if (gap > 0.0F) {
    StoreBytes(sum, gap, upper);
    if (std::memcmp(lower, upper, Block) != 0)
      for (std::ptrdiff_t at = 0; at < count; ++at)
        if (lower[at] != upper[at]) lower[at] = PlainSample(sums, line, i + at);
  }
  std::memcpy(sums.Into[line] + i, lower, std::size_t(count));
}

void SumLine(const LineSums& sums, int line) {
  for (std::ptrdiff_t i = 0; i < sums.Samples; i += Block) SumBlock(sums, line, i);
}

}

Sample PlainSample(const LineSums& sums, int line, std::ptrdiff_t at) {
  const Contribution& of = *sums.Of[line];
  double sum = 0.0;
  for (std::int32_t t = 0; t < of.Count; ++t)
    sum += double(of.Entries[t].Weight) * double(sums.Rows[of.PixelAt(t) - sums.FirstRow][at]);
  return ExactQuotient(sum, of.Sum);
}

void SumPlainLine(const LineSums& sums, int line) {
  const Contribution& of = *sums.Of[line];
  for (std::ptrdiff_t i = 0; i < sums.Samples; i += ExactTile) {
    ExactSums exact(int(std::min<std::ptrdiff_t>(ExactTile, sums.Samples - i)));
    for (std::int32_t t = 0; t < of.Count; ++t)
      exact.Add(sums.Rows[of.PixelAt(t) - sums.FirstRow] + i, of.Entries[t].Weight);
    exact.Store(of.Sum, sums.Into[line] + i);
  }
}

void SumLines(const LineSums& sums) {
  if (CurrentTarget >= Target::AVX512) return SumLinesAVX512(sums);
  if (CurrentTarget >= Target::AVX2) return SumLinesAVX2(sums);
  for (int line = 0; line < sums.LineCount; ++line) SumLine(sums, line);
}

}
