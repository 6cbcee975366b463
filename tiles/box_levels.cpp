#include "box_levels.h"

#include <algorithm>
#include <cmath>
#include <memory>

#include "failure.h"
#include "sample_loops.h"

namespace picturezor::tiles {

namespace {

/// Sums of so many samples fit 16 bits.
constexpr int MostEvenPower = 8;
/// The sums of uneven lines are made of blocks of 2^3 columns, and of single columns at their ends.
constexpr int MostBlockPower = 3;
/// Whole quotients by a multiplication: for n of these at most, the sum of n samples times ceil(2^48 / n)
/// is 2^48 times the quotient and less than 2^48 / n more, and fits 64 bits.
constexpr std::int32_t MostMultiplied = 1 << 20;
constexpr int MultiplierBits = 48;

bool InBox(double centre, double scale, std::int32_t line) {
  double x = (centre - line) - 0.5;
  if (scale < 1.0) x *= scale;
  return std::fabs(x) <= 0.5;
}

}

std::vector<BoxLine> BoxLines(std::int32_t level, std::int32_t source) {
  std::vector<BoxLine> lines(std::size_t(level), BoxLine{});
  const double scale = double(level) / source, reach = scale < 1.0 ? 0.5 / scale : 0.5;
  for (std::int32_t d = 0; d < level; ++d) {
    const double centre = (d + 0.5) / scale;
    std::int32_t first = std::max(std::int32_t(centre - reach), 0);
    std::int32_t last = std::int32_t(std::min(centre + reach, double(source - 1)));
    while (first < last && !InBox(centre, scale, first)) ++first;
    while (last > first && !InBox(centre, scale, last)) --last;
    lines[std::size_t(d)] = {first, last - first + 1};
  }
  return lines;
}

/// How a level is made.
struct BoxLevels::LevelPlan {
  std::int32_t Width, Height;
  std::vector<BoxLine> Columns, Rows;
  /// For each of the columns; 0 where there are too many for that.
  std::vector<std::uint64_t> Multipliers;
  /// All columns are 2^(number of the level + 1) wide.
  bool Even = false;

  // Of the row that the last part left open, and the next one that is to be given.
  std::vector<std::uint32_t> Open;
  std::int32_t NextRow = 0;
};

struct BoxLevels::Scratch {
  /// One plane after the other.
  Bytes Planes;
  /// For each even level the sums of its columns.
  std::vector<std::vector<std::uint16_t>> Sums;
  /// Sums of all blocks to the left of one, a plane after the other.
  std::vector<std::uint64_t> Before;
  /// For each level the sums of two rows, which may share one of the source.
  std::vector<std::vector<std::uint32_t>> Rows;
  Bytes Quotients;
};

void BoxLevels::DeleteScratch::operator()(Scratch* scratch) const { delete scratch; }

BoxLevels::BoxLevels(files::Extent source, int channels, std::span<const files::Extent> levels)
    : Width(source.Width), Channels(channels) {
  if (std::max(source.Width, source.Height) > MostLines)
    throw files::Failure("more than " + std::to_string(MostLines) + " columns or rows");
  for (const files::Extent size : levels) {
    const int power = int(Levels.size()) + 1;
    LevelPlan plan{.Width = size.Width,
                   .Height = size.Height,
                   .Columns = BoxLines(size.Width, source.Width),
                   .Rows = BoxLines(size.Height, source.Height),
                   .Multipliers{},
                   .Open{}};
    plan.Even = Even == power - 1 && power <= MostEvenPower && source.Width % (1 << power) == 0;
    if (plan.Even) {
      Even = power;
    } else {
      for (const BoxLine& line : plan.Columns)
        plan.Multipliers.push_back(
            line.Count > MostMultiplied
                ? 0
                : ((std::uint64_t{1} << MultiplierBits) - 1) / std::uint64_t(line.Count) + 1);
    }
    Levels.push_back(std::move(plan));
  }
  BlockPower = std::min(Even, MostBlockPower);
}

BoxLevels::~BoxLevels() = default;

std::unique_ptr<BoxLevels::Scratch, BoxLevels::DeleteScratch> BoxLevels::MakeScratch() const {
  std::unique_ptr<Scratch, DeleteScratch> scratch(new Scratch);
  const auto planes = std::size_t(Channels);
  scratch->Planes.resize(std::size_t(Width) * planes);
  for (const LevelPlan& level : Levels) {
    const std::size_t samples = std::size_t(level.Width) * planes;
    scratch->Sums.emplace_back(level.Even ? samples : 0);
    scratch->Rows.emplace_back(2 * samples);
  }
  if (Even < int(Levels.size())) scratch->Before.resize((std::size_t(Width >> BlockPower) + 1) * planes);
  if (!Levels.empty()) scratch->Quotients.resize(std::size_t(Levels[0].Width) * planes);
  return scratch;
}

void BoxLevels::ReduceRow(const LevelPlan& level, int k, Scratch& scratch, std::uint32_t* sums,
                          bool adds) const {
  const std::ptrdiff_t samples = std::ptrdiff_t{level.Width} * Channels;
  if (level.Even) {
    (adds ? AddShifted : PutShifted)(scratch.Sums[std::size_t(k)].data(), samples, k + 1, sums);
    return;
  }
  const std::int32_t block = 1 << BlockPower, blocks = Width >> BlockPower;
  for (int c = 0; c < Channels; ++c) {
    const std::uint8_t* plane = scratch.Planes.data() + std::ptrdiff_t{c} * Width;
    const std::uint64_t* before = scratch.Before.data() + std::ptrdiff_t{c} * (blocks + 1);
    // All samples to the left of a column.
    const auto upTo = [&](std::int32_t column) {
      std::uint64_t sum = before[column >> BlockPower];
      for (std::int32_t x = column & -block; x < column; ++x) sum += plane[x];
      return sum;
    };
    std::uint32_t* out = sums + std::ptrdiff_t{c} * level.Width;
    for (std::int32_t x = 0; x < level.Width; ++x) {
      const BoxLine& line = level.Columns[std::size_t(x)];
      const std::uint64_t sum = upTo(line.First + line.Count) - upTo(line.First);
      const std::uint64_t multiplier = level.Multipliers[std::size_t(x)];
      const auto mean =
          std::uint32_t(multiplier ? sum * multiplier >> MultiplierBits : sum / std::uint64_t(line.Count));
      out[x] = adds ? out[x] + mean : mean;
    }
  }
}

BoxLevels::Part BoxLevels::Reduce(const std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t first,
                                  std::int32_t count, Scratch& scratch) const {
  Part part(Levels.size());
  const std::int32_t end = first + count;
  // The first row of each level that isn't complete.
  std::vector<std::int32_t> next;
  for (const LevelPlan& level : Levels) next.push_back(FirstOpen(level, first));
  for (std::int32_t y = first; y < end; ++y) {
    Split(rows + (y - first) * stride, Width, Channels, scratch.Planes.data(), Width);
    for (int k = 0; k < Even; ++k) {
      std::uint16_t* sums = scratch.Sums[std::size_t(k)].data();
      const std::ptrdiff_t samples = std::ptrdiff_t{Levels[std::size_t(k)].Width} * Channels;
      // The planes are of even lengths, so no pair has samples of two.
      if (k == 0)
        SumPairs(scratch.Planes.data(), samples, sums);
      else
        SumPairs(scratch.Sums[std::size_t(k - 1)].data(), samples, sums);
    }
    if (Even < int(Levels.size())) {
      const std::int32_t block = 1 << BlockPower, blocks = Width >> BlockPower;
      for (int c = 0; c < Channels; ++c) {
        std::uint64_t* before = scratch.Before.data() + std::ptrdiff_t{c} * (blocks + 1);
        std::uint64_t sum = 0;
        const auto fill = [&](const auto* sums) {
          for (std::int32_t b = 0; b < blocks; ++b) {
            before[b] = sum;
            sum += sums[std::ptrdiff_t{c} * blocks + b];
          }
          before[blocks] = sum;
        };
        if (block == 1)
          fill(scratch.Planes.data());
        else
          fill(scratch.Sums[std::size_t(BlockPower - 1)].data());
      }
    }
    for (std::size_t k = 0; k < Levels.size(); ++k) {
      const LevelPlan& level = Levels[k];
      const std::size_t samples = std::size_t(level.Width) * std::size_t(Channels);
      const auto sumsOf = [&](std::int32_t row) { return scratch.Rows[k].data() + (row % 2 ? samples : 0); };
      for (std::int32_t row = next[k]; row < level.Height && level.Rows[std::size_t(row)].First <= y; ++row)
        ReduceRow(level, int(k), scratch, sumsOf(row),
                  y > std::max(first, level.Rows[std::size_t(row)].First));
      if (next[k] >= level.Height) continue;
      const BoxLine& ending = level.Rows[std::size_t(next[k])];
      if (ending.Last() != y) continue;
      std::uint32_t* sums = sumsOf(next[k]);
      if (ending.First < first) {
        part[k].Head.assign(sums, sums + samples);
        part[k].HeadEnds = true;
      } else {
        Divide(sums, std::ptrdiff_t(samples), ending.Count, scratch.Quotients.data());
        const std::size_t at = part[k].Whole.size();
        part[k].Whole.resize(at + samples);
        Join(scratch.Quotients.data(), level.Width, level.Width, Channels, part[k].Whole.data() + at);
      }
      ++next[k];
    }
  }
  for (std::size_t k = 0; k < Levels.size(); ++k) {
    const LevelPlan& level = Levels[k];
    if (next[k] >= level.Height || level.Rows[std::size_t(next[k])].First >= end) continue;
    const std::size_t samples = std::size_t(level.Width) * std::size_t(Channels);
    const std::uint32_t* sums = scratch.Rows[k].data() + (next[k] % 2 ? samples : 0);
    (level.Rows[std::size_t(next[k])].First < first ? part[k].Head : part[k].Tail)
        .assign(sums, sums + samples);
  }
  return part;
}

std::int32_t BoxLevels::FirstOpen(const LevelPlan& level, std::int32_t first) {
  return std::int32_t(std::ranges::lower_bound(level.Rows, first, {}, &BoxLine::Last) - level.Rows.begin());
}

void BoxLevels::BeginAt(std::int32_t first) {
  for (LevelPlan& level : Levels) {
    level.NextRow = FirstOpen(level, first);
    level.Open.assign(std::size_t(level.Width) * std::size_t(Channels), 0);
  }
}

void BoxLevels::Add(const Part& part,
                    const std::function<void(int, std::int32_t, const std::uint8_t*)>& onRow) {
  for (std::size_t k = 0; k < part.size(); ++k) {
    LevelPlan& level = Levels[k];
    const LevelPart& of = part[k];
    const std::size_t samples = std::size_t(level.Width) * std::size_t(Channels);
    for (std::size_t i = 0; i < of.Head.size(); ++i) level.Open[i] += of.Head[i];
    if (of.HeadEnds) {
      if (level.NextRow >= level.Height) throw files::Failure("there are too many sums of rows");
      Bytes planes(samples), row(samples);
      Divide(level.Open.data(), std::ptrdiff_t(samples), level.Rows[std::size_t(level.NextRow)].Count,
             planes.data());
      Join(planes.data(), level.Width, level.Width, Channels, row.data());
      onRow(int(k), level.NextRow++, row.data());
    }
    for (std::size_t at = 0; at < of.Whole.size(); at += samples)
      onRow(int(k), level.NextRow++, of.Whole.data() + at);
    if (!of.Tail.empty()) level.Open = of.Tail;
  }
}

}
