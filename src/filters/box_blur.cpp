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
        Line(NewBuffer(std::size_t(packing.Samples()))),
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
void Subtract(Sum* sums, const Sample* row, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) sums[i] = Sum(sums[i] - row[i]);
}
template <class Sum>
void Divide(const Sum* sums, Sample* out, std::ptrdiff_t count, BoxMean<Sum> mean) {
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = mean(sums[i]);
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
    bool reached = true;
    const auto add = [&](std::int64_t row, std::int64_t times) {
      reached = reached && source.With(row, [&](const Sample* samples) {
        OnBestTarget<AddTimes<Sum>>(Sums(), samples, Sum(times), Samples);
      });
    };
    if (y == 0) {
      std::fill_n(Sums(), Samples, Sum(Mean.Bias));
      for (std::int64_t row = 0; row < Height && row <= Radius; ++row)
        add(row, TimesMet(row, Height, Radius));
    } else {
      reached = source.With(std::max<std::int64_t>(y - 1 - Radius, 0), [&](const Sample* samples) {
        OnBestTarget<Subtract<Sum>>(Sums(), samples, Samples);
      });
      add(std::min(y + Radius, Height - 1), 1);
    }
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

/// Means along a row, whose first and last pixel are repeated over `reach` pixels to the left and reach + 1
/// to the right of it. Beyond the width of the row r makes no difference but to how often they count.
template <class Sum, int N>
void MeansAlong(const Sample* row, Sample* out, std::ptrdiff_t width, std::ptrdiff_t reach, std::int64_t r,
                BoxMean<Sum> mean) {
  Sum sums[N];
  for (int c = 0; c < N; ++c) {
    sums[c] = Sum(mean.Bias);
    for (std::ptrdiff_t x = 0; x < width && x <= r; ++x)
      sums[c] = Sum(sums[c] + Sum(TimesMet(x, width, r)) * row[x * N + c]);
  }
  const Sample *leaving = row - reach * N, *entering = row + (reach + 1) * N;
  for (std::ptrdiff_t i = 0; i < width * N; i += N)
    for (int c = 0; c < N; ++c) {
      out[i + c] = mean(sums[c]);
      sums[c] = Sum(sums[c] + entering[i + c] - leaving[i + c]);
    }
}

/// The same for rows that r doesn't reach beyond, in vectors: the sum of a stretch is the difference between
/// two of the sums of all samples up to a place, even where those have run over. Such a sum is the one 32
/// pixels before and four sums of eight, so no step waits for the one before, and vectors are loaded as they
/// were stored. 32 pixels before `begin`, where the row extended by r pixels begins, are zero, and so are
/// those before `eights` and `sums`.
template <class Sum, int N>
void MeansByDifference(const Sample* begin, Sample* out, Sum* eights, Sum* sums, std::ptrdiff_t width,
                       std::ptrdiff_t r, BoxMean<Sum> mean) {
  for (std::ptrdiff_t i = 0; i < (width + 2 * r) * N; ++i)
    eights[i] = Sum(begin[i] + begin[i - N] + begin[i - 2 * N] + begin[i - 3 * N] + begin[i - 4 * N] +
                    begin[i - 5 * N] + begin[i - 6 * N] + begin[i - 7 * N]);
  for (std::ptrdiff_t i = 0; i < (width + 2 * r) * N; ++i)
    sums[i] = Sum(sums[i - 32 * N] + eights[i] + eights[i - 8 * N] + eights[i - 16 * N] + eights[i - 24 * N]);
  const Sum* const last = sums + 2 * r * N;
  for (std::ptrdiff_t i = 0; i < width * N; ++i) out[i] = mean(Sum(last[i] - sums[i - N] + mean.Bias));
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
        Memory(NewBuffer(Samples(), 1)),
        Eights(NewBuffer(Samples(), sizeof(Sum))),
        Sums(NewBuffer(Samples(), sizeof(Sum))) {}
  explicit operator bool() const { return Memory && Eights && Sums; }

  Sample* Row() const { return Memory.get() + (Before + Reach) * Pixel; }

  void Means(Sample* out, const BoxMean<Sum>& mean) const {
    Sample *first = Row(), *end = first + Width * Pixel;
    for (std::ptrdiff_t i = 1; i <= Reach; ++i) std::copy_n(first, Pixel, first - i * Pixel);
    for (std::ptrdiff_t i = 0; i <= Reach; ++i) std::copy_n(end - Pixel, Pixel, end + i * Pixel);
    ForPlaneCount(Pixel, [&](auto n) {
      if constexpr (sizeof(Sum) <= 4)
        if (Reach == Radius)
          return OnBestTarget<MeansByDifference<Sum, n>>(
              static_cast<const Sample*>(Memory.get() + Before * n), out, At(Eights), At(Sums), Width, Reach,
              mean);
      OnBestTarget<MeansAlong<Sum, n>>(static_cast<const Sample*>(first), out, Width, Reach, Radius, mean);
    });
  }

 private:
  static constexpr std::ptrdiff_t Before = 32;

  std::int64_t Samples() const {
    return (std::int64_t{Before} + Width + std::int64_t{2} * Reach + 1) * Pixel;
  }
  Sum* At(const Buffer& buffer) const { return reinterpret_cast<Sum*>(buffer.get()) + Before * Pixel; }

  std::ptrdiff_t Width, Reach;
  std::int64_t Radius;
  int Pixel;
  Buffer Memory, Eights, Sums;
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
