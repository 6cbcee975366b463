#include "filters/oil_rows.h"
#include "filters/packed_rows.h"
#include "image/targets.h"

// Each sample has the classes of the 2 range + 1 samples of its column counted, which two samples bring up to
// date from row to row. The classes of a whole neighbourhood are the sum of such columns: along a row one is
// added and one taken away, all classes at a time, whatever the range. In the same pass the largest of the
// keys is looked for, each made up of the count and, below it, of the class counted down from 255: so the
// lowest of those with the most samples wins.

namespace zor {
namespace {

/// The integers that hold what comes together up to a range.
struct Middle {
  using ColumnCount = std::uint8_t;
  using ColumnSum = std::uint16_t;
  using Key = std::uint32_t;
  using Sum = std::uint32_t;
  static constexpr std::int32_t MostRange = 127;
};
struct Wide {
  using ColumnCount = std::uint32_t;
  using ColumnSum = std::uint64_t;
  using Key = std::uint64_t;
  using Sum = std::uint64_t;
};

/// A neighbourhood's classes plus a column's and less another's. The largest key.
template <class To, class From>
[[gnu::always_inline]] inline To Slide(To* keys, const From* entering, const From* leaving,
                                       std::ptrdiff_t count, int shift) {
  To most = 0;
  for (std::ptrdiff_t j = 0; j < count; ++j) {
    keys[j] = To(keys[j] + (To(To(entering[j]) - To(leaving[j])) << shift));
    most = std::max(most, keys[j]);
  }
  return most;
}

/// The columns of a row of samples: `Classes` counts and, unless a class has a single value, sums each.
template <class Types>
struct Columns {
  const typename Types::ColumnCount* Count;
  const typename Types::ColumnSum* Sum;
  std::ptrdiff_t Classes, Width, Pixel;
};

/// One plane of a row. `keys` and `sums` are those of no samples at first. Column `Width` is empty.
template <class Types, bool SingleValues>
void OilAlong(Columns<Types> columns, std::ptrdiff_t plane, std::ptrdiff_t range, typename Types::Key* keys,
              typename Types::Sum* sums, Sample* out) {
  const std::ptrdiff_t width = columns.Width, classes = columns.Classes;
  for (std::ptrdiff_t x = -range; x < width; ++x) {
    const std::ptrdiff_t entering = std::min(x + range, width), leaving = x > range ? x - range - 1 : width;
    const std::ptrdiff_t in = (entering * columns.Pixel + plane) * classes,
                         from = (leaving * columns.Pixel + plane) * classes;
    const auto most = Slide(keys, columns.Count + in, columns.Count + from, classes, 8);
    if constexpr (!SingleValues) Slide(sums, columns.Sum + in, columns.Sum + from, classes, 0);
    if (x < 0) continue;
    const std::int32_t best = 255 - std::int32_t(most & 255);
    if constexpr (SingleValues)
      out[x * columns.Pixel + plane] = Sample(best);
    else
      out[x * columns.Pixel + plane] = Sample(sums[best] / (most >> 8));
  }
}

template <class Types, bool SingleValues>
std::optional<bool> OilRows(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  using Count = typename Types::ColumnCount;
  using ColumnSum = typename Types::ColumnSum;
  const PackedRows packing(call);
  // Whole vectors; what is added has no samples, and so no key of any.
  const std::ptrdiff_t classes = (levels + 31) / 32 * 32, samples = packing.Samples(),
                       pixel = packing.Count();
  const std::int64_t cells = (std::int64_t{samples} + pixel) * classes;
  const Buffer counts = NewBuffer(cells, sizeof(Count)),
               columnSums = NewBuffer(SingleValues ? 1 : cells, sizeof(ColumnSum)),
               line = NewBuffer(std::size_t(samples)), result = NewBuffer(std::size_t(samples));
  if (!counts || !columnSums || !line || !result) return std::nullopt;
  Count* const count = reinterpret_cast<Count*>(counts.get());
  ColumnSum* const sum = reinterpret_cast<ColumnSum*>(columnSums.get());

  const auto add = [&](std::int64_t y, std::int32_t times) {
    return WithRow(call.Source, std::int32_t(y), [&](Sample* row) {
      const Sample* in = packing.Packed(row, line.get());
      for (std::ptrdiff_t i = 0; i < samples; ++i) {
        const std::ptrdiff_t cell = i * classes + levels * in[i] / 256;
        count[cell] = Count(count[cell] + times);
        if constexpr (!SingleValues) sum[cell] = ColumnSum(sum[cell] + ColumnSum(times * in[i]));
      }
    });
  };
  const std::int64_t height = call.Source.Height;
  bool reached = true;
  for (std::int64_t y = 0; reached && y < std::min<std::int64_t>(range, height); ++y) reached = add(y, 1);
  for (std::int64_t y = 0; reached && y < height; ++y) {
    if (y > range) reached = add(y - range - 1, -1);
    if (y + range < height) reached = reached && add(y + range, 1);
    reached = reached && WithRow(call.Dest, std::int32_t(y), [&](Sample* row) {
                packing.Write(row, result.get(), [&](Sample* out) {
                  for (std::ptrdiff_t plane = 0; plane < pixel; ++plane) {
                    typename Types::Key keys[256] = {};
                    typename Types::Sum sums[256] = {};
                    for (std::int32_t j = 0; j < levels; ++j) keys[j] = typename Types::Key(255 - j);
                    const Columns<Types> columns{count, sum, classes, samples / pixel, pixel};
                    OnBestTarget<OilAlong<Types, SingleValues>>(columns, plane, std::ptrdiff_t{range},
                                                                keys + 0, sums + 0, out);
                  }
                });
              });
  }
  return reached;
}

template <class Types>
std::optional<bool> OilRows(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  return levels == 256 ? OilRows<Types, true>(call, levels, range)
                       : OilRows<Types, false>(call, levels, range);
}

}

std::optional<bool> OilFar(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  // Beyond the picture there is nothing.
  range = std::min(range, std::max(call.Source.Width, call.Source.Height));
  return range <= Middle::MostRange ? OilRows<Middle>(call, levels, range)
                                    : OilRows<Wide>(call, levels, range);
}

}
