#include <cstdlib>
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

Sample Scaled(std::int64_t sum, double scaleFactor) {
  return scaleFactor == 1.0 ? Sample(std::clamp<std::int64_t>(sum, 0, 255))
                            : Clamp(Truncate(double(sum) * scaleFactor));
}

/// As many weights as are summed up at a time, each with the samples that it goes to.
constexpr int TapsAtATime = 9;
template <class Sum>
struct Taps {
  const Sample* From[TapsAtATime];
  Sum Weight[TapsAtATime];
};

template <class Sum>
void AddTaps(Sum* sums, Taps<Sum> taps, std::ptrdiff_t count) {
  using Wrapping = std::conditional_t<sizeof(Sum) == 8, std::uint64_t, std::uint32_t>;
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    Wrapping sum = Wrapping(sums[i]);
    for (int t = 0; t < TapsAtATime; ++t) sum += Wrapping(taps.Weight[t]) * taps.From[t][i];
    sums[i] = Sum(sum);
  }
}

template <class Sum>
void ClampSums(const Sum* sums, Sample* out, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = Sample(std::clamp<Sum>(sums[i], 0, 255));
}
template <class Sum>
void ScaleSums(const Sum* sums, Sample* out, std::ptrdiff_t count, double scaleFactor) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const double scaled = double(sums[i]) * scaleFactor;
    // As Truncate and Clamp do it; what isn't a number is 0.
    out[i] = scaled > 0 ? Sample(std::int32_t(scaled < 255 ? scaled : 255)) : Sample{0};
  }
}

/// Sums of a type that holds them, a stretch of the row at a time. False without memory, and nothing is done.
template <class Sum>
bool ConvolveRows(const FilterCall& call, const Matrix& matrix) {
  constexpr std::ptrdiff_t Stretch = 2048;
  const PackedRows packing(call);
  const std::int32_t dimension = matrix.Dimension, half = matrix.Half(), pixel = packing.Count();
  PackedBand band(call.Source, packing, half, std::max(dimension - 1 - half, 0), half);
  const Buffer result = NewBuffer(std::size_t(packing.Samples()));
  if (!band || !result) return false;
  alignas(64) Sum sums[Stretch];
  const auto convolve = [&](std::int32_t y, std::ptrdiff_t first, std::ptrdiff_t count) {
    std::fill_n(sums, count, Sum(matrix.Delta));
    Taps<Sum> taps;
    int some = 0;
    const auto add = [&] {
      for (; some % TapsAtATime; ++some) {
        taps.From[some] = taps.From[0];
        taps.Weight[some] = 0;
      }
      if (some) OnBestTarget<AddTaps<Sum>>(static_cast<Sum*>(sums), taps, count);
      some = 0;
    };
    for (std::int32_t j = 0; j < dimension; ++j)
      for (std::int32_t i = 0; i < dimension; ++i) {
        const std::int32_t weight = matrix.Weight[j * dimension + i];
        if (weight == 0) continue;
        taps.From[some] = band[y - half + j] + first + std::ptrdiff_t{i - half} * pixel;
        taps.Weight[some++] = Sum(weight);
        if (some == TapsAtATime) add();
      }
    add();
  };
  bool reached = true;
  for (std::int32_t y = 0; reached && y < call.Source.Height; ++y)
    reached = band.MoveTo(y) && WithRow(call.Dest, y, [&](Sample* row) {
                packing.Write(row, result.get(), [&](Sample* out) {
                  for (std::ptrdiff_t first = 0; first < packing.Samples(); first += Stretch) {
                    const std::ptrdiff_t count = std::min(Stretch, packing.Samples() - first);
                    convolve(y, first, count);
                    if (matrix.ScaleFactor == 1.0)
                      OnBestTarget<ClampSums<Sum>>(static_cast<const Sum*>(sums), out + first, count);
                    else
                      OnBestTarget<ScaleSums<Sum>>(static_cast<const Sum*>(sums), out + first, count,
                                                   matrix.ScaleFactor);
                  }
                });
              });
  return true;
}

/// One pixel after the other, each reading what those before it have left.
void ConvolvePixels(const FilterCall& call, const Matrix& matrix) {
  const std::int32_t dimension = matrix.Dimension, half = matrix.Half();
  const std::int32_t lastColumn = call.Source.Width - 1, lastRow = call.Source.Height - 1;
  ForPlaneCount(call.In.Count, [&](auto n) {
    bool reached = true;
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
}

bool Convolve(const FilterCall& call, const Matrix& matrix) {
  const std::int64_t bound = matrix.Bound();
  if (call.SharesPixels) return false;
  if (bound <= std::numeric_limits<std::int16_t>::max()) return ConvolveRows<std::int16_t>(call, matrix);
  if (bound <= std::numeric_limits<std::int32_t>::max()) return ConvolveRows<std::int32_t>(call, matrix);
  return ConvolveRows<std::int64_t>(call, matrix);
}

}

PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix,
                        Integer delta, Double scaleFactor) {
  if (matrixDimension > MostRows) return nullptr;
  const Matrix of = MatrixOf(matrixDimension, matrix, delta, scaleFactor);
  return RunFilter(self, dest, {}, [&](const FilterCall& call) {
    if (!Convolve(call, of)) ConvolvePixels(call, of);
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
