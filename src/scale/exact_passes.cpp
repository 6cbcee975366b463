#include "scale/exact_passes.h"

#include <algorithm>

#include "image/targets.h"

namespace zor {
namespace {

// Eight sums side by side: of one pixel of a few rows, all channels of it.
constexpr int Lanes = 8;
class DoubleLanes {
 public:
  double operator[](int lane) const { return Parts[lane / PartLanes][lane % PartLanes]; }
  void Set(int lane, double value) { Parts[lane / PartLanes][lane % PartLanes] = value; }
  void Add(const DoubleLanes& terms, double weight) {
    for (int p = 0; p < Lanes / PartLanes; ++p) Parts[p] += weight * terms.Parts[p];
  }

 private:
  // Wider vectors come out as single lanes where a processor doesn't have them.
  static constexpr int PartLanes = 2;
  using Part [[gnu::vector_size(PartLanes * sizeof(double))]] = double;
  Part Parts[Lanes / PartLanes] = {};
};

/// Source pixels that are held widened at a time.
constexpr int Window = 128;

constexpr double RedShare = 0.3, GreenShare = 0.59, BlueShare = 0.11;

constexpr int LanesOf(int channels) { return channels == 3 ? 4 : channels == 5 ? 8 : channels; }

/// What the loop over a few rows works on.
struct RowsInHand {
  const Sample* const* From;
  Sample* const* Into;
  int Rows;
  const ScalePair& Pair;
  const PixelOrder& Order;
  const ContributionTable& Table;
  Columns Of;
};

/// Pixels of a few rows as doubles, lane r * LanesOf(channels) + c being channel c of row r. Luma has three
/// terms a pixel, other channels the first.
template <int Terms>
class WidePixels {
 public:
  WidePixels(const RowsInHand& rows, std::int32_t end) : Rows(rows), Pair(rows.Pair), SourceEnd(end) {}

  /// Makes sure of pixels from `first` on, up to `last` if so many fit.
  void Need(std::int32_t first, std::int32_t last) {
    if (first >= First && last < End) return;
    if (first >= First && first < End && last - first >= Window) return;
    First = first;
    End = std::min(SourceEnd, first + std::min(Window, SourceEnd - first));
    for (std::int32_t x = First; x < End; ++x)
      for (int r = 0; r < Rows.Rows; ++r) Widen(Rows.From[r], x, r * LanesOf(Pair.Channels));
  }
  bool Has(std::int32_t x) const { return x >= First && x < End; }
  const DoubleLanes* At(std::int32_t x) const { return Of[x - First]; }

 private:
  void Widen(const Sample* row, std::int32_t x, int lane) {
    const Sample* pixel = row + std::ptrdiff_t{x} * Pair.Source.Step;
    DoubleLanes* terms = Of[x - First];
    const auto sample = [&](int plane) { return double(pixel[Pair.Source.Offset[plane]]); };
    if constexpr (Terms == 3) {
      terms[0].Set(lane, sample(0) * RedShare);
      terms[1].Set(lane, sample(1) * GreenShare);
      terms[2].Set(lane, sample(2) * BlueShare);
      if (Pair.Channels == 2) terms[0].Set(lane + 1, sample(3));
    } else {
      for (int c = 0; c < Pair.Channels; ++c) terms[0].Set(lane + c, sample(c));
    }
  }

  const RowsInHand& Rows;
  const ScalePair& Pair;
  std::int32_t SourceEnd, First = 0, End = 0;
  DoubleLanes Of[Window][Terms] = {};
};

/// Stores one pixel of each row, zeros included.
void StorePixel(const RowsInHand& rows, std::int32_t x, const DoubleLanes& sums, float divisor) {
  for (int r = 0; r < rows.Rows; ++r) {
    Sample channels[5];
    for (int c = 0; c < rows.Pair.Channels; ++c)
      channels[c] = ExactQuotient(sums[r * LanesOf(rows.Pair.Channels) + c], divisor);
    Sample* pixel = rows.Into[r] + std::ptrdiff_t{x - rows.Of.First} * rows.Order.Count;
    for (int b = 0; b < rows.Order.Count; ++b)
      pixel[b] = rows.Order.Channel[b] == PixelOrder::Zero ? 0 : channels[rows.Order.Channel[b]];
  }
}

template <int Terms>
void SumRows(const RowsInHand* rows) {
  std::int32_t end = 0;
  for (std::int32_t x = rows->Of.First; x < rows->Of.End; ++x)
    if (const Contribution& line = rows->Table[x]; line.Count > 0) end = std::max(end, line.Last() + 1);
  WidePixels<Terms> wide(*rows, end);
  for (std::int32_t x = rows->Of.First; x < rows->Of.End; ++x) {
    const Contribution& line = rows->Table[x];
    DoubleLanes sums;
    for (std::int32_t i = 0; i < line.Count;) {
      wide.Need(line.PixelAt(i), line.Last());
      for (; i < line.Count && wide.Has(line.PixelAt(i)); ++i) {
        const double weight = line.Entries[i].Weight;
        const DoubleLanes* terms = wide.At(line.PixelAt(i));
        for (int t = 0; t < Terms; ++t) sums.Add(terms[t], weight);
      }
    }
    StorePixel(*rows, x, sums, line.Sum);
  }
}
constexpr auto SumPlanes = SumRows<1>, SumLuma = SumRows<3>;

void AddScaled(double* sums, const Sample* row, int count, double weight) {
  for (int i = 0; i < count; ++i) sums[i] += weight * double(row[i]);
}

void StoreQuotients(const double* sums, double divisor, int count, Sample* into) {
  for (int i = 0; i < count; ++i) {
    const double quotient = sums[i] / divisor;
    const double least = quotient > 0.0 ? quotient : 0.0;
    into[i] = Sample(std::int32_t(least < 255.0 ? least : 255.0));
  }
}

}

Sample ExactQuotient(double sum, float divisor) {
  Sample sample;
  StoreQuotients(&sum, divisor, 1, &sample);
  return sample;
}

int RowsTogether(int channels) { return Lanes / LanesOf(channels); }

void ExactHorizontal(const Sample* const* from, Sample* const* into, int rows, const ScalePair& pair,
                     const PixelOrder& order, const ContributionTable& table, Columns columns) {
  const RowsInHand inHand{from, into, rows, pair, order, table, columns};
  if (pair.Luma)
    OnBestTarget<SumLuma>(&inHand);
  else
    OnBestTarget<SumPlanes>(&inHand);
}

void ExactSums::Add(const Sample* row, float weight) {
  OnBestTarget<AddScaled>(&Sums[0], row, Count, double(weight));
}
void ExactSums::Store(float divisor, Sample* into) const {
  OnBestTarget<StoreQuotients>(static_cast<const double*>(Sums), double(divisor), Count, into);
}

}
