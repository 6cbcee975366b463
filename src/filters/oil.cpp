#include <limits>

#include "filters/filters.h"
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
struct Narrow {
  using ColumnCount = std::uint8_t;
  using ColumnSum = std::uint16_t;
  using Key = std::uint16_t;
  using Sum = std::uint16_t;
  static constexpr std::int32_t MostRange = 7;
};
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

/// False without memory, and nothing is done.
template <class Types, bool SingleValues>
bool OilRows(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  using Count = typename Types::ColumnCount;
  using ColumnSum = typename Types::ColumnSum;
  const PackedRows packing(call);
  // Whole vectors; what is added has no samples, and so no key of any.
  const std::ptrdiff_t classes = (levels + 31) / 32 * 32, samples = packing.Samples(),
                       pixel = packing.Count();
  const std::int64_t cells = (std::int64_t{samples} + pixel) * classes;
  if (cells > std::numeric_limits<std::ptrdiff_t>::max() / std::int64_t(sizeof(ColumnSum))) return false;
  const Buffer counts = NewBuffer(std::size_t(cells) * sizeof(Count)),
               columnSums = NewBuffer(SingleValues ? 1 : std::size_t(cells) * sizeof(ColumnSum)),
               line = NewBuffer(std::size_t(samples)), result = NewBuffer(std::size_t(samples));
  if (!counts || !columnSums || !line || !result) return false;
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
  return true;
}

template <class Types>
bool OilRows(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  return levels == 256 ? OilRows<Types, true>(call, levels, range)
                       : OilRows<Types, false>(call, levels, range);
}

bool Oil(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  if (call.SharesPixels) return false;
  // Beyond the picture there is nothing.
  range = std::min(range, std::max(call.Source.Width, call.Source.Height));
  if (range <= Narrow::MostRange) return OilRows<Narrow>(call, levels, range);
  if (range <= Middle::MostRange) return OilRows<Middle>(call, levels, range);
  return OilRows<Wide>(call, levels, range);
}

/// The samples of one class in a neighbourhood.
struct Class {
  std::int64_t Count, Sum;
};

/// The mean of the class with the most samples, the lowest of them on a tie.
Sample MeanOfMost(const Class* classes, std::int32_t levels) {
  const Class* best = classes;
  for (std::int32_t j = 1; j < levels; ++j)
    if (classes[j].Count > best->Count) best = &classes[j];
  return Sample(best->Sum / best->Count);
}

/// One pixel after the other, each reading what those before it have left.
void OilPixels(const FilterCall& call, std::int32_t levels, std::int64_t range) {
  const std::int64_t width = call.Source.Width, height = call.Source.Height;
  ForPlaneCount(call.In.Count, [&](auto n) {
    Class classes[n][256];
    bool reached = true;
    for (std::int64_t y = 0; reached && y < height; ++y)
      for (std::int64_t x = 0; reached && x < width; ++x) {
        for (auto& plane : classes) std::fill_n(plane, levels, Class{});
        const std::int64_t bottom = std::min(y + range, height - 1), right = std::min(x + range, width - 1);
        for (std::int64_t row = std::max<std::int64_t>(y - range, 0); reached && row <= bottom; ++row)
          reached = WithRow(call.Source, std::int32_t(row), [&](Sample* samples) {
            const PlaneRow<n> in(samples, call.In);
            for (std::int64_t column = std::max<std::int64_t>(x - range, 0); column <= right; ++column)
              for (int c = 0; c < n; ++c) {
                const std::int32_t sample = in(c, std::ptrdiff_t(column));
                Class& of = classes[c][levels * sample / 256];
                ++of.Count;
                of.Sum += sample;
              }
          });
        reached = reached && WithRow(call.Dest, std::int32_t(y), [&](Sample* samples) {
                    const PlaneRow<n> out(samples, call.Out);
                    for (int c = 0; c < n; ++c) out(c, std::ptrdiff_t(x)) = MeanOfMost(classes[c], levels);
                  });
      }
  });
}

}

PictureZOR* OilFilter(PictureZOR* self, PictureZOR* dest, Integer levels, Integer range) {
  if (dest && GroupOf(DataOf(self)) != Group::None && DataOf(dest).PixelSize != DataOf(self).PixelSize)
    return nullptr;
  return RunFilter(self, dest, {}, [&](const FilterCall& call) {
    const std::int32_t classes = std::clamp(levels, 1, 256), reach = std::max(range, 0);
    if (!Oil(call, classes, reach)) OilPixels(call, classes, reach);
  });
}

}
