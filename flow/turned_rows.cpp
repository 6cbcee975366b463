#include "turned_rows.h"

#include <algorithm>
#include <utility>

#include "band_chain.h"
#include "conveyor.h"
#include "failure.h"
#include "spool.h"

namespace picturezor::flow {

namespace {

/// Bytes of the strips of the source that are turned at the same time, and of a band of the result, if the
/// picture isn't smaller than a multiple of that.
constexpr std::int64_t StripsBytes = 96 << 20, BandBytes = 24 << 20;
constexpr std::int64_t StripsPart = 2, BandPart = 8;
/// Runs of so many pixels stand together in the result, at least.
constexpr std::int64_t FewestRows = 16;
/// What is given back goes by blocks.
constexpr std::int64_t Block = 4096;

}

/// A strip of rows of the source stands in the spool as it lies in the result: as columns of all rows where
/// rows become columns, otherwise as rows in their place.
struct TurnedRows::Strips {
  Shape Stored, Upright;
  int Orientation = 1;
  std::int64_t PixelBytes = 1, RowsOfStrip = 1;
  std::unique_ptr<Spool> Kept;
  bool ReadOnce = false;

  bool Exchanges() const { return Orientation >= 5; }
  RowRange Strip(std::int64_t i) const {
    return {i * RowsOfStrip, std::min<std::int64_t>((i + 1) * RowsOfStrip, Stored.Height)};
  }
  /// The first of the rows or columns that a strip becomes.
  std::int64_t PlaceOf(RowRange strip) const {
    return Orientation == 5 || Orientation == 8 ? strip.First : Stored.Height - strip.End;
  }
  /// Where its bytes begin in the spool.
  std::int64_t StartOf(RowRange strip) const {
    return (Exchanges() ? strip.First : PlaceOf(strip)) * Stored.Width * PixelBytes;
  }
  /// Turns packed rows of the source, which are lost, into `into`; gives where they are.
  std::span<const std::uint8_t> Turn(std::span<std::uint8_t> rows, std::span<std::uint8_t> into) const;
};

std::span<const std::uint8_t> TurnedRows::Strips::Turn(std::span<std::uint8_t> rows,
                                                       std::span<std::uint8_t> into) const {
  const std::int64_t rowBytes = Stored.Width * PixelBytes;
  const auto count = std::int32_t(std::int64_t(rows.size()) / rowBytes);
  const Picture strip(MemoryBlock::Over(rows), Stored.Width, count, Stored.Of, std::int32_t(rowBytes));
  if (!strip.Valid()) throw files::Failure("not enough memory to turn a picture");
  switch (Orientation) {
    case 3: strip.Rotate180(); return rows;
    case 4: strip.VMirror(); return rows;
    case 5:
    case 7: strip.HMirror(); break;
    default: break;
  }
  const Picture turned(MemoryBlock::Over(into.first(rows.size())), count, Stored.Width, Stored.Of,
                       std::int32_t(count * PixelBytes));
  const bool clockwise = Orientation == 6 || Orientation == 7;
  if (!turned.Valid() || !(clockwise ? strip.Rotate270(turned) : strip.Rotate90(turned)))
    throw files::Failure("not enough memory to turn a picture");
  return into.first(rows.size());
}

TurnedRows::TurnedRows(const RowSource& source, int orientation, const files::StoreOptions& stores,
                       int threads, files::Progress& progress)
    : Of(std::make_shared<Strips>()) {
  Strips& strips = *Of;
  strips.Stored = strips.Upright = source.Of;
  strips.Orientation = orientation;
  if (strips.Exchanges()) {
    std::swap(strips.Upright.Width, strips.Upright.Height);
    if (strips.Upright.Density) std::swap(strips.Upright.Density->X, strips.Upright.Density->Y);
  }
  strips.PixelBytes = BytesPerPixel(source.Of.Of);
  const std::int64_t rowBytes = source.Of.Width * strips.PixelBytes;
  const std::int64_t most =
      std::min({StripsBytes, stores.MemoryLimit / 2, rowBytes * source.Of.Height / StripsPart}) /
      (2 * (threads + 2));
  strips.RowsOfStrip = std::min<std::int64_t>(std::max(most / rowBytes, FewestRows), source.Of.Height);
  strips.Kept =
      std::make_unique<Spool>(files::PictureSize{source.Of.Width, source.Of.Height, source.Of.Of}, stores);

  struct Job {
    RowRange Rows;
    Bytes Samples, Turned;
  };
  files::Conveyor<Job> work(threads, [&strips, rowBytes](Job& job, int) {
    const auto bytes = std::size_t(job.Rows.Count() * rowBytes);
    if (strips.Exchanges()) job.Turned.resize(job.Samples.size());
    strips.Kept->Write(strips.StartOf(job.Rows),
                       strips.Turn(std::span(job.Samples).first(bytes), job.Turned));
  });
  const std::unique_ptr<Rows> rows = source.From(0);
  progress.Begin("reading", source.Of.Height);
  std::unique_ptr<Job> spare;
  for (std::int64_t i = 0; strips.Strip(i).Count() > 0; ++i) {
    if (!spare) spare = std::make_unique<Job>();
    spare->Rows = strips.Strip(i);
    spare->Samples.resize(std::size_t(strips.RowsOfStrip * rowBytes));
    ReadRows(*rows, spare->Samples.data(), rowBytes, std::int32_t(spare->Rows.Count()));
    progress.Step(spare->Rows.Count());
    work.Put(std::exchange(spare, nullptr));
    if (int(work.Size()) > threads) spare = work.Take();
  }
  while (work.Size() > 0) work.Take();
}

TurnedRows::~TurnedRows() = default;

/// Gives rows a band at a time, which is gathered out of all strips.
class TurnedRows::Reading final : public Rows {
 public:
  Reading(std::shared_ptr<Strips> strips, std::int64_t first)
      : Rows(strips->Upright), Of(std::move(strips)), Upcoming(first) {
    const auto rowBytes = std::int64_t(RowBytes());
    Longest = std::clamp<std::int64_t>(std::min(BandBytes / rowBytes, About().Height / BandPart), 1,
                                       About().Height);
    Band.resize(std::size_t(Longest * rowBytes));
    At = {first, first};
  }

  RowBlock Next(std::uint8_t*, std::ptrdiff_t, std::int32_t most) override {
    if (Upcoming == At.End) Gather();
    const auto count = std::int32_t(std::min<std::int64_t>(most, At.End - Upcoming));
    const auto rowBytes = std::ptrdiff_t(RowBytes());
    const RowBlock block{Band.data() + (Upcoming - At.First) * rowBytes, rowBytes, count};
    Upcoming += count;
    return block;
  }

 private:
  void Gather() {
    At = {At.End, std::min<std::int64_t>(At.End + Longest, About().Height)};
    const auto rowBytes = std::int64_t(RowBytes());
    if (!Of->Exchanges()) {
      const std::int64_t start = At.First * rowBytes;
      Of->Kept->Read(start, std::size_t(rowBytes), At.Count(), Band.data(), rowBytes);
      if (Of->ReadOnce) GiveBack(0, start, At.End * rowBytes);
      return;
    }
    for (std::int64_t i = 0; Of->Strip(i).Count() > 0; ++i) {
      const RowRange strip = Of->Strip(i);
      const std::int64_t bytes = strip.Count() * Of->PixelBytes, start = Of->StartOf(strip);
      Of->Kept->Read(start + At.First * bytes, std::size_t(bytes), At.Count(),
                     Band.data() + Of->PlaceOf(strip) * Of->PixelBytes, rowBytes);
      if (Of->ReadOnce) GiveBack(start, start + At.First * bytes, start + At.End * bytes);
    }
  }
  /// With the block that the band before left half.
  void GiveBack(std::int64_t start, std::int64_t first, std::int64_t end) {
    Of->Kept->GiveBack(std::max(start, first - Block), end);
  }

  std::shared_ptr<Strips> Of;
  std::int64_t Longest = 1, Upcoming;
  RowRange At;
  Bytes Band;
};

RowSource TurnedRows::Source() const {
  return {.Of = Of->Upright,
          .From = [strips = Of](std::int64_t first) { return std::make_unique<Reading>(strips, first); }};
}

void TurnedRows::ReadOnce() { Of->ReadOnce = true; }

}
