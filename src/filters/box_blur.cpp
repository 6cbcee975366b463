#include "filters/box_mean.h"
#include "filters/filters.h"
#include "filters/packed_rows.h"
#include "image/arithmetic.h"
#include "image/targets.h"

// A moving mean. Down the columns the sums of a whole row are carried from row to row; along a row one sum a
// plane is carried from pixel to pixel. Either way a sample costs an addition, a subtraction and a division
// by multiplication, whatever the radius.

namespace zor {
namespace {

/// The source's rows, packed. If what is written may show in the source they come from a copy of it, since
/// the sums are only right while they lose what they once got.
class SourceRows {
 public:
  SourceRows(const FilterCall& call, const PackedRows& packing)
      : Of(call.Source),
        Packing(packing),
        Copies(call.SharesPixels),
        Line(NewBuffer(2, packing.Samples())),
        Copy(NewBuffer(Copies ? Of.Height : 0, packing.Samples())) {}
  explicit operator bool() const { return Line && (Copy || !Copies); }

  /// Before the first row is asked for. False when a row can't be reached.
  bool Begin() {
    bool reached = true;
    for (std::int32_t y = 0; Copies && reached && y < Of.Height; ++y)
      reached = WithRow(Of, y, [&](Sample* row) { Packing.Load(row, Copied(y)); });
    return reached;
  }

  /// Calls work(samples of row y). False when the row can't be reached.
  template <class Work>
  bool With(std::int64_t y, Work&& work) {
    if (Copies) return work(static_cast<const Sample*>(Copied(y))), true;
    return WithRow(Of, std::int32_t(y), [&](Sample* row) { work(Packing.Packed(row, Line.get())); });
  }
  /// The same with two rows, of which the first is the upper one.
  template <class Work>
  bool With(std::int64_t upper, std::int64_t lower, Work&& work) {
    if (Copies)
      return work(static_cast<const Sample*>(Copied(upper)), static_cast<const Sample*>(Copied(lower))), true;
    Sample *const first = Line.get(), *const second = first + Packing.Samples();
    const RowSpan between{Of, std::int32_t(upper), std::int32_t(lower - upper + 1)};
    // So far apart that a window would move too often, they take one each.
    if (Of.IsMapping && between.Count > RowsAtOnce(Of) / 2)
      return WithRow(Of, between.First, [&](Sample* row) { Packing.Load(row, first); }) &&
             WithRow(Of, std::int32_t(lower), [&](Sample* row) { work(first, Packing.Packed(row, second)); });
    return WithRows(between, [&](const RowRun& rows) {
      work(Packing.Packed(rows[0], first), Packing.Packed(rows[between.Count - 1], second));
    });
  }

 private:
  Sample* Copied(std::int64_t y) const { return Copy.get() + y * Packing.Samples(); }

  PictureData& Of;
  const PackedRows& Packing;
  bool Copies;
  Buffer Line, Copy;
};

/// How often place i of `count` is met from -r to r, what lies beyond an end counting as the end.
std::int64_t TimesMet(std::int64_t i, std::int64_t count, std::int64_t r) {
  const std::int64_t first = i == 0 ? -r : i, last = i == count - 1 ? r : std::min(i, r);
  return std::max<std::int64_t>(last - first + 1, 0);
}

template <class Sum>
void AddTimes(Sum* sums, const Sample* row, Sum times, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) sums[i] = Sum(sums[i] + times * row[i]);
}
template <class Sum>
void Divide(const Sum* sums, Sample* out, std::ptrdiff_t count, BoxMean<Sum> mean) {
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = mean(sums[i]);
}
/// Moves the sums on by a row, and divides them.
template <class Sum>
void MoveOn(Sum* sums, const Sample* entering, const Sample* leaving, Sample* out, std::ptrdiff_t count,
            BoxMean<Sum> mean) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    const Sum sum = Sum(sums[i] + entering[i] - leaving[i]);
    sums[i] = sum;
    out[i] = mean(sum);
  }
}

/// The sums of the columns over 2r + 1 rows.
template <class Sum>
class ColumnSums {
 public:
  ColumnSums(std::ptrdiff_t samples, std::int64_t height, std::int64_t r, const BoxMean<Sum>& mean)
      : Samples(samples), Height(height), Radius(r), Mean(mean), Memory(NewBuffer(samples, sizeof(Sum))) {}
  explicit operator bool() const { return Memory != nullptr; }

  /// Writes the means around row y; y is 0 first, then one more each time.
  bool MoveTo(std::int64_t y, SourceRows& source, Sample* out) {
    if (y > 0)
      return source.With(std::max<std::int64_t>(y - 1 - Radius, 0), std::min(y + Radius, Height - 1),
                         [&](const Sample* leaving, const Sample* entering) {
                           OnBestTarget<MoveOn<Sum>>(Sums(), entering, leaving, out, Samples, Mean);
                         });
    std::fill_n(Sums(), Samples, Sum{0});
    bool reached = true;
    for (std::int64_t row = 0; reached && row < Height && row <= Radius; ++row)
      reached = source.With(row, [&](const Sample* samples) {
        OnBestTarget<AddTimes<Sum>>(Sums(), samples, Sum(TimesMet(row, Height, Radius)), Samples);
      });
    if (reached) OnBestTarget<Divide<Sum>>(static_cast<const Sum*>(Sums()), out, Samples, Mean);
    return reached;
  }

 private:
  Sum* Sums() const { return reinterpret_cast<Sum*>(Memory.get()); }

  std::ptrdiff_t Samples;
  std::int64_t Height, Radius;
  BoxMean<Sum> Mean;
  Buffer Memory;
};

/// Lanes that a row's sums are made in.
constexpr std::ptrdiff_t Lanes = 8;
template <class Sum>
struct SumLanes {
  typedef Sum Vector __attribute__((vector_size(Lanes * sizeof(Sum))));
};

/// Adds to each lane the one `By` lanes before it, where there is one.
template <int By, class Vector>
void AddShifted(Vector& v) {
  constexpr auto lane = [](int j) { return j < By ? j : j - By + int(Lanes); };
  const Vector none{};
  [&]<std::size_t... J>(std::index_sequence<J...>) { v += __builtin_shufflevector(none, v, lane(int(J))...); }
  (std::make_index_sequence<Lanes>{});
}
/// Repeats the last N lanes over all: by way of one half, which machines without a free shuffle do well.
template <int N, class Vector>
void RepeatLast(Vector& v) {
  constexpr auto lane = [](int j) { return int(Lanes) - N + j % N; };
  [&]<std::size_t... J>(std::index_sequence<J...>) {
    if constexpr (N <= 4) {
      v = __builtin_shufflevector(v, v, (4 + int(J) % 4)...);
      v = __builtin_shufflevector(v, v, (J < 4 ? lane(int(J)) - 4 : int(J))...);
      v = __builtin_shufflevector(v, v, (J < 4 ? int(J) : lane(int(J)))...);
    } else {
      v = __builtin_shufflevector(v, v, lane(int(J))...);
    }
  }
  (std::make_index_sequence<Lanes>{});
}

/// The means along a row, from the sums before its first pixel and what enters and leaves at each. Reads on
/// up to a whole number of lanes.
template <class Sum, int N>
void MeansAlong(const Sample* entering, const Sample* leaving, std::array<Sum, 5> before, Sample* out,
                std::ptrdiff_t count, BoxMean<Sum> mean) {
  constexpr std::ptrdiff_t Stretch = 2048;
  Sum sums[Stretch];
  typename SumLanes<Sum>::Vector last;
  for (int j = 0; j < Lanes; ++j) last[j] = before[std::size_t(j % N)];
  for (std::ptrdiff_t first = 0; first < count; first += Stretch) {
    const std::ptrdiff_t some = std::min(Stretch, count - first);
    for (std::ptrdiff_t i = 0; i < some; i += Lanes) {
      typename SumLanes<Sum>::Vector v;
      for (int j = 0; j < Lanes; ++j) v[j] = Sum(entering[first + i + j] - leaving[first + i + j]);
      AddShifted<N>(v);
      if constexpr (2 * N < Lanes) AddShifted<2 * N>(v);
      if constexpr (4 * N < Lanes) AddShifted<4 * N>(v);
      v += last;
      std::memcpy(sums + i, &v, sizeof v);
      last = v;
      RepeatLast<N>(last);
    }
    Divide<Sum>(sums, out + first, some, mean);
  }
}

/// A row with room for its repeated ends.
template <class Sum>
class ExtendedRow {
 public:
  ExtendedRow(std::int32_t width, int planes, std::int64_t r)
      : Width(width),
        Reach(std::ptrdiff_t(std::min<std::int64_t>(width, r))),
        Radius(r),
        Pixel(planes),
        Memory(NewBuffer((Width + 2 * std::int64_t{Reach} + 1) * Pixel + Lanes, 1)) {}
  explicit operator bool() const { return Memory != nullptr; }

  Sample* Row() const { return Memory.get() + (Reach + 1) * Pixel; }

  /// Means along the row. Beyond its width the radius makes no difference but to how often the ends count.
  void Means(Sample* out, const BoxMean<Sum>& mean) const {
    Sample *first = Row(), *end = first + Width * Pixel;
    for (std::ptrdiff_t i = 1; i <= Reach + 1; ++i) std::copy_n(first, Pixel, first - i * Pixel);
    for (std::ptrdiff_t i = 0; i < Reach; ++i) std::copy_n(end - Pixel, Pixel, end + i * Pixel);
    const Sample *entering = first + Reach * Pixel, *leaving = first - (Reach + 1) * Pixel;
    std::array<Sum, 5> before{};
    for (int c = 0; c < Pixel; ++c) {
      Sum sum = Sum(leaving[c] - entering[c]);
      for (std::ptrdiff_t x = 0; x < Width && x <= Radius; ++x)
        sum = Sum(sum + Sum(TimesMet(x, Width, Radius)) * first[x * Pixel + c]);
      before[std::size_t(c)] = sum;
    }
    ForPlaneCount(Pixel, [&](auto n) {
      OnBestTarget<MeansAlong<Sum, n>>(entering, leaving, before, out, Width * n, mean);
    });
  }

 private:
  std::ptrdiff_t Width, Reach;
  std::int64_t Radius;
  int Pixel;
  Buffer Memory;
};

/// False when a row can't be reached. Without memory nothing is done.
template <class Sum>
bool Blur(const FilterCall& call, std::int64_t r, bool vertical, bool horizontal) {
  const PackedRows packing(call);
  const BoxMean<Sum> mean(2 * r + 1);
  const std::int32_t height = call.Source.Height;
  SourceRows source(call, packing);
  ColumnSums<Sum> columns(packing.Samples(), height, r, mean);
  const ExtendedRow<Sum> line(call.Source.Width, packing.Count(), horizontal ? r : 0);
  const Buffer result = NewBuffer(std::size_t(packing.Samples()));
  if (!source || !columns || !line || !result) return true;

  const auto along = [&](Sample* row) {
    packing.Write(row, result.get(), [&](Sample* out) { line.Means(out, mean); });
  };
  const auto store = [&](Sample* row) { packing.Store(line.Row(), row); };
  // The rows go along only after all have gone down, which shows where they overlap.
  const bool later = vertical && horizontal && call.SharesPixels;
  bool reached = source.Begin();
  for (std::int32_t y = 0; reached && y < height; ++y) {
    reached = vertical ? columns.MoveTo(y, source, line.Row()) : source.With(y, [&](const Sample* row) {
      std::copy_n(row, packing.Samples(), line.Row());
    });
    reached = reached && (horizontal && !later ? WithRow(call.Dest, y, along) : WithRow(call.Dest, y, store));
  }
  for (std::int32_t y = 0; later && reached && y < height; ++y)
    reached = WithRow(call.Dest, y, [&](Sample* row) {
      packing.LoadDest(row, line.Row());
      along(row);
    });
  return reached;
}

/// Whether two pictures have the same samples in the same places.
bool SamePixels(PictureData& a, PictureData& b) {
  if (a.Width != b.Width || a.Height != b.Height || GroupOf(a) != GroupOf(b)) return false;
  const PlaneList inA = PlanesOf(GroupOf(a), a), inB = PlanesOf(GroupOf(b), b);
  bool same = true;
  const bool reached = Walk(From(a), From(b)).Rows(a.Height, [&](std::int32_t, Sample* rowA, Sample* rowB) {
    for (int c = 0; c < inA.Count; ++c)
      for (std::ptrdiff_t x = 0; same && x < a.Width; ++x)
        same = rowA[inA.Offset[c] + x * inA.Step] == rowB[inB.Offset[c] + x * inB.Step];
  });
  return same && reached;
}

}

PictureZOR* BoxBlurFilter(PictureZOR* self, PictureZOR* dest, double radius, Boolean vertical,
                          Boolean horizontal) {
  const FilterRules rules{.InPlace = false, .Writes = vertical || horizontal};
  return RunFilter(self, dest, rules, [&](const FilterCall& call) {
    // One sample is its own mean.
    const std::int64_t r = Truncate(radius), n = 2 * r + 1;
    if (r < 1) return Blur<std::uint16_t>(call, 0, false, false);
    if (BoxMean<std::uint16_t>::Holds(n)) return Blur<std::uint16_t>(call, r, vertical, horizontal);
    if (BoxMean<std::uint32_t>::Holds(n)) return Blur<std::uint32_t>(call, r, vertical, horizontal);
    return Blur<std::uint64_t>(call, r, vertical, horizontal);
  });
}

PictureZOR* BoxBlurFilter(PictureZOR* self, PictureZOR* dest, double radius, Integer iterations,
                          Boolean vertical, Boolean horizontal) {
  PictureZOR* current = Locked(self);
  // A truncated mean of unequal samples is less than the largest of them, so passes end in an even picture,
  // which no further pass changes. A factory is asked for every pass all the same.
  bool settled = false;
  for (Integer i = 0; i < iterations && current && !settled; ++i) {
    PictureZOR* blurred = BoxBlurFilter(current, dest, radius, vertical, horizontal);
    settled =
        i >= 1 && blurred && !HasFactory(DataOf(blurred)) && SamePixels(DataOf(current), DataOf(blurred));
    Unlock(current);
    current = blurred;
    dest = nullptr;
  }
  return current;
}

}
