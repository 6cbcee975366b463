#include "scale/fixed_point_rows.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "image/targets.h"
#include "scale/fixed_point_groups.h"
#include "scale/quotients.h"

namespace zor {
namespace {

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

/// The lines of a table in whole numbers.
struct FixedPointRows::Shares {
  struct Line {
    FixedPointLine Of;
    /// False without a fixed-point form; the shares are 0 then.
    bool Fits;
    /// Source pixels: the first one, and how many there are from there to the last one.
    std::int32_t First, Reach;
    /// One share an entry.
    std::int32_t* Shares;
  };
  Buffer ShareMemory, LineMemory;
  /// Lines that don't fit; and all bits that are set in a share.
  std::int32_t Unfit = 0;
  std::uint32_t Used = 0;
  /// Whether there are lines off a lattice.
  bool Doubtful = false;

  explicit Shares(const ContributionTable& table) {
    std::size_t entries = 0;
    for (std::int32_t x = 0; x < table.Count(); ++x)
      if (table[x].Alike == x) entries += std::size_t(table[x].Count);
    ShareMemory = NewBuffer((entries + 1) * sizeof(std::int32_t));
    LineMemory = NewBuffer(std::size_t(table.Count()) * sizeof(Line));
    if (*this) Fill(table);
  }
  explicit operator bool() const { return ShareMemory && LineMemory; }
  Line& operator[](std::int32_t x) const { return reinterpret_cast<Line*>(LineMemory.get())[x]; }

 private:
  void Fill(const ContributionTable& table) {
    auto* shares = reinterpret_cast<std::int32_t*>(ShareMemory.get());
    for (std::int32_t x = 0; x < table.Count(); ++x) {
      const Contribution& from = table[x];
      Line& line = (*this)[x];
      if (from.Count > 0) {
        line.First = from.First;
        line.Reach = from.Last() - from.First + 1;
      }
      if (from.Alike != x) {
        const Line& alike = (*this)[from.Alike];
        line.Of = alike.Of;
        line.Fits = alike.Fits;
        line.Shares = alike.Shares;
      } else {
        line.Shares = shares;
        shares += from.Count;
        line.Fits = MakeFixedPoint(from, line.Shares, line.Of);
        if (!line.Fits) std::fill_n(line.Shares, from.Count, 0);
        Doubtful |= !line.Fits || line.Of.Doubtful > 0;
        for (std::int32_t i = 0; i < from.Count; ++i) Used |= std::uint32_t(line.Shares[i]);
      }
      Unfit += line.Fits ? 0 : 1;
    }
  }
};

/// Lays out the groups.
struct GroupMaker {
  using Line = FixedPointRows::Shares::Line;
  using ColumnGroup = FixedPointRows::ColumnGroup;
  using GroupPattern = FixedPointRows::GroupPattern;

  FixedPointRows& Rows;
  const FixedPointRows::Shares& Lines;
  const int Channels = Rows.Pair.Channels;
  const int Step = Rows.Pair.Source.Step;
  std::uint32_t LaneIndex[Lanes][Lanes] = {};

  /// What a group takes in: its leftmost source pixel, how far right of that a line begins, and the most that
  /// one takes in. A line may begin left of the one before it, since weights of 0 have no entries.
  struct Extent {
    std::int32_t Start, Farthest, Reach;
  };
  std::int32_t ColumnsFrom(std::int32_t x) const { return std::min(Rows.Pixels, Rows.ResultWidth - x); }
  Extent ExtentFrom(std::int32_t x) const {
    std::int32_t least = std::numeric_limits<std::int32_t>::max(), most = 0, reach = 0;
    for (std::int32_t p = x; p < x + ColumnsFrom(x); ++p) {
      const Line& line = Lines[p];
      if (line.Reach == 0) continue;
      least = std::min(least, line.First);
      most = std::max(most, line.First);
      reach = std::max(reach, line.Reach);
    }
    const std::int32_t start = std::min(least, most);
    return {start, most - start, reach};
  }
  static std::int32_t StepsFor(std::int32_t reach, int parts) {
    return (reach + Taps * parts - 1) / (Taps * parts);
  }
  /// Whether a permutation reaches all that a step looks at.
  bool IsInReach(std::int64_t farthest, int parts) const {
    return (farthest + Taps * parts - 1) * Step + Rows.Spread < VectorBytes;
  }
  std::int32_t GroupCount() const { return (Rows.ResultWidth + Rows.Pixels - 1) / Rows.Pixels; }
  std::int32_t FarthestOfAll() const {
    std::int32_t farthest = 0;
    for (std::int32_t g = 0; g < GroupCount(); ++g)
      farthest = std::max(farthest, ExtentFrom(g * Rows.Pixels).Farthest);
    return farthest;
  }
  /// Takes the cheapest layout in reach. What one costs is told by some groups, as most are alike.
  bool ChooseLayout() {
    constexpr std::int32_t some = 32;
    double best = std::numeric_limits<double>::max();
    int bestPixels = 0;
    for (Rows.Pixels = Lanes / Channels; Rows.Pixels >= 1; --Rows.Pixels) {
      const std::int32_t groups = GroupCount(), looked = std::min(groups, some);
      std::int32_t reaches[some];
      for (std::int32_t i = 0; i < looked; ++i)
        reaches[i] = ExtentFrom(std::int32_t(std::int64_t{groups} * i / looked) * Rows.Pixels).Reach;
      std::int32_t farthest = -1;
      for (int parts = Lanes / (Channels * Rows.Pixels); parts >= 1; --parts) {
        std::int64_t cost = 0;
        for (std::int32_t i = 0; i < looked; ++i) cost += 4 * StepsFor(reaches[i], parts) + 10;
        const double ofAll = double(cost) * groups / looked;
        if (ofAll >= best) continue;
        if (farthest < 0) farthest = FarthestOfAll();
        if (!IsInReach(farthest, parts)) continue;
        best = ofAll;
        bestPixels = Rows.Pixels;
        Rows.Parts = parts;
      }
    }
    Rows.Pixels = bestPixels;
    return bestPixels > 0;
  }
  int Lane(int part, int pixel, int channel) const {
    return (part * Rows.Pixels + pixel) * Channels + channel;
  }
  /// The index of a lane whose line begins with the group's first source pixel; the four bytes of a lane
  /// are below VectorBytes, also when the same is added to each.
  void MakeLaneIndex() {
    for (int part = 0; part < Rows.Parts; ++part)
      for (int c = 0; c < Channels; ++c) {
        std::uint8_t bytes[Taps];
        for (int t = 0; t < Taps; ++t)
          bytes[t] = std::uint8_t((part * Taps + t) * Step + Rows.Pair.Source.Offset[c] - Rows.Lead);
        std::memcpy(&LaneIndex[part][c], bytes, Taps);
      }
  }
  void Place(ColumnGroup& group, std::int32_t number) const {
    group.FirstColumn = number * Rows.Pixels;
    group.Columns = ColumnsFrom(group.FirstColumn);
    const Extent extent = ExtentFrom(group.FirstColumn);
    group.Base = std::int64_t{extent.Start} * Step;
    group.Steps = StepsFor(extent.Reach, Rows.Parts);
    const std::int64_t room = Rows.RowBytes - group.Base - VectorBytes;
    const std::int64_t whole = room < 0 ? 0 : room / (Taps * Rows.Parts * Step) + 1;
    group.WholeSteps = std::int32_t(std::min<std::int64_t>(group.Steps, whole));
  }
  /// Where a line begins, from its group's first source pixel on.
  std::int32_t FurtherBy(const ColumnGroup& group, std::int32_t pixel) const {
    const Line& line = Lines[group.FirstColumn + pixel];
    return line.Reach > 0 ? line.First - std::int32_t(group.Base / Step) : 0;
  }
  bool ArePatternsAlike(const ColumnGroup& a, const ColumnGroup& b) const {
    bool alike = a.Columns == b.Columns;
    for (std::int32_t p = 0; alike && p < a.Columns; ++p)
      alike = Rows.Table[a.FirstColumn + p].Alike == Rows.Table[b.FirstColumn + p].Alike &&
              FurtherBy(a, p) == FurtherBy(b, p);
    return alike;
  }
  /// A group not far before this one that has the same pattern, or else this one.
  std::int32_t WithPatternOf(std::int32_t number) const {
    constexpr std::int32_t far = 16;
    for (std::int32_t g = number - 1; g >= std::max(number - far, 0); --g)
      if (ArePatternsAlike(Rows.Groups[g], Rows.Groups[number])) return g;
    return number;
  }
  std::size_t PatternBytes(const ColumnGroup& group) const {
    return sizeof(GroupPattern) + std::size_t(group.Steps) * std::size_t(Rows.Digits) * VectorBytes;
  }
  void Fill(GroupPattern& pattern, const ColumnGroup& group) const {
    for (std::int32_t p = 0; p < group.Columns; ++p) {
      const auto further = std::uint32_t(FurtherBy(group, p) * Step) * 0x01010101U;
      for (int part = 0; part < Rows.Parts; ++part)
        for (int c = 0; c < Channels; ++c) {
          const std::uint32_t bytes = LaneIndex[part][c] + further;
          std::memcpy(pattern.Index + Lane(part, p, c) * Taps, &bytes, Taps);
        }
      FillWeights(pattern.Weights(), p, group.FirstColumn + p);
      const Line& line = Lines[group.FirstColumn + p];
      // Without shares all of the sum is the bias: one half, which is in doubt.
      const std::int32_t bias = line.Fits ? line.Of.Bias : 1 << (FixedPointLine::Bits - 1);
      const std::uint32_t doubtful = line.Fits ? line.Of.Doubtful : 1U << FixedPointLine::Bits;
      std::fill_n(pattern.Bias + p * Channels, Channels, bias);
      std::fill_n(pattern.Doubtful + p * Channels, Channels, doubtful);
      std::fill_n(pattern.OfFlat + p * Channels, Channels, line.Of.OfFlat);
    }
  }
  /// Writes the digits of one line's shares into the weights of its group, four taps at a time.
  void FillWeights(std::int8_t* weights, int pixel, std::int32_t x) const {
    const Contribution& line = Rows.Table[x];
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
      const std::int32_t tap = line.Entries[i].Pixel;
      if (tap / Taps != place) {
        write();
        std::memset(four, 0, sizeof four);
        place = tap / Taps;
      }
      // The digits that no share of the table has are its lowest ones.
      std::int32_t share = Lines[x].Shares[i];
      for (int d = 2; d >= 0; --d) four[d][tap % Taps] = TakeDigit(share);
    }
    write();
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
  const Shares lines(Table);
  // Where the plain form would have to make many samples one by one, it makes all of them better.
  if (!lines || lines.Unfit > ResultWidth / 8) return false;
  GroupMaker maker{*this, lines};
  if (!maker.ChooseLayout()) return false;
  // How many digits the shares need decides how the weights lie.
  const bool all = lines.Doubtful || (lines.Used & 0xFF) != 0;
  Digits = all ? 3 : (lines.Used & 0xFF00) != 0 ? 2 : 1;

  const std::int32_t groups = maker.GroupCount();
  GroupMemory = NewBuffer(std::size_t(groups) * sizeof(ColumnGroup));
  if (!GroupMemory) return false;
  Groups = reinterpret_cast<ColumnGroup*>(GroupMemory.get());
  maker.MakeLaneIndex();
  std::size_t bytes = 0;
  for (std::int32_t g = 0; g < groups; ++g) {
    maker.Place(Groups[g], g);
    if (maker.WithPatternOf(g) == g) bytes += maker.PatternBytes(Groups[g]);
  }
  PatternMemory = NewBuffer(bytes + VectorBytes);
  if (!PatternMemory) return false;
  Sample* free = Aligned(PatternMemory);
  for (std::int32_t g = 0; g < groups; ++g) {
    ColumnGroup& group = Groups[g];
    if (const std::int32_t other = maker.WithPatternOf(g); other != g) {
      group.Pattern = Groups[other].Pattern;
      continue;
    }
    auto* pattern = reinterpret_cast<GroupPattern*>(free);
    maker.Fill(*pattern, group);
    group.Pattern = pattern;
    free += maker.PatternBytes(group);
  }
  return true;
}

}
