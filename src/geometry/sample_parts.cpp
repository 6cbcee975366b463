#include "geometry/sample_parts.h"

#include "image/targets.h"

namespace zor {
namespace {

void FillParts(double part, Sample* table) {
  for (int sample = 0; sample < 256; ++sample) table[sample] = Sample(int(part * sample));
}

void CountDifferences(const Sample* table, Multiplier multiplier, int* differences) {
  int count = 0;
  for (int sample = 0; sample < 256; ++sample)
    count += Sample(multiplier(std::uint16_t(sample))) != table[sample] ? 1 : 0;
  *differences = count;
}

}

SampleTable PartsOf(double part) {
  SampleTable table;
  OnBestTarget<FillParts>(part, table.data());
  return table;
}

bool FindMultiplier(double part, const SampleTable& table, Multiplier& multiplier) {
  const std::int32_t below = Truncate(part * 65536);
  for (const std::int32_t candidate : {below, below + 1}) {
    if (candidate > 65535) continue;
    multiplier = {std::uint16_t(candidate / 256), std::uint16_t(candidate % 256)};
    int differences = 256;
    OnBestTarget<CountDifferences>(table.data(), multiplier, &differences);
    if (differences == 0) return true;
  }
  return false;
}

}
