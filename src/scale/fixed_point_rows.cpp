#include "scale/fixed_point_rows.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "image/targets.h"
#include "scale/fixed_point_groups.h"
#include "scale/quotients.h"

namespace zor {
namespace {

/// Source pixels from the first to the last that a line takes in.
std::int32_t FirstPixel(const Contribution& line) { return line.Entries[0].Pixel; }
std::int32_t Reach(const Contribution& line) {
  return line.Count > 0 ? line.Entries[line.Count - 1].Pixel - line.Entries[0].Pixel + 1 : 0;
}

/// The first multiple of a vector in memory that has room for one more.
Sample* Aligned(const Buffer& memory) {
  const auto address = reinterpret_cast<Word>(memory.get());
  return memory.get() + (VectorBytes - address % VectorBytes) % VectorBytes;
}

/// The part of a share that stands at a digit, so that share = sum of digit * 256^place, each from -128 to
/// 127.
std::int8_t TakeDigit(std::int32_t& share) {
  const auto digit = std::int8_t(share & 255);
  share = (share - digit) >> 8;
  return digit;
}

}

/// Lays out the groups.
struct GroupMaker {
  FixedPointRows& Rows;
  const ContributionTable& Table = Rows.Table;
  const int Channels = Rows.Pair.Channels;
  const int Step = Rows.Pair.Source.Step;

  std::int32_t ColumnsFrom(std::int32_t x) const { return std::min(Rows.Pixels, Rows.ResultWidth - x); }
  /// The leftmost source pixel of a group, how far right of it a line begins, and the most that one takes in.
  /// A line may begin left of the one before it, since weights of 0 have no entries.
  void Extent(std::int32_t x, std::int32_t& start, std::int32_t& reach, std::int32_t& farthest) const {
    std::int32_t least = std::numeric_limits<std::int32_t>::max(), most = 0;
    reach = 0;
    for (std::int32_t p = x; p < x + ColumnsFrom(x); ++p) {
      const Contribution& line = Table[p];
      if (line.Count == 0) continue;
      least = std::min(least, FirstPixel(line));
      most = std::max(most, FirstPixel(line));
      reach = std::max(reach, Reach(line));
    }
    start = std::min(least, most);
    farthest = most - start;
  }
  std::int32_t StepsFor(std::int32_t reach) const {
    return (reach + Taps * Rows.Parts - 1) / (Taps * Rows.Parts);
  }
  /// How much work a layout is; negative where it isn't one, since a permutation can't reach so far.
  std::int64_t Cost() const {
    std::int64_t cost = 0;
    for (std::int32_t x = 0; x < Rows.ResultWidth; x += Rows.Pixels) {
      std::int32_t start, reach, farthest;
      Extent(x, start, reach, farthest);
      if ((std::int64_t{farthest} + Taps * Rows.Parts - 1) * Step + Rows.Spread >= VectorBytes) return -1;
      cost += 4 * StepsFor(reach) + 10;
    }
    return cost;
  }
  bool ChooseLayout() {
    std::int64_t best = -1;
    int bestPixels = 0, bestParts = 0;
    for (int pixels = Lanes / Channels; pixels >= 1; --pixels)
      for (int parts = Lanes / (Channels * pixels); parts >= 1; --parts) {
        Rows.Pixels = pixels;
        Rows.Parts = parts;
        const std::int64_t cost = Cost();
        if (cost < 0 || (best >= 0 && cost >= best)) continue;
        best = cost;
        bestPixels = pixels;
        bestParts = parts;
      }
    Rows.Pixels = bestPixels;
    Rows.Parts = bestParts;
    return best >= 0;
  }
  int Lane(int part, int pixel, int channel) const {
    return (part * Rows.Pixels + pixel) * Channels + channel;
  }
  void FillIndex(FixedPointRows::ColumnGroup& group, std::int32_t start) const {
    for (int part = 0; part < Rows.Parts; ++part)
      for (std::int32_t p = 0; p < group.Columns; ++p) {
        const Contribution& line = Table[group.FirstColumn + p];
        const std::int32_t first = line.Count > 0 ? FirstPixel(line) - start : 0;
        for (int c = 0; c < Channels; ++c)
          for (int t = 0; t < Taps; ++t)
            group.Index[Lane(part, p, c) * Taps + t] =
                std::uint8_t((first + part * Taps + t) * Step + Rows.Pair.Source.Offset[c] - Rows.Lead);
      }
  }
  /// Fills all of a group but what comes of the shares; gives its steps.
  std::int32_t PlaceGroup(FixedPointRows::ColumnGroup& group, std::int32_t number) const {
    group.FirstColumn = number * Rows.Pixels;
    group.Columns = ColumnsFrom(group.FirstColumn);
    std::int32_t start, reach, farthest;
    Extent(group.FirstColumn, start, reach, farthest);
    group.Base = std::int64_t{start} * Step;
    group.Steps = StepsFor(reach);
    const std::int64_t room = Rows.RowBytes - group.Base - VectorBytes;
    const std::int64_t whole = room < 0 ? 0 : room / (Taps * Rows.Parts * Step) + 1;
    group.WholeSteps = std::int32_t(std::min<std::int64_t>(group.Steps, whole));
    FillIndex(group, start);
    return group.Steps;
  }
  /// Writes the digits of one line's shares into the weights of its group, four taps at a time.
  void FillWeights(std::int8_t* weights, int pixel, const Contribution& line,
                   const std::int32_t* shares) const {
    const int digits = Rows.Digits;
    std::int8_t four[3][Taps] = {};
    std::int32_t place = 0;
    const auto write = [&] {
      std::int8_t* lanes = weights + std::ptrdiff_t{place / Rows.Parts} * digits * VectorBytes +
                           Lane(place % Rows.Parts, pixel, 0) * Taps;
      for (int d = 0; d < digits; ++d)
        for (int c = 0; c < Channels; ++c) std::memcpy(lanes + d * VectorBytes + c * Taps, four[d], Taps);
    };
    for (std::int32_t i = 0; i < line.Count; ++i) {
      const std::int32_t tap = line.Entries[i].Pixel - FirstPixel(line);
      if (tap / Taps != place) {
        write();
        std::memset(four, 0, sizeof four);
        place = tap / Taps;
      }
      // The digits that no share of the table has are its lowest ones.
      std::int32_t share = shares[i];
      for (int d = 2; d >= 0; --d) four[d][tap % Taps] = TakeDigit(share);
    }
    write();
  }
};

/// The shares of all lines, in their order.
struct FixedPointRows::Shares {
  Buffer EntryMemory, LineMemory, FitMemory;
  /// Lines without a fixed-point form, whose shares are 0; and all bits that are set in a share.
  std::int32_t Unfit = 0;
  std::uint32_t Used = 0;
  /// Whether there are lines off a lattice.
  bool Doubtful = false;

  explicit Shares(const ContributionTable& table) {
    std::size_t entries = 0;
    for (std::int32_t x = 0; x < table.Count(); ++x) entries += std::size_t(table[x].Count);
    EntryMemory = NewBuffer((entries + 1) * sizeof(std::int32_t));
    LineMemory = NewBuffer(std::size_t(table.Count()) * sizeof(FixedPointLine));
    FitMemory = NewBuffer(std::size_t(table.Count()));
    if (*this) Fill(table);
  }
  explicit operator bool() const { return EntryMemory && LineMemory && FitMemory; }
  std::int32_t* Entries() const { return reinterpret_cast<std::int32_t*>(EntryMemory.get()); }
  FixedPointLine& Line(std::int32_t x) const {
    return reinterpret_cast<FixedPointLine*>(LineMemory.get())[x];
  }
  bool Fits(std::int32_t x) const { return FitMemory[std::size_t(x)] != 0; }

 private:
  void Fill(const ContributionTable& table) {
    std::int32_t* shares = Entries();
    for (std::int32_t x = 0; x < table.Count(); ++x) {
      const bool fits = MakeFixedPoint(table[x], shares, Line(x));
      FitMemory[std::size_t(x)] = fits;
      if (!fits) std::fill_n(shares, table[x].Count, 0);
      Unfit += fits ? 0 : 1;
      Doubtful |= !fits || Line(x).Doubtful > 0;
      for (std::int32_t i = 0; i < table[x].Count; ++i) Used |= std::uint32_t(shares[i]);
      shares += table[x].Count;
    }
  }
};

FixedPointRows::FixedPointRows(const ScalePair& pair, const ContributionTable& table,
                               std::int32_t sourceWidth)
    : Pair(pair), Table(table), ResultWidth(table.Count()) {
  const auto [least, most] =
      std::minmax_element(Pair.Source.Offset.begin(), Pair.Source.Offset.begin() + Pair.Source.Count);
  Lead = *least;
  Spread = *most - *least;
  RowBytes = (std::int64_t{sourceWidth} - 1) * Pair.Source.Step + Spread + 1;
  Built = CurrentTarget == Target::AVX512VBMI && !Pair.Luma && Build();
}

bool FixedPointRows::Build() {
  GroupMaker maker{*this};
  if (!maker.ChooseLayout()) return false;
  // How many digits the shares need decides how the weights lie.
  const Shares shares(Table);
  // Where the plain form would have to make many samples one by one, it makes all of them better.
  if (!shares || shares.Unfit > ResultWidth / 8) return false;
  const bool all = shares.Doubtful || (shares.Used & 0xFF) != 0;
  Digits = all ? 3 : (shares.Used & 0xFF00) != 0 ? 2 : 1;

  const std::int32_t groups = (ResultWidth + Pixels - 1) / Pixels;
  GroupMemory = NewBuffer(std::size_t(groups + 1) * sizeof(ColumnGroup));
  if (!GroupMemory) return false;
  Groups = reinterpret_cast<ColumnGroup*>(Aligned(GroupMemory));
  std::size_t steps = 0;
  for (std::int32_t g = 0; g < groups; ++g) steps += std::size_t(maker.PlaceGroup(Groups[g], g));
  WeightMemory = NewBuffer((steps + 1) * std::size_t(Digits) * VectorBytes);
  if (!WeightMemory) return false;
  auto* weights = reinterpret_cast<std::int8_t*>(Aligned(WeightMemory));
  const std::int32_t* lineShares = shares.Entries();
  for (std::int32_t g = 0; g < groups; ++g) {
    ColumnGroup& group = Groups[g];
    group.Weights = weights;
    for (std::int32_t p = 0; p < group.Columns; ++p) {
      const std::int32_t x = group.FirstColumn + p;
      maker.FillWeights(weights, p, Table[x], lineShares);
      lineShares += Table[x].Count;
      for (int lane = p * Pair.Channels; lane < (p + 1) * Pair.Channels; ++lane) {
        group.Bias[lane] = shares.Line(x).Bias;
        group.Doubtful[lane] = shares.Line(x).Doubtful;
        if (shares.Fits(x)) continue;
        // Without shares all of the sum is the bias: one half, which is in doubt.
        group.Bias[lane] = 1 << (FixedPointLine::Bits - 1);
        group.Doubtful[lane] = 1U << FixedPointLine::Bits;
      }
    }
    weights += std::ptrdiff_t{group.Steps} * Digits * VectorBytes;
  }
  return true;
}

}
