#include "band_rows.h"

#include <algorithm>
#include <cstring>
#include <system_error>

#include "failure.h"
#include "worker_threads.h"

namespace picturezor::flow {

namespace {

constexpr std::int64_t LeastBytes = 1 << 20;
/// How many times longer than its margin a band is, at best: what is read twice, and worked on twice.
constexpr std::int64_t BestLength = 8;

/// A view as a picture of its own.
Picture Packed(Picture result, const Shape& shape) {
  if (!result.Parent()) return result;
  const Picture packed(result.Width(), result.Height(), shape.Of);
  if (!packed.Valid() || !packed.CopyPixels(result))
    throw files::Failure("not enough memory for a band of rows");
  return packed;
}

}

BandSizes ChooseBands(const BandChain& chain, int threads, std::int64_t memory) {
  // One that is read, one for each thread, and one that is written.
  BandSizes sizes{1, threads + 2};
  const std::int64_t rowBytes = std::max<std::int64_t>(chain.BytesOfRow(), 1);
  const std::int64_t most = memory / sizes.InFlight / rowBytes - chain.Margin();
  const std::int64_t best = std::max(LeastBytes / std::max<std::int64_t>(chain.Source().RowBytes(), 1),
                                     chain.Margin() * BestLength);
  sizes.Rows = std::int32_t(std::clamp<std::int64_t>(std::min(most, best), 1, chain.Result().Height));
  return sizes;
}

BandRows::BandRows(const RowSource& source, const BandChain& chain, int threads, const BandSizes& sizes,
                   std::int64_t first)
    : Rows(chain.Result()), From(source), Chain(chain), Sizes(sizes), FirstRow(first), NextRow(first) {
  try {
    Threads.push_back(files::StartThread([this] { ReadAhead(); }));
    for (int i = 0; i < threads && !Chain.Empty(); ++i)
      Threads.push_back(files::StartThread([this] { Work(); }));
  } catch (const std::system_error&) {
    // Those that could be made do it.
    if (Threads.size() < (Chain.Empty() ? 1 : 2)) {
      Stop();
      throw files::Failure("no thread can be made");
    }
  }
}

BandRows::~BandRows() { Stop(); }

void BandRows::Stop() {
  {
    const std::lock_guard lock(Access);
    Stopped = true;
  }
  Changed.notify_all();
  for (std::thread& thread : Threads) thread.join();
}

void BandRows::ReadAhead() {
  const std::int64_t height = About().Height;
  for (std::int64_t first = FirstRow; first < height; first += Sizes.Rows) {
    auto band = std::make_unique<Band>();
    const std::int64_t next = std::min<std::int64_t>(first + Sizes.Rows, height);
    band->Rows = {first, next};
    {
      std::unique_lock lock(Access);
      Changed.wait(lock, [&] { return Stopped || int(Bands.size()) < Sizes.InFlight; });
      if (Stopped) return;
    }
    try {
      const RowRange later{next, std::min<std::int64_t>(next + Sizes.Rows, height)};
      band->Source =
          ReadBand(Chain.SourceOf(band->Rows), later.Count() > 0 ? Chain.SourceOf(later).First : -1);
      if (Chain.Empty()) band->Result = band->Source;
    } catch (...) {
      band->Failed = std::current_exception();
    }
    band->Done = Chain.Empty() || band->Failed;
    const bool failed = bool(band->Failed);
    {
      const std::lock_guard lock(Access);
      Bands.push_back(std::move(band));
    }
    Changed.notify_all();
    if (failed) return;
  }
}

Picture BandRows::SourcePicture(std::int32_t rows) {
  {
    const std::lock_guard lock(Access);
    while (!Spare.empty()) {
      Picture spare = std::move(Spare.back());
      Spare.pop_back();
      if (spare.Height() == rows) return spare;
    }
  }
  const Shape& shape = From.Of;
  Picture picture(shape.Width, rows, shape.Of);
  if (!picture.Valid()) throw files::Failure("not enough memory for a band of rows");
  return picture;
}

Picture BandRows::ReadBand(RowRange rows, std::int64_t nextFirst) {
  const Picture picture = SourcePicture(std::int32_t(rows.Count()));
  const std::int64_t rowBytes = From.Of.RowBytes(), rowSize = picture.RowSize();
  std::uint8_t* const samples = RowOf(picture, 0);
  const auto at = [&](std::int64_t row) { return samples + (row - rows.First) * rowSize; };
  for (std::int64_t row = rows.First, kept = 0; row < RowsRead; ++row, kept += rowBytes)
    std::memcpy(at(row), &Kept[std::size_t(kept)], std::size_t(rowBytes));
  if (!Source) Source = From.From(RowsRead = rows.First);
  while (RowsRead < rows.End && !Stopped) {
    const auto count = std::int32_t(
        std::min<std::int64_t>(rows.End - RowsRead, std::max<std::int64_t>(LeastBytes / rowBytes, 1)));
    ReadRows(*Source, at(RowsRead), rowSize, count);
    RowsRead += count;
  }
  Kept.clear();
  for (std::int64_t row = std::max(nextFirst, rows.First); row < rows.End; ++row)
    Kept.insert(Kept.end(), at(row), at(row) + rowBytes);
  return picture;
}

void BandRows::Work() {
  Workplace here;
  here.Stores.Kind = files::Store::Memory;
  for (;;) {
    Band* band;
    {
      std::unique_lock lock(Access);
      Changed.wait(lock, [&] { return Stopped || Started < Bands.size(); });
      if (Stopped) return;
      band = Bands[Started++].get();
      if (band->Done) continue;
    }
    try {
      band->Result = Packed(Chain.Apply(band->Source, band->Rows, here), About());
    } catch (...) {
      band->Failed = std::current_exception();
    }
    {
      const std::lock_guard lock(Access);
      band->Done = true;
    }
    Changed.notify_all();
  }
}

void BandRows::GoOn() {
  std::unique_lock lock(Access);
  if (InHand) {
    InHand->Result = Picture();
    // An operation may have kept it as a part of its result.
    if (InHand->Source.References() == 1) Spare.push_back(std::move(InHand->Source));
    InHand = nullptr;
  }
  Changed.wait(lock, [&] { return !Bands.empty() && Bands.front()->Done; });
  if (Bands.front()->Failed) std::rethrow_exception(Bands.front()->Failed);
  InHand = std::move(Bands.front());
  Bands.pop_front();
  if (Started > 0) --Started;
  lock.unlock();
  Changed.notify_all();
  Samples = RowOf(InHand->Result, 0);
  RowSize = InHand->Result.RowSize();
}

RowBlock BandRows::Next(std::uint8_t*, std::ptrdiff_t, std::int32_t most) {
  if (!InHand || NextRow >= InHand->Rows.End) GoOn();
  const auto count = std::int32_t(std::min<std::int64_t>(most, InHand->Rows.End - NextRow));
  const RowBlock block{Samples + (NextRow - InHand->Rows.First) * RowSize, RowSize, count};
  NextRow += count;
  return block;
}

}
