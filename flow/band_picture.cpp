#include "band_picture.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <exception>
#include <mutex>
#include <system_error>
#include <vector>

#include "failure.h"
#include "rows.h"
#include "worker_threads.h"

namespace picturezor::flow {

namespace {

/// A part of a picture in memory that all threads may reach.
struct Samples {
  RowBlock All;
  Shape Of;
  Rect Part;

  Samples(const Picture& picture, const Rect& part)
      : All{RowOf(picture, part.Y), picture.RowSize(), part.Height},
        Of{picture.Width(), part.Height, picture.ImageFormat(), {}},
        Part(part) {}
  /// A picture of some of its rows, for one thread.
  Picture Band(const RowRange& rows) const {
    const auto count = std::int32_t(rows.Count());
    const Picture band = OverRows({All.First + rows.First * All.Stride, All.Stride, count}, Of);
    return Part.Width == Of.Width ? band : band.ClipImage({Part.X, 0, Part.Width, count});
  }
};

class Bands {
 public:
  Bands(const Picture& source, const Rect& part, const BandChain& chain, std::int32_t rows, int threads,
        const Picture& result)
      : Chain(chain),
        Rows(rows),
        From(source, part),
        Into(result, {0, 0, result.Width(), result.Height()}),
        Left(std::size_t(threads)) {
    Here.Stores.Kind = files::Store::Memory;
    const std::int64_t height = chain.Result().Height, count = (height + rows - 1) / rows;
    for (std::int64_t i = 0; i < threads; ++i)
      Left[std::size_t(i)] = {count * i / threads * rows, std::min(count * (i + 1) / threads * rows, height)};
  }

  /// Makes a band; false when none is left or something failed. A thread begins with a share of its own,
  /// since threads that meet in a page of new memory both clear it, and goes on with those of others.
  bool Advance(std::size_t thread, Picture& spare) {
    const RowRange band = Take(thread);
    if (Stopped || band.Count() == 0) return false;
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
    return true;
  }
  void Work(std::size_t thread) {
    Picture spare;
    while (Advance(thread, spare)) {
    }
  }

  /// Works too, and reports until all is done.
  void Lead(files::Progress& progress) {
    const std::int64_t height = Chain.Result().Height;
    Picture spare;
    for (std::int64_t told = 0; told < height && !Stopped;) {
      const bool busy = Advance(0, spare);
      std::unique_lock lock(Access);
      if (!busy && Done == told) Changed.wait_for(lock, std::chrono::milliseconds(20));
      const std::int64_t now = Done;
      lock.unlock();
      if (now > told) progress.Step(now - told);
      progress.Tick();
      told = now;
    }
  }
  void Stop() { Stopped = true; }
  void RequireAll() const {
    if (Failed) std::rethrow_exception(Failed);
  }

 private:
  RowRange Take(std::size_t thread) {
    const std::lock_guard lock(Access);
    for (std::size_t i = 0; i < Left.size(); ++i) {
      RowRange& share = Left[(thread + i) % Left.size()];
      const RowRange band{share.First, std::min<std::int64_t>(share.First + Rows, share.End)};
      share.First = band.End;
      if (band.Count() > 0) return band;
    }
    return {};
  }

  void Make(const RowRange& band, Picture& spare) {
    const RowRange rows = Chain.SourceOf(band);
    const Picture from = From.Band(rows), into = Into.Band(band);
    const bool alike = rows == band && From.Part.Width == Into.Part.Width && From.Of.Of == Into.Of.Of;
    Picture source = from;
    if (!Chain.KeepsSource()) {
      source = alike ? into : Spare(spare, from);
      Copy(from, source);
    }
    const Picture result = Chain.Apply(source, band, Here);
    if (result != into) Copy(result, into);
  }

  /// A picture as large as another one; the last one, unless an operation kept it as a part of its result.
  static Picture Spare(Picture& spare, const Picture& like) {
    if (!spare || spare.Height() != like.Height() || spare.References() != 1)
      spare = Picture(like.Width(), like.Height(), like.ImageFormat());
    if (!spare.Valid()) throw files::Failure("not enough memory for a band of rows");
    return spare;
  }
  static void Copy(const Picture& from, const Picture& into) {
    if (!into.CopyPixels(from)) throw files::Failure("not enough memory for a band of rows");
  }

  const BandChain& Chain;
  const std::int32_t Rows;
  const Samples From, Into;
  Workplace Here;
  std::atomic<bool> Stopped = false;
  std::mutex Access;
  std::condition_variable Changed;
  /// What each thread has to do yet.
  std::vector<RowRange> Left;
  std::int64_t Done = 0;
  std::exception_ptr Failed;
};

}

void ApplyBands(const Picture& source, const Rect& part, const BandChain& chain, std::int32_t rows,
                int threads, const Picture& result, files::Progress& progress) {
  const std::int64_t most = (chain.Result().Height + std::int64_t{rows} - 1) / rows;
  threads = int(std::min<std::int64_t>(threads, most));
  Bands bands(source, part, chain, rows, threads, result);
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
  try {
    for (int i = 1; i < threads; ++i)
      workers.push_back(files::StartThread([&bands, i] { bands.Work(std::size_t(i)); }));
  } catch (const std::system_error&) {
    // Those that could be made do it.
  }
  bands.Lead(progress);
  bands.RequireAll();
}

}
