#include "geometry/shears.h"

#include <algorithm>
#include <cmath>

#include "geometry/sample_parts.h"
#include "image/byte_blocks.h"
#include "image/walk.h"

// Where the planes fill the pixel in both pictures alike, all samples of a row are one run of bytes: a
// sample's neighbour is Step bytes away, and in a column it is below. What a sample gives away is a
// multiplication by whole numbers then, checked for all 256 samples; where none fits, or the layouts differ,
// lines are sheared sample by sample.

namespace zor {
namespace {

/// Samples along a row or a column, of which some are in hand.
struct Line {
  Sample* First;
  std::ptrdiff_t Stride;
  /// The index of the first one.
  std::int32_t FirstIndex = 0;
  Sample& operator[](std::int64_t i) const { return First[(i - FirstIndex) * Stride]; }
};

/// What stands behind the last sample of a line, which gave `taken`.
Sample LastOf(const Shift& shift, Sample background, Sample taken) {
  return Sample(Truncate(background - (background * shift.Part - taken)));
}

/// Writes samples first .. end - 1 of a line that comes of `length` samples.
void ShearLine(const Line& in, std::int32_t length, const Line& out, std::int32_t first, std::int32_t end,
               const Shift& shift, Sample background) {
  for (std::int32_t x = first; x < end; ++x) {
    const std::int64_t i = std::int64_t{x} - shift.Whole;
    if (i < 0 || i > length) {
      out[x] = background;
      continue;
    }
    const Sample taken = PartOf(shift.Part, i > 0 ? in[i - 1] : background);
    out[x] =
        i < length ? Sample(in[i] - (PartOf(shift.Part, in[i]) - taken)) : LastOf(shift, background, taken);
  }
}

/// The background as it stands in a pixel.
std::array<Sample, 5> BackgroundPixel(const Shear& shear) {
  std::array<Sample, 5> pixel{};
  for (int c = 0; c < shear.Out.Count; ++c)
    pixel[std::size_t(shear.Out.Offset[c] - FirstOffset(shear.Out))] = shear.Background[c];
  return pixel;
}

/// Fills count bytes with copies of a pixel.
void FillPixels(Sample* into, std::ptrdiff_t count, const std::array<Sample, 5>& pixel, int step) {
  std::copy_n(pixel.begin(), std::min<std::ptrdiff_t>(step, count), into);
  for (std::ptrdiff_t i = step; i < count; ++i) into[i] = into[i - step];
}

void MultiplyRow(const Sample* in, Sample* parts, std::ptrdiff_t count, Multiplier multiplier) {
  for (std::ptrdiff_t i = 0; i < count; ++i) parts[i] = Sample(multiplier(in[i]));
}

/// `taken` is what each sample is given.
void ShiftParts(const Sample* in, const Sample* given, const Sample* taken, Sample* out,
                std::ptrdiff_t count) {
  for (std::ptrdiff_t i = 0; i < count; ++i) out[i] = Sample(in[i] - given[i] + taken[i]);
}

/// Rows as one run of bytes.
class RowRuns {
 public:
  explicit RowRuns(const Shear& shear)
      : Of(shear),
        Step(shear.In.Step),
        Pixel(BackgroundPixel(shear)),
        Filled(NewBuffer(std::size_t(shear.Into.Width) * std::size_t(Step) + 1)),
        Parts(NewBuffer((std::size_t(shear.From.Width) + 1) * std::size_t(Step))) {
    if (Filled) FillPixels(Filled.get(), std::ptrdiff_t{shear.Into.Width} * Step, Pixel, Step);
  }
  explicit operator bool() const { return Filled && Parts; }

  void ShearRow(const Sample* from, Sample* into, const Shift& shift) const {
    from += FirstOffset(Of.In);
    into += FirstOffset(Of.Out);
    const std::int64_t width = Of.From.Width, bound = Of.Into.Width;
    FillParts(from, shift);
    const std::int64_t first = std::clamp<std::int64_t>(shift.Whole, 0, bound);
    const std::int64_t end = std::clamp<std::int64_t>(shift.Whole + width, 0, bound);
    Fill(into, 0, first);
    if (first < end) {
      const std::ptrdiff_t skipped = std::ptrdiff_t(first - shift.Whole) * Step;
      OnBestTarget<ShiftParts>(from + skipped, static_cast<const Sample*>(Parts.get() + skipped + Step),
                               static_cast<const Sample*>(Parts.get() + skipped), into + first * Step,
                               std::ptrdiff_t(end - first) * Step);
    }
    Fill(into, end, bound);
    const std::int64_t last = shift.Whole + width;
    if (last >= 0 && last < bound)
      for (int c = 0; c < Step; ++c)
        into[last * Step + c] = LastOf(shift, Pixel[c], Parts[std::size_t(width * Step + c)]);
  }

 private:
  /// The part of the background, and behind it those of all samples.
  void FillParts(const Sample* from, const Shift& shift) const {
    const SampleTable table = PartsOf(shift.Part);
    // Some compilers see a sixth sample coming.
    for (int c = 0; c < std::min(Step, int(Pixel.size())); ++c) Parts[c] = table[Pixel[c]];
    const std::ptrdiff_t count = std::ptrdiff_t{Of.From.Width} * Step;
    Sample* parts = Parts.get() + Step;
    Multiplier multiplier;
    if (FindMultiplier(shift.Part, table, multiplier))
      return OnBestTarget<MultiplyRow>(from, parts, count, multiplier);
    for (std::ptrdiff_t i = 0; i < count; ++i) parts[i] = table[from[i]];
  }
  void Fill(Sample* into, std::int64_t first, std::int64_t end) const {
    if (first < end)
      std::memcpy(into + first * Step, Filled.get() + first * Step,
                  std::size_t(end - first) * std::size_t(Step));
  }

  const Shear& Of;
  int Step;
  std::array<Sample, 5> Pixel;
  Buffer Filled, Parts;
};

/// Rows of a shear's target, of some columns.
struct Piece {
  std::int32_t Left, Right, Top, Bottom;
};

using Lanes = std::uint16_t __attribute__((vector_size(32)));

/// 16 bytes side by side, down a run of rows. `taken` is what the first row is given, and at the end what the
/// last one gives.
void ShearLanes(const Sample* from, std::ptrdiff_t fromStride, Sample* into, std::ptrdiff_t intoStride,
                std::ptrdiff_t rows, const std::uint16_t* high, const std::uint16_t* low, Sample* taken) {
  Lanes highs, lows;
  std::memcpy(&highs, high, sizeof highs);
  std::memcpy(&lows, low, sizeof lows);
  Block before = LoadBlock(taken);
  for (; rows > 0; --rows, from += fromStride, into += intoStride) {
    const Block in = LoadBlock(from);
    const Lanes samples = __builtin_convertvector(in, Lanes);
    const Block given = __builtin_convertvector((samples * highs + ((samples * lows) >> 8)) >> 8, Block);
    StoreBlock(into, in - given + before);
    before = given;
  }
  StoreBlock(taken, before);
}

/// Columns side by side that move by the same whole pixels go through vectors, 16 bytes at a time from the
/// left. A vector that reaches beyond them is right on its own columns only; what it writes into the next
/// ones is written again with theirs.
class ColumnRuns {
 public:
  ColumnRuns(const Shear& shear, const Shift* shifts)
      : Of(shear),
        Shifts(shifts),
        Step(shear.In.Step),
        Pixel(BackgroundPixel(shear)),
        RowBytes(std::ptrdiff_t{shear.From.Width} * Step),
        Memory(NewBuffer((std::size_t(RowBytes) + BlockBytes) * (2 * sizeof(std::uint16_t) + 2))) {
    if (!Memory) return;
    const std::size_t entries = std::size_t(RowBytes) + BlockBytes;
    High = reinterpret_cast<std::uint16_t*>(Memory.get());
    Low = High + entries;
    Filled = reinterpret_cast<Sample*>(Low + entries);
    Single = Filled + entries;
    FillPixels(Filled, RowBytes, Pixel, Step);
    for (std::int32_t x = 0; x < shear.From.Width; ++x) {
      Multiplier multiplier{};
      Single[x] = !FindMultiplier(shifts[x].Part, PartsOf(shifts[x].Part), multiplier);
      std::fill_n(High + std::ptrdiff_t{x} * Step, Step, multiplier.High);
      std::fill_n(Low + std::ptrdiff_t{x} * Step, Step, multiplier.Low);
    }
  }
  explicit operator bool() const { return Memory != nullptr; }

  /// The end of the columns from x on that are done together; x itself for one that is done alone.
  std::int32_t EndOfRun(std::int32_t x, std::int32_t right) const {
    while (x < right && !Single[x]) {
      ++x;
      if (x < right && Shifts[x].Whole != Shifts[x - 1].Whole) break;
    }
    return x;
  }

  /// Columns x .. end - 1 of a piece.
  void ShearRun(const RowRun& from, std::int32_t firstRow, const RowRun& into, const Piece& piece,
                std::int32_t x, std::int32_t end) const {
    const std::ptrdiff_t last = std::ptrdiff_t{end} * Step;
    for (std::ptrdiff_t at = std::ptrdiff_t{x} * Step; at < last; at += BlockBytes) {
      if (at + BlockBytes <= RowBytes)
        ShearBlock(from, firstRow, into, piece, Shifts[x].Whole, at);
      else
        for (std::ptrdiff_t i = at; i < last; ++i) ShearByte(from, firstRow, into, piece, i);
    }
  }

 private:
  void ShearBlock(const RowRun& from, std::int32_t firstRow, const RowRun& into, const Piece& piece,
                  std::int32_t shift, std::ptrdiff_t at) const {
    const std::int64_t height = Of.From.Height, top = piece.Top, bottom = piece.Bottom;
    const std::int64_t first = std::clamp<std::int64_t>(shift, top, bottom);
    const std::int64_t end = std::clamp<std::int64_t>(shift + height, top, bottom);
    const Sample* in = from.First + FirstOffset(Of.In) + at;
    Sample* out = into.First + FirstOffset(Of.Out) + at;
    const Block filled = LoadBlock(Filled + at);
    for (std::int64_t y = top; y < first; ++y) StoreBlock(out + (y - top) * into.Stride, filled);
    if (first == bottom) return;
    Sample taken[BlockBytes];
    const std::int64_t before = first - shift - 1;
    const Block given = before < 0         ? filled
                        : before >= height ? Block{}
                                           : LoadBlock(in + (before - firstRow) * from.Stride);
    StoreBlock(taken, given);
    for (std::ptrdiff_t i = 0; i < BlockBytes; ++i)
      taken[i] = Sample(Multiplier{High[at + i], Low[at + i]}(taken[i]));
    if (first < end)
      OnBestTarget<ShearLanes>(in + (before + 1 - firstRow) * from.Stride, from.Stride,
                               out + (first - top) * into.Stride, into.Stride, std::ptrdiff_t(end - first),
                               static_cast<const std::uint16_t*>(High + at),
                               static_cast<const std::uint16_t*>(Low + at), taken);
    for (std::int64_t y = end; y < bottom; ++y) StoreBlock(out + (y - top) * into.Stride, filled);
    if (end == shift + height && end >= top && end < bottom)
      for (std::ptrdiff_t i = 0; i < BlockBytes && at + i < RowBytes; ++i)
        out[(end - top) * into.Stride + i] = LastOf(Shifts[(at + i) / Step], Filled[at + i], taken[i]);
  }
  void ShearByte(const RowRun& from, std::int32_t firstRow, const RowRun& into, const Piece& piece,
                 std::ptrdiff_t at) const {
    ShearLine({from.First + FirstOffset(Of.In) + at, from.Stride, firstRow}, Of.From.Height,
              {into.First + FirstOffset(Of.Out) + at, into.Stride, piece.Top}, piece.Top, piece.Bottom,
              Shifts[at / Step], Filled[at]);
  }

  const Shear& Of;
  const Shift* Shifts;
  int Step;
  std::array<Sample, 5> Pixel;
  std::ptrdiff_t RowBytes;
  Buffer Memory;
  std::uint16_t *High, *Low;
  Sample *Filled, *Single;
};

/// Calls work(rows of the source, index of the first, rows of the target, piece) for all pieces of the
/// target. A piece's rows, and the source's rows that they come of, are in both windows, and it is small
/// enough for the caches. Pieces go from left to right and then down.
template <class Work>
bool ForPieces(const Shear& shear, const Shift* shifts, Work&& work) {
  // In memory the caches bound a piece, on a file the windows do: the source's rows spread with the columns.
  const bool mapped = shear.From.IsMapping || shear.Into.IsMapping;
  const std::int32_t atOnce = MostRowsTogether(shear.From);
  const std::int32_t rows =
      std::min({mapped ? std::max(atOnce / 2, 1) : 128, atOnce, MostRowsTogether(shear.Into)});
  const std::int32_t mostColumns = mapped ? shear.From.Width : 2048 / shear.In.Step;
  Piece piece{};
  for (std::int32_t y = 0; y < shear.Into.Height; y = piece.Bottom) {
    piece.Top = y;
    piece.Bottom = std::min(shear.Into.Height, y + rows);
    for (std::int32_t x = 0; x < shear.From.Width; x = piece.Right) {
      piece.Left = x;
      std::int64_t least = shifts[x].Whole, most = least;
      for (piece.Right = x; piece.Right < shear.From.Width && piece.Right - x < mostColumns; ++piece.Right) {
        const std::int64_t whole = shifts[piece.Right].Whole;
        const std::int64_t low = std::min(least, whole), high = std::max(most, whole);
        if (shear.From.IsMapping && rows + high - low + 1 > atOnce) break;
        least = low;
        most = high;
      }
      // At least one row, though it may not be needed.
      const std::int64_t lastRow = shear.From.Height - 1;
      const std::int64_t first = std::clamp<std::int64_t>(piece.Top - most - 1, 0, lastRow);
      const std::int64_t last = std::clamp<std::int64_t>(piece.Bottom - 1 - least, first, lastRow);
      const bool reached = WithRows(
          {shear.From, std::int32_t(first), std::int32_t(last - first + 1)},
          {shear.Into, piece.Top, piece.Bottom - piece.Top},
          [&](const RowRun& from, const RowRun& into) { work(from, std::int32_t(first), into, piece); });
      if (!reached) return false;
    }
  }
  return true;
}

}

Shift ShiftBy(double distance) {
  const double whole = std::floor(distance);
  return {Truncate(whole), distance - whole};
}

bool ShearRows(const Shear& shear, const Shift* shifts, std::int32_t height) {
  Walk rows(From(shear.From), Into(shear.Into));
  if (FillPixelsAlike(shear.In, shear.Out)) {
    const RowRuns runs(shear);
    return runs && rows.Rows(height, [&](std::int32_t y, const Sample* from, Sample* into) {
      runs.ShearRow(from, into, shifts[y]);
    });
  }
  return rows.Rows(height, [&](std::int32_t y, Sample* from, Sample* into) {
    for (int c = 0; c < shear.In.Count; ++c)
      ShearLine({from + shear.In.Offset[c], shear.In.Step}, shear.From.Width,
                {into + shear.Out.Offset[c], shear.Out.Step}, 0, shear.Into.Width, shifts[y],
                shear.Background[c]);
  });
}

bool ShearColumns(const Shear& shear, const Shift* shifts) {
  const auto shearColumn = [&](const RowRun& from, std::int32_t firstRow, const RowRun& into,
                               const Piece& piece, std::int32_t x) {
    for (int c = 0; c < shear.In.Count; ++c)
      ShearLine(
          {from.First + shear.In.Offset[c] + std::ptrdiff_t{x} * shear.In.Step, from.Stride, firstRow},
          shear.From.Height,
          {into.First + shear.Out.Offset[c] + std::ptrdiff_t{x} * shear.Out.Step, into.Stride, piece.Top},
          piece.Top, piece.Bottom, shifts[x], shear.Background[c]);
  };
  if (!FillPixelsAlike(shear.In, shear.Out))
    return ForPieces(shear, shifts,
                     [&](const RowRun& from, std::int32_t firstRow, const RowRun& into, const Piece& piece) {
                       for (std::int32_t x = piece.Left; x < piece.Right; ++x)
                         shearColumn(from, firstRow, into, piece, x);
                     });
  const ColumnRuns runs(shear, shifts);
  return runs &&
         ForPieces(shear, shifts,
                   [&](const RowRun& from, std::int32_t firstRow, const RowRun& into, const Piece& piece) {
                     for (std::int32_t x = piece.Left, end; x < piece.Right; x = std::max(end, x + 1)) {
                       end = runs.EndOfRun(x, piece.Right);
                       end > x ? runs.ShearRun(from, firstRow, into, piece, x, end)
                               : shearColumn(from, firstRow, into, piece, x);
                     }
                   });
}

}
