#include "scale/float_rows.h"

#include <algorithm>
#include <limits>
#include <type_traits>

#include "image/byte_blocks.h"
#include "image/targets.h"
#include "scale/line_sums.h"

namespace zor {
namespace {

constexpr int Rows = FloatRows::RowsTogether, Halves = Rows / int(BlockBytes);
/// Columns that are turned together, and pixels that are turned back together.
constexpr int GroupPixels = 16;
constexpr int MostStep = 8, MostChannels = 5;
/// Columns that are kept have to stay in the second-level cache, or it isn't worth it.
constexpr std::size_t MostScratch = 512 << 10;
constexpr Word VectorBytes = 64;

/// Bytes as floats, so many that the compiler takes vectors for it.
template <int Count>
void Widen(const Sample (&bytes)[Count], float* into) {
  for (int i = 0; i < Count; ++i) into[i] = float(bytes[i]);
}

/// A group of columns of all rows.
struct TurnedGroup {
  const Sample* From[Rows];
  int Step;
  /// Whether the channels are all that a pixel has; otherwise where the floats of each byte of the group go
  /// in Into, below 0 for those that no channel is.
  bool Full;
  const std::int32_t* Place;
  float* Into;
};

void Turn(const TurnedGroup* group) {
  for (int chunk = 0; chunk < group->Step; ++chunk) {
    Sample bytes[BlockBytes * Rows];
    for (int half = 0; half < Halves; ++half) {
      Block rows[BlockBytes];
      for (int r = 0; r < BlockBytes; ++r)
        rows[r] = LoadBlock(group->From[half * BlockBytes + r] + chunk * BlockBytes);
      TransposeSquare(rows);
      for (int j = 0; j < BlockBytes; ++j) StoreBlock(bytes + j * Rows + half * BlockBytes, rows[j]);
    }
    if (group->Full) {
      Widen(bytes, group->Into + chunk * BlockBytes * Rows);
      continue;
    }
    float floats[BlockBytes * Rows];
    Widen(bytes, floats);
    for (int j = 0; j < BlockBytes; ++j)
      if (const std::int32_t place = group->Place[chunk * BlockBytes + j]; place >= 0)
        std::copy_n(floats + j * Rows, Rows, group->Into + place);
  }
}

/// Samples of 16 rows that are turned back: From[k] is those of all rows at place k of Count.
template <class Value>
struct TurnedSamples {
  const Sample* const* From;
  std::ptrdiff_t Count;
  Value* const* Into;
  int Rows;
};

template <class Value>
void TurnBack(const TurnedSamples<Value>* samples) {
  for (std::ptrdiff_t k = 0; k < samples->Count; k += BlockBytes) {
    Block rows[BlockBytes];
    for (int j = 0; j < BlockBytes; ++j) rows[j] = LoadBlock(samples->From[k + j]);
    TransposeSquare(rows);
    if constexpr (std::is_same_v<Value, float>) {
      Sample bytes[BlockBytes * BlockBytes];
      std::memcpy(bytes, rows, sizeof bytes);
      float floats[BlockBytes * BlockBytes];
      Widen(bytes, floats);
      for (int r = 0; r < samples->Rows; ++r)
        std::copy_n(floats + r * BlockBytes, BlockBytes, samples->Into[r] + k);
    } else {
      const auto count = std::size_t(std::min<std::ptrdiff_t>(samples->Count - k, BlockBytes));
      for (int r = 0; r < samples->Rows; ++r) std::memcpy(samples->Into[r] + k, &rows[r], count);
    }
  }
}

}

struct FloatRows::Line {
  FloatLine Of;
  /// Made by the plain form.
  bool Plain;
  /// The columns that it looks at; no line from this one on looks at any left of Least.
  std::int32_t First, Reach, Least;
  /// One a column.
  const float* Shares;
};

FloatRows::FloatRows(const ScalePair& pair, const ContributionTable& table, std::int32_t sourceWidth)
    : Pair(&pair), Table(&table) {
  const auto [least, most] =
      std::minmax_element(Pair->Source.Offset.begin(), Pair->Source.Offset.begin() + Pair->Source.Count);
  Lead = *least;
  RowBytes = (std::int64_t{sourceWidth} - 1) * Pair->Source.Step + (*most - *least) + 1;
  if (Pair->Luma || Pair->Source.Step > MostStep || *most - *least >= Pair->Source.Step || !Build())
    Lines = nullptr;
}

bool FloatRows::Build() {
  const std::int32_t width = Table->Count();
  LineMemory = NewBuffer(std::size_t(width) * sizeof(Line));
  if (!LineMemory) return false;
  Lines = reinterpret_cast<Line*>(LineMemory.get());
  std::size_t shareCount = 0;
  std::int32_t least = std::numeric_limits<std::int32_t>::max(), widest = 0;
  for (std::int32_t x = width - 1; x >= 0; --x) {
    const Contribution& from = (*Table)[x];
    Line& line = Lines[x];
    if (from.Count > 0) {
      line.First = from.First;
      line.Reach = from.Last() - from.First + 1;
      least = std::min(least, line.First);
      widest = std::max(widest, line.First + line.Reach - least);
    }
    line.Least = least;
    if (from.Alike == x) shareCount += std::size_t(line.Reach);
  }
  Kept = (widest + GroupPixels - 1) / GroupPixels + 1;
  const std::size_t columns = std::size_t(Kept) * GroupPixels;
  Scratch = (columns * std::size_t(Pair->Channels) * Rows + LineSums::Block) * sizeof(float) +
            columns * sizeof(float*) + VectorBytes;
  if (Scratch > MostScratch) return false;
  ShareMemory = NewBuffer((shareCount + 1) * sizeof(float));
  if (!ShareMemory) return false;
  auto* shares = reinterpret_cast<float*>(ShareMemory.get());
  for (std::int32_t x = 0; x < width; ++x) {
    const Contribution& from = (*Table)[x];
    Line& line = Lines[x];
    if (from.Alike != x) {
      const Line& alike = Lines[from.Alike];
      line.Of = alike.Of;
      line.Plain = alike.Plain;
      line.Shares = alike.Shares;
      continue;
    }
    line.Shares = shares;
    line.Plain = !MakeFloat(from, shares, line.First, 1, line.Of);
    shares += line.Reach;
  }
  return true;
}

/// Makes some columns of a few rows.
template <class Value>
class FloatRows::Runner {
 public:
  Runner(const FloatRows& rows, const Sample* const* from, int count, const PixelOrder& order,
         Sample* scratch)
      : Of(rows), Count(count), Order(order), Channels(rows.Pair->Channels), Step(rows.Pair->Source.Step) {
    for (int r = 0; r < Rows; ++r) From[r] = from[std::min(r, count - 1)] + rows.Lead;
    std::fill_n(Place, GroupPixels * MostStep, -1);
    for (int x = 0; x < GroupPixels; ++x)
      for (int c = 0; c < Channels; ++c)
        Place[x * Step + rows.Pair->Source.Offset[c] - rows.Lead] = (x * Channels + c) * Rows;
    Full = Step == Channels && std::is_sorted(Place, Place + GroupPixels * Step);
    const auto address = reinterpret_cast<Word>(scratch);
    Memory = reinterpret_cast<float*>(scratch + (VectorBytes - address % VectorBytes) % VectorBytes);
    Looked =
        reinterpret_cast<const float**>(Memory + std::ptrdiff_t{Of.Kept} * GroupFloats() + LineSums::Block);
  }
  void Run(Columns columns, Value* const* into) {
    for (std::int64_t x = columns.First; x < columns.End; x += GroupPixels) {
      const int pixels = int(std::min<std::int64_t>(GroupPixels, columns.End - x));
      for (int p = 0; p < pixels; ++p) Make(std::int32_t(x) + p, Samples[p][0]);
      Store(pixels, into, std::ptrdiff_t(x - columns.First) * Order.Count);
    }
  }

 private:
  std::ptrdiff_t GroupFloats() const { return std::ptrdiff_t{GroupPixels} * Channels * Rows; }

  /// Makes sure of the columns that a line looks at.
  void Need(const Line& line) {
    const std::int32_t first = line.Least / GroupPixels;
    const std::int32_t end = (line.First + line.Reach - 1) / GroupPixels + 1;
    if (end <= End) return;
    End = std::max(End, first);
    for (; End < end; ++End) Fill(End);
    First = first;
    for (std::int32_t group = First; group < End; ++group)
      for (int x = 0; x < GroupPixels; ++x)
        Looked[(group - First) * GroupPixels + x] =
            Memory + group % Of.Kept * GroupFloats() + std::ptrdiff_t{x} * Channels * Rows;
  }
  void Fill(std::int32_t group) {
    const std::int64_t at = std::int64_t{group} * GroupPixels * Step;
    const std::int64_t bytes = std::min<std::int64_t>(GroupPixels * Step, Of.RowBytes - at);
    TurnedGroup turned{{}, Step, Full, Place, Memory + group % Of.Kept * GroupFloats()};
    Sample rest[Rows][GroupPixels * MostStep];
    for (int r = 0; r < Rows; ++r) {
      turned.From[r] = From[r] + at;
      if (bytes == GroupPixels * Step) continue;
      // Nothing is read beyond the end of a row.
      std::fill(std::copy_n(turned.From[r], bytes, rest[r]), std::end(rest[r]), Sample(0));
      turned.From[r] = rest[r];
    }
    OnBestTarget<Turn>(static_cast<const TurnedGroup*>(&turned));
  }
  void Make(std::int32_t x, Sample* into) {
    const Line& line = Of.Lines[x];
    if (line.Reach > 0) Need(line);
    LineSums sums{};
    sums.Rows = line.Reach > 0 ? Looked + (line.First - First * GroupPixels) : Looked;
    sums.FirstRow = line.First;
    sums.RowCount = line.Reach;
    sums.LineCount = 1;
    sums.Of[0] = &(*Of.Table)[x];
    sums.Lines[0] = line.Of;
    sums.Shares = line.Shares;
    sums.Samples = std::ptrdiff_t{Channels} * Rows;
    sums.Into[0] = into;
    line.Plain ? SumPlainLine(sums, 0) : SumLines(sums);
  }
  /// Stores the pixels made last, each in its order.
  void Store(int pixels, Value* const* into, std::ptrdiff_t at) const {
    static constexpr Sample zeros[Rows] = {};
    const Sample* from[Halves][GroupPixels * MostChannels + BlockBytes];
    std::fill_n(from[0], Halves * std::size(from[0]), zeros);
    for (int p = 0; p < pixels; ++p)
      for (int place = 0; place < Order.Count; ++place)
        for (int half = 0; half < Halves; ++half)
          if (const int channel = Order.Channel[place]; channel != PixelOrder::Zero)
            from[half][p * Order.Count + place] = &Samples[p][channel][half * BlockBytes];
    for (int half = 0; half < Halves && half * BlockBytes < Count; ++half) {
      Value* rows[BlockBytes] = {};
      const int count = std::min(int(BlockBytes), Count - half * int(BlockBytes));
      for (int r = 0; r < count; ++r) rows[r] = into[half * BlockBytes + r] + at;
      const TurnedSamples<Value> turned{from[half], std::ptrdiff_t{pixels} * Order.Count, rows, count};
      OnBestTarget<TurnBack<Value>>(&turned);
    }
  }

  const FloatRows& Of;
  int Count;
  const PixelOrder& Order;
  int Channels, Step;
  bool Full;
  const Sample* From[Rows];
  std::int32_t Place[GroupPixels * MostStep];
  /// A ring of groups; First to End - 1 of them are there, the columns of which stand in Looked.
  float* Memory;
  const float** Looked;
  std::int32_t First = 0, End = 0;
  Sample Samples[GroupPixels][MostChannels][Rows];
};

void FloatRows::Run(const Sample* const* from, Sample* const* into, int rows, const PixelOrder& order,
                    Columns columns, Sample* scratch) const {
  Runner<Sample>(*this, from, rows, order, scratch).Run(columns, into);
}
void FloatRows::Run(const Sample* const* from, float* const* into, int rows, const PixelOrder& order,
                    Columns columns, Sample* scratch) const {
  Runner<float>(*this, from, rows, order, scratch).Run(columns, into);
}

}
