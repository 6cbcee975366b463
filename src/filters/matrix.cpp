#include <cmath>
#include <cstdlib>
#include <limits>
#include <optional>
#include <type_traits>

#include "filters/filters.h"
#include "filters/packed_rows.h"
#include "frame/host_services.h"
#include "image/arithmetic.h"
#include "image/targets.h"

namespace zor {
namespace {

constexpr std::int32_t MostRows = 50, Hole = 255;

/// A square of weights, row by row; what is left out of the sum weighs 0.
struct Matrix {
  std::int32_t Dimension, Delta;
  double ScaleFactor;
  std::int32_t Weight[MostRows * MostRows];

  std::int32_t Half() const { return Dimension / 2; }
  /// No sum is further from 0, delta included.
  std::int64_t Bound() const {
    std::int64_t sum = std::abs(std::int64_t{Delta});
    for (std::int32_t i = 0; i < Dimension * Dimension; ++i) sum += 255 * std::abs(std::int64_t{Weight[i]});
    return sum;
  }
};

Matrix MatrixOf(std::int32_t dimension, IntegerArray* array, std::int32_t delta, double scaleFactor) {
  Matrix matrix{std::max(dimension, 0), delta, scaleFactor, {}};
  const std::int32_t last = array ? std::min(RuntimeUBound(array), MostRows * MostRows - 1) : -1;
  for (std::int32_t i = 0; i <= last; ++i) {
    const std::int32_t weight = RuntimeDirectReadIntArray(array, i);
    matrix.Weight[i] = weight < Hole ? weight : 0;
  }
  return matrix;
}

Sample Scaled(double product) { return Clamp(Truncate(product)); }
Sample Scaled(std::int64_t sum, double scaleFactor) {
  return scaleFactor == 1.0 ? Sample(std::clamp<std::int64_t>(sum, 0, 255))
                            : Scaled(double(sum) * scaleFactor);
}

/// As many weights as are summed up at a time, or a few of them, each with the samples that it goes to.
constexpr int TapsAtATime = 9, FewTaps = 5;
template <class Sum>
struct Taps {
  const Sample* From[TapsAtATime];
  Sum Weight[TapsAtATime];
};

/// A Product holds the products of all these together.
template <class Sum, class Product, int Count>
void AddTaps(Sum* sums, Taps<Sum> taps, std::ptrdiff_t count) {
  using Wrapping = std::conditional_t<sizeof(Product) == 8, std::uint64_t, std::uint32_t>;
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    Wrapping sum = 0;
    for (int t = 0; t < Count; ++t) sum += Wrapping(taps.Weight[t]) * taps.From[t][i];
    sums[i] = Sum(sums[i] + Product(sum));
  }
}

template <class Sum>
void ClampSums(const Sum* sums, Sample* out, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = Sample(std::clamp<Sum>(sums[i], 0, 255));
}
/// Sums above `most` are 255 whatever they are.
void ScaleSumsWhole(const std::int16_t* sums, Sample* out, std::ptrdiff_t count, std::uint16_t factor,
                    std::int16_t most) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const std::uint16_t sum = std::uint16_t(std::clamp<std::int16_t>(sums[i], 0, most));
    out[i] = Sample(std::uint32_t{sum} * factor >> 16);
  }
}
template <class Sum, class Real>
void ScaleSums(const Sum* sums, Sample* out, std::ptrdiff_t count, Real scaleFactor) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const Real scaled = Real(sums[i]) * scaleFactor;
    // As Truncate and Clamp do it; what isn't a number is 0.
    out[i] = scaled > 0 ? Sample(std::int32_t(scaled < 255 ? scaled : 255)) : Sample{0};
  }
}

/// Whether scaled(sum) gives the same samples as the factor for all sums up to the bound. Either way samples
/// never fall as sums grow, so they agree if each of them begins at the same sum.
template <class Scale>
bool Agrees(double scaleFactor, std::int64_t bound, Scale&& scaled) {
  for (int sample = 1; sample < 256; ++sample) {
    std::int64_t below = 0, from = bound + 1;
    while (from - below > 1) {
      const std::int64_t middle = (below + from) / 2;
      (Scaled(double(middle) * scaleFactor) >= sample ? from : below) = middle;
    }
    if (scaled(below) >= sample) return false;
    if (from > bound) return true;
    if (scaled(from) < sample) return false;
  }
  return true;
}

/// A factor in single precision that agrees; 0 when none is found.
float SingleFactor(double scaleFactor, std::int64_t bound) {
  if (!(scaleFactor > 1e-6 && scaleFactor < 1e6) || bound >= 1 << 24) return 0;
  const float nearest = float(scaleFactor);
  for (const float factor : {nearest, std::nextafter(nearest, 2 * nearest)})
    if (Agrees(scaleFactor, bound, [&](std::int64_t sum) { return Scaled(double(float(sum) * factor)); }))
      return factor;
  return 0;
}
/// One of 16 bits behind the point.
std::uint16_t WholeFactor(double scaleFactor, std::int64_t bound) {
  if (!(scaleFactor > 0 && scaleFactor < 0.9999) || bound > std::numeric_limits<std::int16_t>::max())
    return 0;
  const auto down = std::int64_t(scaleFactor * 65536);
  for (const std::int64_t factor : {down, down + 1})
    if (Agrees(scaleFactor, bound,
               [&](std::int64_t sum) { return std::min<std::int64_t>(sum * factor >> 16, 255); }))
      return std::uint16_t(factor);
  return 0;
}

/// Sums of a type that holds them, a stretch of the row at a time. False when a row can't be reached; without
/// memory nothing, and nothing is done.
template <class Sum, class Product>
std::optional<bool> ConvolveRows(const FilterCall& call, const Matrix& matrix) {
  constexpr std::ptrdiff_t Stretch = 2048;
  const PackedRows packing(call);
  const std::int32_t dimension = matrix.Dimension, half = matrix.Half(), pixel = packing.Count();
  PackedBand band(call.Source, packing, half, std::max(dimension - 1 - half, 0), half);
  const Buffer result = NewBuffer(std::size_t(packing.Samples()));
  if (!band || !result) return std::nullopt;
  const std::uint16_t whole = sizeof(Sum) == 2 ? WholeFactor(matrix.ScaleFactor, matrix.Bound()) : 0;
  const auto most = std::int16_t(
      std::min(((256 << 16) - 1) / std::max(int{whole}, 1), int{std::numeric_limits<std::int16_t>::max()}));
  const float single = whole > 0 ? 0 : SingleFactor(matrix.ScaleFactor, matrix.Bound());
  alignas(64) Sum sums[Stretch];
  const auto convolve = [&](std::int32_t y, std::ptrdiff_t first, std::ptrdiff_t count) {
    std::fill_n(sums, count, Sum(matrix.Delta));
    Taps<Sum> taps;
    int some = 0;
    std::int64_t together = 0;
    const auto add = [&] {
      if (some == 0) return;
      const bool few = some <= FewTaps;
      for (; some < (few ? FewTaps : TapsAtATime); ++some) {
        taps.From[some] = taps.From[0];
        taps.Weight[some] = 0;
      }
      few ? OnBestTarget<AddTaps<Sum, Product, FewTaps>>(static_cast<Sum*>(sums), taps, count)
          : OnBestTarget<AddTaps<Sum, Product, TapsAtATime>>(static_cast<Sum*>(sums), taps, count);
      some = 0;
      together = 0;
    };
    for (std::int32_t j = 0; j < dimension; ++j)
      for (std::int32_t i = 0; i < dimension; ++i) {
        const std::int32_t weight = matrix.Weight[j * dimension + i];
        if (weight == 0) continue;
        const std::int64_t most = 255 * std::abs(std::int64_t{weight});
        if (some == TapsAtATime || together + most > std::numeric_limits<Product>::max()) add();
        together += most;
        taps.From[some] = band[y - half + j] + first + std::ptrdiff_t{i - half} * pixel;
        taps.Weight[some++] = Sum(weight);
      }
    add();
  };
  const auto clamp = [&](Sample* out, std::ptrdiff_t count) {
    const Sum* const of = sums;
    if (matrix.ScaleFactor == 1.0) return OnBestTarget<ClampSums<Sum>>(of, out, count);
    if constexpr (sizeof(Sum) == 2)
      if (whole > 0) return OnBestTarget<ScaleSumsWhole>(of, out, count, whole, most);
    single > 0 ? OnBestTarget<ScaleSums<Sum, float>>(of, out, count, single)
               : OnBestTarget<ScaleSums<Sum, double>>(of, out, count, matrix.ScaleFactor);
  };
  bool reached = true;
  for (std::int32_t y = 0; reached && y < call.Source.Height; ++y)
    reached = band.MoveTo(y) && WithRow(call.Dest, y, [&](Sample* row) {
                packing.Write(row, result.get(), [&](Sample* out) {
                  for (std::ptrdiff_t first = 0; first < packing.Samples(); first += Stretch) {
                    const std::ptrdiff_t count = std::min(Stretch, packing.Samples() - first);
                    convolve(y, first, count);
                    clamp(out + first, count);
                  }
                });
              });
  return reached;
}

/// One pixel after the other, each reading what those before it have left. False when a row can't be reached.
bool ConvolvePixels(const FilterCall& call, const Matrix& matrix) {
  const std::int32_t dimension = matrix.Dimension, half = matrix.Half();
  const std::int32_t lastColumn = call.Source.Width - 1, lastRow = call.Source.Height - 1;
  bool reached = true;
  ForPlaneCount(call.In.Count, [&](auto n) {
    for (std::int32_t y = 0; reached && y <= lastRow; ++y)
      for (std::int32_t x = 0; reached && x <= lastColumn; ++x) {
        std::int64_t sum[n];
        std::fill_n(sum, int(n), matrix.Delta);
        for (std::int32_t j = 0; reached && j < dimension; ++j)
          reached = WithRow(call.Source, std::clamp(y - half + j, 0, lastRow), [&](Sample* row) {
            const PlaneRow<n> in(row, call.In);
            for (std::int32_t i = 0; i < dimension; ++i)
              for (int c = 0; c < n; ++c)
                sum[c] += std::int64_t{matrix.Weight[j * dimension + i]} *
                          in(c, std::clamp(x - half + i, 0, lastColumn));
          });
        reached = reached && WithRow(call.Dest, y, [&](Sample* row) {
                    const PlaneRow<n> out(row, call.Out);
                    for (int c = 0; c < n; ++c) out(c, x) = Scaled(sum[c], matrix.ScaleFactor);
                  });
      }
  });
  return reached;
}

std::optional<bool> ConvolveRows(const FilterCall& call, const Matrix& matrix) {
  using std::int16_t, std::int32_t, std::int64_t;
  constexpr std::int64_t narrow = std::numeric_limits<int16_t>::max(),
                         middle = std::numeric_limits<int32_t>::max();
  const std::int64_t bound = matrix.Bound();
  const bool narrowProducts =
      std::all_of(std::begin(matrix.Weight), std::end(matrix.Weight),
                  [&](std::int32_t weight) { return 255 * std::abs(std::int64_t{weight}) <= narrow; });
  if (bound <= narrow) return ConvolveRows<int16_t, int16_t>(call, matrix);
  if (bound <= middle)
    return narrowProducts ? ConvolveRows<int32_t, int16_t>(call, matrix)
                          : ConvolveRows<int32_t, int32_t>(call, matrix);
  return ConvolveRows<int64_t, int64_t>(call, matrix);
}

}

PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix,
                        Integer delta, Double scaleFactor) {
  if (matrixDimension > MostRows) return nullptr;
  const Matrix of = MatrixOf(matrixDimension, matrix, delta, scaleFactor);
  return RunFilter(self, dest, {}, [&](const FilterCall& call) {
    if (!call.SharesPixels)
      if (const auto reached = ConvolveRows(call, of)) return *reached;
    return ConvolvePixels(call, of);
  });
}

PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix,
                        Integer delta) {
  return ApplyMatrix(self, dest, matrixDimension, matrix, delta, 1.0);
}

PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix) {
  return ApplyMatrix(self, dest, matrixDimension, matrix, 0, 1.0);
}

}
