#include "scale/contributions.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdlib>
#include <numeric>

#include "image/arithmetic.h"

namespace zor {
namespace {

/// Kernel values that have been asked for, by distance. Scaling by a simple ratio asks for a few distances
/// over and over, and a sine costs more than all that is done with it.
class KnownValues {
 public:
  /// For a table of a few lines few are kept, since all have to be made empty first.
  KnownValues(ScaleKernel kernel, std::int32_t lines)
      : Kernel(kernel), SizeBits(std::clamp(int(std::bit_width(std::uint32_t(lines))) + 3, 4, MostSizeBits)) {
    for (int i = 0; i < 1 << SizeBits; ++i) Values[i].Distance = -1.0;
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
  static constexpr int MostSizeBits = 10;
  ScaleKernel Kernel;
  int SizeBits;
  Known Values[1 << MostSizeBits];
};

/// Whether a position is a whole number of 2^-20 source lines. The differences of such positions are too, and
/// none of them is rounded.
bool IsExact(double lines) {
  constexpr double units = 0x1p20;
  return double(std::int64_t(lines * units)) == lines * units;
}

}

/// Memory of many lists: one allocation a list would cost as much as filling it.
struct ContributionTable::EntryBlock {
  static constexpr std::size_t Entries = 4095;
  EntryBlock* Next;
};

/// Fills the lines of a table.
class ContributionTable::Filler {
 public:
  Filler(ContributionTable& table, std::int32_t sourceCount, double scale, ScaleKernel kernel)
      : Table(table),
        SourceCount(sourceCount),
        Scale(scale),
        Width(scale < 1.0 ? SearchRadius(kernel) / scale : SearchRadius(kernel)),
        Shrinks(scale < 1.0),
        Values(kernel, table.LineCount) {
    const std::int32_t common = std::gcd(table.LineCount, sourceCount);
    Period = table.LineCount / common;
    SourcePeriod = sourceCount / common;
  }
  void Fill(std::int32_t d) {
    Contribution& line = Table.Lines[d];
    line.Alike = d;
    const double centre = Centre(d);
    const std::int32_t farLeft = Truncate(centre - Width), farRight = Truncate(centre + Width);
    const std::int32_t left = std::max(farLeft, 0), right = std::min(farRight, SourceCount - 1);
    if (left > right) return;
    const bool whole = centre >= Width && farRight < SourceCount;
    if (whole && FirstWhole < 0) FirstWhole = d;
    const bool repeats = whole && d - Period >= FirstWhole && Table.Lines[d - Period].Entries;
    const Contribution& before = repeats ? Table.Lines[d - Period] : line;
    if (repeats && IsExactlyLike(d - Period, centre)) return Repeat(line, before);
    // Each candidate gives one entry at most.
    if (!HasRoom(std::size_t(right - left) + 1)) return;
    Compute(line, centre, left, right);
    if (repeats && AreAlike(line, before)) return Repeat(line, before);
    Free += line.Count;
    Room -= std::size_t(line.Count);
  }

 private:
  void Compute(Contribution& line, double centre, std::int32_t left, std::int32_t right) {
    double sum = 0.0;
    line.Entries = Free;
    for (std::int32_t i = left; i <= right; ++i) {
      double x = (centre - i) - 0.5, value = 0.0;
      if (Shrinks) x *= Scale;
      if (!Values.At(std::fabs(x), value) || value == 0.0) continue;
      if (line.Count == 0) line.First = i;
      Free[line.Count++] = {float(value), i - line.First};
      sum += value;
    }
    line.Sum = float(sum);
  }
  double Centre(std::int32_t d) const { return (d + 0.5) / Scale; }
  /// Whether all that a line is computed from differs from another line by whole numbers only.
  bool IsExactlyLike(std::int32_t d, double centre) const {
    return IsExact(Width) && IsExact(centre) && centre - Centre(d) == SourcePeriod && IsExact(Centre(d));
  }
  void Repeat(Contribution& line, const Contribution& before) const {
    line = before;
    line.First += SourcePeriod;
  }
  /// Rounding may have made a difference, and then it may not.
  bool AreAlike(const Contribution& a, const Contribution& b) const {
    return a.Count == b.Count && a.Sum == b.Sum && a.First == b.First + SourcePeriod &&
           std::equal(a.Entries, a.Entries + a.Count, b.Entries,
                      [](const ContributionEntry& one, const ContributionEntry& other) {
                        return one.Weight == other.Weight && one.Pixel == other.Pixel;
                      });
  }
  bool HasRoom(std::size_t entries) {
    if (entries <= Room) return true;
    const std::size_t count = std::max(entries, EntryBlock::Entries);
    auto* block = static_cast<EntryBlock*>(std::calloc(count + 1, sizeof(ContributionEntry)));
    if (!block) return false;
    block->Next = Table.Blocks;
    Table.Blocks = block;
    Free = reinterpret_cast<ContributionEntry*>(block + 1);
    Room = count;
    return true;
  }

  ContributionTable& Table;
  std::int32_t SourceCount;
  double Scale, Width;
  bool Shrinks;
  KnownValues Values;
  /// After so many lines, and so many of the source, the centres lie in the same way again. And the first
  /// line that no edge cuts short.
  std::int32_t Period, SourcePeriod, FirstWhole = -1;
  ContributionEntry* Free = nullptr;
  std::size_t Room = 0;
};

ContributionTable::ContributionTable(std::int32_t outputCount, std::int32_t sourceCount, double scale,
                                     ScaleKernel kernel, PictureData* yields)
    : Lines(static_cast<Contribution*>(std::calloc(std::size_t(outputCount), sizeof(Contribution)))),
      LineCount(outputCount) {
  if (!Lines) return;
  Filler filler(*this, sourceCount, scale, kernel);
  for (std::int32_t d = 0; d < outputCount; ++d) {
    filler.Fill(d);
    if (yields) MayYield(*yields);
  }
}

ContributionTable::~ContributionTable() {
  while (EntryBlock* block = Blocks) {
    Blocks = block->Next;
    std::free(block);
  }
  std::free(Lines);
}

}
