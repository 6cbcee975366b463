#include "scale/contributions.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdlib>

#include "image/arithmetic.h"

namespace zor {
namespace {

/// Kernel values that have been asked for, by distance. Scaling by a simple ratio asks for a few distances
/// over and over, and a sine costs more than all that is done with it.
class KnownValues {
 public:
  explicit KnownValues(ScaleKernel kernel) : Kernel(kernel) {
    for (Known& known : Values) known.Distance = -1.0;
  }
  bool At(double a, double& value) {
    // Distances of one ratio differ in high bits or in low ones.
    const std::uint64_t bits = std::bit_cast<std::uint64_t>(a) * 0x9E3779B97F4A7C15U;
    Known& known = Values[bits >> (64 - SizeBits)];
    if (known.Distance != a) {
      known.Distance = a;
      known.Value = 0.0;
      known.InReach = KernelValue(Kernel, a, known.Value);
    }
    value = known.Value;
    return known.InReach;
  }

 private:
  struct Known {
    double Distance, Value;
    bool InReach;
  };
  ScaleKernel Kernel;
  static constexpr int SizeBits = 10;
  Known Values[1 << SizeBits];
};

struct Axis {
  std::int32_t SourceCount;
  double Scale, Width;
  bool Shrinks;
};

void FillLine(Contribution& line, std::int32_t d, const Axis& axis, KnownValues& kernel) {
  const double centre = (d + 0.5) / axis.Scale;
  const std::int32_t left = std::max(Truncate(centre - axis.Width), 0);
  const std::int32_t right = std::min(Truncate(centre + axis.Width), axis.SourceCount - 1);
  if (left > right) return;
  // Each candidate gives one entry at most.
  const auto room = std::size_t(right - left) + 1;
  line.Entries = static_cast<ContributionEntry*>(std::calloc(room, sizeof(ContributionEntry)));
  if (!line.Entries) return;
  double sum = 0.0;
  for (std::int32_t i = left; i <= right; ++i) {
    double x = (centre - i) - 0.5, value = 0.0;
    if (axis.Shrinks) x *= axis.Scale;
    if (!kernel.At(std::fabs(x), value) || value == 0.0) continue;
    line.Entries[line.Count++] = {float(value), i};
    sum += value;
  }
  line.Sum = float(sum);
}

}

ContributionTable::ContributionTable(std::int32_t outputCount, std::int32_t sourceCount, double scale,
                                     ScaleKernel kernel, PictureData* yields)
    : Lines(static_cast<Contribution*>(std::calloc(std::size_t(outputCount), sizeof(Contribution)))),
      LineCount(outputCount) {
  if (!Lines) return;
  const bool shrinks = scale < 1.0;
  const double radius = SearchRadius(kernel);
  const Axis axis{sourceCount, scale, shrinks ? radius / scale : radius, shrinks};
  KnownValues values(kernel);
  for (std::int32_t d = 0; d < outputCount; ++d) {
    FillLine(Lines[d], d, axis, values);
    if (yields) MayYield(*yields);
  }
}

ContributionTable::~ContributionTable() {
  for (std::int32_t d = 0; Lines && d < LineCount; ++d) std::free(Lines[d].Entries);
  std::free(Lines);
}

}
