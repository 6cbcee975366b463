#include "band_picture.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstring>
#include <exception>
#include <mutex>
#include <system_error>
#include <vector>

#include "failure.h"
#include "rows.h"
#include "threads.h"

namespace picturezor::flow {

namespace {

/// Rows in memory that all threads may reach.
struct Samples {
  std::uint8_t* First;
  std::ptrdiff_t Stride;
  std::size_t Bytes;

  explicit Samples(const Picture& picture)
      : First(RowOf(picture, 0)),
        Stride(picture.RowSize()),
        Bytes(std::size_t(picture.Width()) * std::size_t(BytesPerPixel(picture.ImageFormat()))) {}
  std::uint8_t* Row(std::int64_t y) const { return First + y * Stride; }
};

class Bands {
 public:
  Bands(const Picture& source, const BandChain& chain, std::int32_t rows, const Picture& result)
      : Chain(chain), Rows(rows), From(source), Into(result) {
    Here.Stores.Kind = files::Store::Memory;
  }

  /// Bands one after the other, until none is left or something failed.
  void Work() {
    const std::int64_t height = Chain.Result().Height;
    Picture spare;
    for (;;) {
      const std::int64_t first = Next.fetch_add(Rows);
      if (first >= height || Stopped) return;
      const RowRange band{first, std::min<std::int64_t>(first + Rows, height)};
      try {
        Make(band, spare);
      } catch (...) {
        const std::lock_guard lock(Access);
        if (!Failed) Failed = std::current_exception();
        Stopped = true;
      }
      const std::lock_guard lock(Access);
      Done += band.Count();
      Changed.notify_one();
    }
  }

  /// Reports until all is done.
  void Await(files::Progress& progress) {
    const std::int64_t height = Chain.Result().Height;
    std::unique_lock lock(Access);
    for (std::int64_t told = 0; told < height && !Stopped;) {
      Changed.wait_for(lock, std::chrono::milliseconds(20));
      const std::int64_t now = Done;
      lock.unlock();
      if (now > told) progress.Step(now - told);
      progress.Tick();
      told = now;
      lock.lock();
    }
  }
  void Stop() { Stopped = true; }
  void RequireAll() const {
    if (Failed) std::rethrow_exception(Failed);
  }

 private:
  void Make(const RowRange& band, Picture& spare) {
    const RowRange rows = Chain.SourceOf(band);
    const auto count = std::int32_t(rows.Count());
    // An operation may have kept it as a part of its result.
    if (!spare || spare.Height() != count || spare.References() != 1)
      spare = Picture(Chain.Source().Width, count, Chain.Source().Of);
    if (!spare.Valid()) throw files::Failure("not enough memory for a band of rows");
    const Samples own(spare);
    for (std::int32_t y = 0; y < count; ++y) std::memcpy(own.Row(y), From.Row(rows.First + y), own.Bytes);
    Picture result = Chain.Apply(spare, band, Here);
    const auto made = std::int32_t(band.Count());
    if (result.Parent() || result.ImageFormat() != Chain.Result().Of) {
      const Picture packed(result.Width(), made, Chain.Result().Of);
      if (!packed.Valid() || !packed.CopyPixels(result))
        throw files::Failure("not enough memory for a band of rows");
      result = packed;
    }
    const Samples ready(result);
    for (std::int32_t y = 0; y < made; ++y) std::memcpy(Into.Row(band.First + y), ready.Row(y), Into.Bytes);
  }

  const BandChain& Chain;
  const std::int32_t Rows;
  const Samples From, Into;
  Workplace Here;
  std::atomic<std::int64_t> Next = 0;
  std::atomic<bool> Stopped = false;
  std::mutex Access;
  std::condition_variable Changed;
  std::int64_t Done = 0;
  std::exception_ptr Failed;
};

}

void ApplyBands(const Picture& source, const BandChain& chain, std::int32_t rows, int threads,
                const Picture& result, files::Progress& progress) {
  Bands bands(source, chain, rows, result);
  progress.Begin("working", chain.Result().Height);
  std::vector<std::thread> workers;
  const struct Join {
    Bands& Of;
    std::vector<std::thread>& Workers;
    ~Join() {
      Of.Stop();
      for (std::thread& worker : Workers) worker.join();
    }
  } join{bands, workers};
  const std::int64_t most = (chain.Result().Height + std::int64_t{rows} - 1) / rows;
  try {
    for (std::int64_t i = 0; i < std::min<std::int64_t>(threads, most); ++i)
      workers.push_back(StartThread([&] { bands.Work(); }));
  } catch (const std::system_error&) {
    // Those that could be made do it.
    if (workers.empty()) bands.Work();
  }
  bands.Await(progress);
  bands.RequireAll();
}

}
