#include <utility>

#include "filters/oil_modes.h"
#include "filters/oil_rows.h"
#include "filters/packed_rows.h"
#include "image/targets.h"

// In two steps: which class has the most samples around each sample, and then the mean of that class's
// samples. The first carries counts from row to row and along the row; for the second one look at every
// sample around is cheap, since it is a comparison of bytes. The picture is done in strips of columns so
// narrow that what is counted in them stays in the processor's cache.

namespace zor {
namespace {

/// `Width` pixels of `Pixel` samples each, with Range pixels more to both sides. Of the samples around, only
/// those from First to Last lie in the picture.
struct StripShape {
  std::ptrdiff_t Width, Pixel, Range, First, Last;
  std::int32_t Levels;

  std::ptrdiff_t Samples() const { return Width * Pixel; }
  /// With some that don't count behind them, so that rows are whole vectors.
  std::ptrdiff_t Padded() const { return (Samples() + 63) / 64 * 64; }
  std::ptrdiff_t Around() const { return Padded() + 2 * Range * Pixel; }
};

/// Runs work with the range as a constant, so that the loops over a neighbourhood are unrolled.
template <class Work>
void ForRange(std::ptrdiff_t range, Work&& work) {
  [&]<int... Range>(std::integer_sequence<int, Range...>) {
    (void)((range == Range && (work(std::integral_constant<int, Range>{}), true)) || ...);
  }
  (std::make_integer_sequence<int, NearRange + 1>{});
}

/// Counts class by class in the 2 Range + 1 samples of each column, and around each sample.
template <int Range>
void CountClasses(StripShape shape, const Sample* entering, const Sample* leaving, Sample* columns,
                  Sample* __restrict modes, Sample* __restrict most) {
  const std::ptrdiff_t padded = shape.Padded(), around = shape.Around(), pixel = shape.Pixel;
  for (std::int32_t level = 0; level < shape.Levels; ++level) {
    const Sample name = Sample(level);
    Sample* column = columns + level * around;
    for (std::ptrdiff_t i = 0; i < around; ++i)
      column[i] = Sample(column[i] + (entering[i] == name) - (leaving[i] == name));
    for (std::ptrdiff_t i = 0; i < padded; ++i) {
      Sample count = 0;
      for (int k = 0; k <= 2 * Range; ++k) count = Sample(count + column[i + k * pixel]);
      // As masks, which every processor has for bytes, and no more than one comparison.
      const Sample larger = most[i] > count ? most[i] : count, kept = Sample(-(larger == most[i]));
      modes[i] = Sample((modes[i] & kept) | (name & ~kept));
      most[i] = larger;
    }
  }
}

/// For few classes: the columns of each class in a plane of their own, so that a class is counted for a
/// vector of columns at a time.
class ClassPlanes {
 public:
  static constexpr std::ptrdiff_t StripSamples = 2048;

  explicit ClassPlanes(const StripShape& shape)
      : Of(shape),
        Columns(NewBuffer(std::size_t(Of.Around() * Of.Levels))),
        Nothing(NewBuffer(std::size_t(Of.Around()))) {
    if (Nothing) std::fill_n(Nothing.get(), Of.Around(), Sample{255});
  }
  explicit operator bool() const { return Columns && Nothing; }

  /// Takes the classes of a row in and those of another out, or of none, and writes the modes and their
  /// counts.
  void Move(const Sample* entering, const Sample* leaving, Sample* modes, Sample* counts) const {
    std::fill_n(modes, Of.Padded(), Sample{0});
    std::fill_n(counts, Of.Padded(), Sample{0});
    const Sample* const none = Nothing.get();
    ForRange(Of.Range, [&](auto range) {
      OnBestTarget<CountClasses<range>>(Of, entering ? entering : none, leaving ? leaving : none,
                                        Columns.get(), modes, counts);
    });
  }

 private:
  StripShape Of;
  Buffer Columns, Nothing;
};

/// For many classes: those of a column side by side, so that they are counted in a vector.
class ColumnClasses {
 public:
  static constexpr std::ptrdiff_t StripSamples = 2048;

  explicit ColumnClasses(const StripShape& shape)
      : Of(shape),
        Classes((shape.Levels + Together - 1) / Together * Together),
        Memory(NewBuffer(std::size_t(((Of.Width + 2 * Of.Range + 1) * Of.Pixel + 1) * Classes + Together))) {
    void* first = Memory.get();
    std::size_t space = Together * 2;
    if (first) Columns = static_cast<Sample*>(std::align(Together, Together, first, space));
  }
  explicit operator bool() const { return Memory != nullptr; }

  void Move(const Sample* entering, const Sample* leaving, Sample* modes, Sample* counts) const {
    // A few columns at a time, so that they are near when the neighbourhoods get there.
    constexpr std::ptrdiff_t atATime = 16;
    std::fill_n(Around(), Of.Pixel * Classes, Sample{0});
    const std::ptrdiff_t width = Of.Width + 2 * Of.Range;
    const bool inRegisters = Of.Range <= 3 && CurrentTarget >= Target::AVX2;
    const int unit = inRegisters ? UnitInRegisters : 1;
    CountedColumns columns{Columns, Around(), None(), Classes, Of.Pixel, Of.Range, 0, 0};
    for (; columns.End < width; columns.First = columns.End) {
      columns.End = std::min(columns.First + atATime, width);
      Count(entering, unit, columns);
      Count(leaving, -unit, columns);
      inRegisters ? FindModesAVX2(columns, modes, counts) : FindModes(columns, modes, counts);
    }
  }

 private:
  static constexpr std::size_t Together = 64;

  Sample* None() const { return Columns + (Of.Width + 2 * Of.Range) * Of.Pixel * Classes; }
  Sample* Around() const { return None() + Classes; }
  void Count(const Sample* row, int unit, const CountedColumns& columns) const {
    const std::ptrdiff_t last = std::min(columns.End * Of.Pixel, Of.Last);
    for (std::ptrdiff_t i = std::max(columns.First * Of.Pixel, Of.First); row && i < last; ++i) {
      Sample& count = Columns[i * Classes + row[i]];
      count = Sample(count + unit);
    }
  }

  StripShape Of;
  std::ptrdiff_t Classes;
  Buffer Memory;
  Sample* Columns = nullptr;
};

/// Adds the samples of the wanted class among the 2 Range + 1 of one row from each place on.
template <int Range>
void AddOfClass(const Sample* classes, const Sample* values, std::ptrdiff_t pixel, const Sample* wanted,
                std::uint16_t* __restrict sums, std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) {
    std::uint16_t sum = sums[i];
    for (int k = 0; k <= 2 * Range; ++k) {
      const Sample is = Sample(-(classes[i + k * pixel] == wanted[i]));
      sum = std::uint16_t(sum + Sample(values[i + k * pixel] & is));
    }
    sums[i] = sum;
  }
}

void Divide(const std::uint16_t* sums, const Sample* counts, Sample* out, std::ptrdiff_t count) {
  // No fraction is so near below a whole number that a float would round it up: it is at least 1 / 255 below
  // one of at most 255.
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = Sample(std::int32_t(float(sums[i]) / float(counts[i])));
}

template <class Counts>
class OilStrip {
 public:
  OilStrip(const FilterCall& call, std::int32_t levels, std::int32_t range, std::int32_t first,
           std::int32_t width)
      : Call(call),
        Range(range),
        Left(std::max(first - range, 0)),
        Right(std::min(call.Source.Width - first, width + range) + first),
        Reading(PlanesOf(call.Of, call.Source, Left), PlanesOf(call.Of, call.Dest, Left), Right - Left),
        Writing(PlanesOf(call.Of, call.Source, first), PlanesOf(call.Of, call.Dest, first), width),
        Of{width,
           Reading.Count(),
           range,
           std::ptrdiff_t{Left - (first - range)} * Reading.Count(),
           std::ptrdiff_t{Right - (first - range)} * Reading.Count(),
           levels},
        Counted(Of),
        Values(NewBuffer(RowsKept() * std::size_t(Of.Around()))),
        Classes(NewBuffer(RowsKept() * std::size_t(Of.Around()))),
        Modes(NewBuffer(std::size_t(Of.Padded()))),
        Most(NewBuffer(std::size_t(Of.Padded()))),
        Result(NewBuffer(std::size_t(Of.Padded()))),
        Sums(NewBuffer(std::size_t(Of.Padded()) * sizeof(std::uint16_t))) {
    for (int value = 0; value < 256; ++value) ClassOf[value] = Sample(levels * value / 256);
    // The class of what lies outside; it is only asked for where there are fewer than 256.
    if (Classes) std::fill_n(Classes.get(), RowsKept() * std::size_t(Of.Around()), Sample{255});
  }
  explicit operator bool() const { return Counted && Values && Classes && Modes && Most && Result && Sums; }

  /// False when a row can't be reached.
  bool Run() {
    const std::int32_t height = Call.Source.Height;
    for (std::int32_t y = -Range; y < height; ++y) {
      const std::int32_t entering = y + Range, leaving = entering - 2 * Range - 1;
      if (entering < height && !Load(entering)) return false;
      Counted.Move(entering < height ? Row(Classes, entering) : nullptr,
                   leaving >= 0 ? Row(Classes, leaving) : nullptr, Modes.get(), Most.get());
      if (y >= 0 && !Write(y)) return false;
    }
    return true;
  }

 private:
  std::size_t RowsKept() const { return 2 * std::size_t(Range) + 2; }
  Sample* Row(const Buffer& rows, std::int32_t y) const {
    return rows.get() + std::size_t(y) % RowsKept() * std::size_t(Of.Around());
  }

  bool Load(std::int32_t y) const {
    Sample *values = Row(Values, y) + Of.First, *classes = Row(Classes, y) + Of.First;
    return WithRow(Call.Source, y, [&](Sample* row) {
      Reading.Load(row, values);
      for (std::ptrdiff_t i = 0; i < Of.Last - Of.First; ++i) classes[i] = ClassOf[values[i]];
    });
  }

  bool Write(std::int32_t y) const {
    return WithRow(Call.Dest, y, [&](Sample* row) {
      // A class of a single value is its own mean.
      if (Of.Levels == 256) return Writing.Store(Modes.get(), row);
      Writing.Write(row, Result.get(), [&](Sample* out) { WriteMeans(y, out); });
    });
  }

  void WriteMeans(std::int32_t y, Sample* out) const {
    auto* const sums = reinterpret_cast<std::uint16_t*>(Sums.get());
    std::fill_n(sums, Of.Padded(), std::uint16_t{0});
    const std::int32_t last = std::min(y + Range, Call.Source.Height - 1);
    for (std::int32_t row = std::max(y - Range, 0); row <= last; ++row)
      ForRange(Range, [&](auto range) {
        OnBestTarget<AddOfClass<range>>(static_cast<const Sample*>(Row(Classes, row)),
                                        static_cast<const Sample*>(Row(Values, row)), Of.Pixel,
                                        static_cast<const Sample*>(Modes.get()), sums, Of.Padded());
      });
    OnBestTarget<Divide>(static_cast<const std::uint16_t*>(sums), static_cast<const Sample*>(Most.get()), out,
                         Of.Samples());
  }

  const FilterCall& Call;
  std::int32_t Range, Left, Right;
  PackedRows Reading, Writing;
  StripShape Of;
  Counts Counted;
  Buffer Values, Classes, Modes, Most, Result, Sums;
  SampleTable ClassOf;
};

template <class Counts>
std::optional<bool> OilStrips(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  const std::int32_t width = std::int32_t(Counts::StripSamples) / call.In.Count;
  for (std::int32_t first = 0; first < call.Source.Width;
       first += std::min(width, call.Source.Width - first)) {
    OilStrip<Counts> strip(call, levels, range, first, std::min(width, call.Source.Width - first));
    if (!strip) return std::nullopt;
    if (!strip.Run()) return false;
  }
  return true;
}

}

std::optional<bool> OilNear(const FilterCall& call, std::int32_t levels, std::int32_t range) {
  // One by one, each class takes its time; side by side, 200 take little more than 50.
  constexpr std::int32_t few = 48;
  return levels <= few ? OilStrips<ClassPlanes>(call, levels, range)
                       : OilStrips<ColumnClasses>(call, levels, range);
}

}
