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

/// Distances in whole numbers of 2^-20 source lines.
using ExactDistance = std::int64_t;
constexpr double ExactUnits = 0x1p20;

/// Whether a distance is such a number. Then so are the differences of these, exactly, and the weights of a
/// line depend only on where its centre lies between two source lines.
bool IsExact(double lines, ExactDistance& exact) {
  exact = ExactDistance(lines * ExactUnits);
  return double(exact) == lines * ExactUnits;
}

/// The lines that came first with some fractions of their centres.
class FirstLines {
 public:
  struct Line {
    std::int32_t Number;
    ExactDistance Centre;
  };
  FirstLines() { std::fill_n(Lines, 1 << SizeBits, Line{0, -1}); }
  /// The line that came first with the same fraction, as far as that is known, or else this one.
  Line Like(const Line& line) {
    const ExactDistance fraction = Fraction(line.Centre);
    Line& first = Lines[std::uint32_t(fraction) * 0x9E3779B1U >> (32 - SizeBits)];
    if (first.Centre < 0 || Fraction(first.Centre) != fraction) first = line;
    return first;
  }

 private:
  static ExactDistance Fraction(ExactDistance centre) { return centre & (ExactDistance(ExactUnits) - 1); }
  static constexpr int SizeBits = 8;
  Line Lines[1 << SizeBits];
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
        Values(kernel) {
    ExactDistance width;
    HasExactWidth = IsExact(Width, width);
  }
  void Fill(std::int32_t d) {
    Contribution& line = Table.Lines[d];
    line.Alike = d;
    const double centre = (d + 0.5) / Scale;
    const std::int32_t farLeft = Truncate(centre - Width), farRight = Truncate(centre + Width);
    const std::int32_t left = std::max(farLeft, 0), right = std::min(farRight, SourceCount - 1);
    // Each candidate gives one entry at most.
    if (left > right || !HasRoom(std::size_t(right - left) + 1)) return;
    line.Entries = Free;
    FirstLines::Line own{d, 0}, first = own;
    const bool whole = HasExactWidth && centre >= Width && farRight < SourceCount;
    if (whole && IsExact(centre, own.Centre)) first = Firsts.Like(own);
    if (first.Number != d)
      Copy(line, first.Number, std::int32_t((own.Centre - first.Centre) / ExactDistance(ExactUnits)));
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
  void Copy(Contribution& line, std::int32_t alike, std::int32_t further) const {
    const Contribution& from = Table.Lines[alike];
    for (std::int32_t i = 0; i < from.Count; ++i)
      line.Entries[i] = {from.Entries[i].Weight, from.Entries[i].Pixel + further};
    line.Count = from.Count;
    line.Sum = from.Sum;
    line.Alike = alike;
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
  bool Shrinks, HasExactWidth;
  KnownValues Values;
  FirstLines Firsts;
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
