#include "scale/contributions.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdlib>
#include <iterator>

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

/// Numbers of source lines that are multiples of this are exact, and so are their differences: the weights of
/// a line then depend only on where its centre lies between two source lines.
constexpr double ExactUnit = 0x1p-20;

bool IsExact(double lines) { return std::floor(lines / ExactUnit) == lines / ExactUnit; }

/// The first lines of some fractions of their centres.
class KnownFractions {
 public:
  KnownFractions() { std::fill(std::begin(Fractions), std::end(Fractions), -1.0); }
  /// The line that this fraction was asked for first, as far as that is known; `line` if it wasn't.
  std::int32_t FirstLine(double fraction, std::int32_t line) {
    const auto slot = std::size_t(fraction / ExactUnit) * 0x9E3779B1U >> 20 & (Slots - 1);
    if (Fractions[slot] != fraction) {
      Fractions[slot] = fraction;
      Lines[slot] = line;
    }
    return Lines[slot];
  }

 private:
  static constexpr std::size_t Slots = 256;
  double Fractions[Slots];
  std::int32_t Lines[Slots];
};

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
        Values(kernel) {}
  void Fill(std::int32_t d) {
    Contribution& line = Table.Lines[d];
    line.Alike = d;
    const double centre = (d + 0.5) / Scale;
    const std::int32_t farLeft = Truncate(centre - Width), farRight = Truncate(centre + Width);
    const std::int32_t left = std::max(farLeft, 0), right = std::min(farRight, SourceCount - 1);
    // Each candidate gives one entry at most.
    if (left > right || !HasRoom(std::size_t(right - left) + 1)) return;
    line.Entries = Free;
    const bool whole = centre >= Width && farRight < SourceCount && IsExact(centre) && IsExact(Width);
    if (whole) line.Alike = Fractions.FirstLine(centre - std::floor(centre), d);
    if (line.Alike != d)
      Copy(line, std::int32_t(std::floor(centre) - std::floor((line.Alike + 0.5) / Scale)));
    else
      Compute(line, centre, left, right);
    Free += line.Count;
    Room -= std::size_t(line.Count);
  }

 private:
  void Compute(Contribution& line, double centre, std::int32_t left, std::int32_t right) {
    double sum = 0.0;
    for (std::int32_t i = left; i <= right; ++i) {
      double x = (centre - i) - 0.5, value = 0.0;
      if (Shrinks) x *= Scale;
      if (!Values.At(std::fabs(x), value) || value == 0.0) continue;
      line.Entries[line.Count++] = {float(value), i};
      sum += value;
    }
    line.Sum = float(sum);
  }
  /// The line that it is alike, so many source lines further.
  void Copy(Contribution& line, std::int32_t further) const {
    const Contribution& first = Table.Lines[line.Alike];
    for (std::int32_t i = 0; i < first.Count; ++i)
      line.Entries[i] = {first.Entries[i].Weight, first.Entries[i].Pixel + further};
    line.Count = first.Count;
    line.Sum = first.Sum;
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
  KnownFractions Fractions;
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
