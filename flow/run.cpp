#include "run.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>

#include "arriving_picture.h"
#include "band_picture.h"
#include "band_rows.h"
#include "failure.h"
#include "in_format.h"
#include "turned_rows.h"
#include "worker_threads.h"

namespace picturezor::flow {

namespace {

/// Bytes that bands take where they need no more.
constexpr std::int64_t FewBandBytes = 32 << 20;
/// Pictures that take less are turned in memory, if there may be so much.
constexpr std::int64_t FewTurnedBytes = 32 << 20;
/// Bytes of rows that go to a writer together.
constexpr std::int64_t RowsAtOnceBytes = 1 << 20;

/// Larger ones can't stand on a range of addresses.
constexpr std::int64_t MostArriving = UINT32_MAX;

using Kind = Dependence::Kind;

std::int64_t BytesOf(const Shape& shape) { return shape.RowBytes() * shape.Height; }

int ThreadsOf(const RunOptions& options) { return files::ThreadsFor(options.Threads); }

/// A picture on its way through operations: its rows come one by one, or all of them stand in memory.
class Stream {
 public:
  Stream(OpenFile file, const RunOptions& options, files::Progress& progress)
      : Of(ShapeOf(file)), Options(options), Report(progress) {
    const int orientation = file.Reader->Info().Orientation;
    if (options.Stores.Kind == files::Store::Auto && (orientation <= 2 || IsLarge())) {
      Coming = RowsOf(std::move(file));
      if (orientation > 2) Turn(orientation);
    } else {
      Whole = files::MakePictures(options.Stores, {{Of.Width, Of.Height, Of.Of}})[0];
      if (file.Part) file.Reader = files::PartOf(std::move(file.Reader), *file.Part);
      files::ReadInto(Whole, *file.Reader, progress);
    }
  }

  /// A part of a picture that isn't changed, or all of it.
  Stream(const Picture& picture, const std::optional<Rect>& part, const Shape& shape,
         const RunOptions& options, files::Progress& progress)
      : Of(shape), Options(options), Report(progress) {
    const Picture shown = part ? picture.ClipImage(*part) : picture;
    if (picture.ImageFormat() != shape.Of) {
      Whole = Gather(*RowsOf(shown, shape).From(0), options.Stores, progress);
      return;
    }
    Coming = RowsOf(shown, shape);
    BandsFrom = shape;
    // Of a mapped one the rows come one by one, so that the work can be stopped.
    if (picture.IsMapping()) return;
    // A view of its own: operations leave factories behind.
    Standing = part ? shown : picture.ClipImage();
    StandsIn = picture;
    StandsAt = part.value_or(Rect{0, 0, shape.Width, shape.Height});
  }

  const Shape& About() const { return Of; }

  void Add(const Operation& work) {
    const Shape result = work.Result(Of);
    const bool streams = Options.Stores.Kind == files::Store::Auto;
    const Kind kind = streams ? work.DependsOn(Of).Of : Kind::Whole;
    if (kind == Kind::InOrder && IsTooLarge(result)) {
      auto parts = work.Parts(Of);
      const bool any = !parts.empty();
      for (auto& part : parts) Add(*Kept->emplace_back(std::move(part)));
      if (any) return;
    }
    const int turned = streams && IsLarge() ? work.Turns().value_or(1) : 1;
    if (kind == Kind::Whole && turned > 2) {
      FlushBands();
      if (BytesOf(result) > Options.Stores.MemoryLimit || !AppliedToStanding(work)) Turn(turned);
    } else if (kind != Kind::Bands || !JoinsBands(work)) {
      FlushBands();
      // To one processor rows that arrive while it works only save memory.
      if (kind == Kind::InOrder && Coming && (ThreadsOf(Options) > 1 || IsLarge()))
        ApplyInOrder(work);
      else
        ApplyWhole(work);
    }
    Of = result;
  }

  std::unique_ptr<Rows> Take() {
    FlushBands();
    // Nobody goes back from here on.
    if (Turned) Turned->ReadOnce();
    // Where nothing is left to do they are read ahead.
    if (Coming && !ReadAhead) AddBands(BandChain({}, Of));
    return Coming ? Coming->From(0) : RowsOf(Whole, Of).From(0);
  }

  Picture TakePicture() {
    if (Standing) {
      const Picture made = files::MakeToFill(Options.Stores, {Of.Width, Of.Height, Of.Of});
      // A view may count its rows another way.
      if (!StandsIn.Parent() && !made.IsMapping()) {
        const BandChain chain(std::exchange(Bands, {}), BandsFrom);
        const int threads = ThreadsOf(Options);
        ApplyBands(StandsIn, StandsAt, chain, ChooseBands(chain, threads, MemoryFor(chain)).Rows, threads,
                   made, Report);
        return made;
      }
      if (Bands.empty()) {
        if (!made.CopyPixels(Standing)) throw files::Failure("a row of a picture can't be reached");
        return made;
      }
    }
    FlushBands();
    if (Coming) return Gather(*Coming->From(0), Options.Stores, Report);
    if (Whole.Parent()) return Gather(*RowsOf(Whole, Of).From(0), Options.Stores, Report);
    return std::move(Whole);
  }

 private:
  bool IsLarge() const { return BytesOf(Of) > std::min(FewTurnedBytes, Options.Stores.MemoryLimit / 2); }

  /// Whether rows can't arrive in a picture, or a result would have to be mapped.
  bool IsTooLarge(const Shape& result) const {
    const std::int64_t row = (BytesOf({Of.Width, 1, Of.Of, {}}) + 63) / 64 * 64;
    return row * Of.Height > MostArriving || BytesOf(result) > Options.Stores.MemoryLimit;
  }

  /// Where the source stands in memory it is worked on as it is, or a copy where the work would change it.
  bool AppliedToStanding(const Operation& work) {
    if (!Standing) return false;
    Report.Begin("working");
    if (work.DependsOn(Of).Of != Kind::InOrder && !work.DependsOn(Of).KeepsSource) {
      const Picture own = files::MakeToFill(Options.Stores, {Of.Width, Of.Height, Of.Of});
      if (!own.CopyPixels(Standing)) throw files::Failure("a row of a picture can't be reached");
      Standing = own;
    }
    Whole = work.Apply(std::move(Standing), {.Stores = Options.Stores, .Threads = ThreadsOf(Options)});
    Standing = Picture();
    Coming.reset();
    return true;
  }

  /// All rows are read, and come as those of the upright picture.
  void Turn(int orientation) {
    if (!Coming) Coming = RowsOf(std::exchange(Whole, {}), Of);
    if (Turned) Turned->ReadOnce();
    Standing = Picture();
    Turned = std::make_shared<TurnedRows>(*Coming, orientation, Options.Stores, ThreadsOf(Options), Report);
    Coming = Turned->Source();
    ReadAhead = false;
  }

  const Shape& BandSource() const { return Bands.empty() ? Of : BandsFrom; }

  /// Whether an operation can be done on bands together with those before it, or at least by itself.
  bool JoinsBands(const Operation& work) {
    std::vector<const Operation*> more = Bands;
    more.push_back(&work);
    if (FitsBands(BandChain(more, BandSource()))) {
      if (Bands.empty()) BandsFrom = Of;
      Bands = std::move(more);
      return true;
    }
    if (Bands.empty()) return false;
    FlushBands();
    return JoinsBands(work);
  }

  /// The memory that a chain's bands take at their best, or all that there may be.
  std::int64_t MemoryFor(const BandChain& chain) const {
    const std::int64_t room = std::max<std::int64_t>(Options.Stores.MemoryLimit / 2, 1);
    const std::int64_t best = 3 * chain.Margin() * chain.BytesOfRow() * (ThreadsOf(Options) + 2);
    return std::min(room, std::max(FewBandBytes, best));
  }

  /// Whether bands are longer than a part of what is around them.
  bool FitsBands(const BandChain& chain) const {
    const BandSizes sizes = ChooseBands(chain, ThreadsOf(Options), MemoryFor(chain));
    return 4 * std::int64_t{sizes.Rows} >= std::min<std::int64_t>(chain.Margin(), chain.Result().Height);
  }

  void FlushBands() {
    if (Bands.empty()) return;
    AddBands(BandChain(std::exchange(Bands, {}), BandsFrom));
  }

  void AddBands(const BandChain& chain) {
    if (!Coming) Coming = RowsOf(std::exchange(Whole, {}), chain.Source());
    const int threads = ThreadsOf(Options);
    const BandSizes sizes = ChooseBands(chain, threads, MemoryFor(chain));
    Standing = Picture();
    const auto from = [=, source = *Coming, kept = Kept](std::int64_t first) {
      return std::make_unique<BandRows>(source, chain, threads, sizes, first);
    };
    Coming = RowSource{chain.Result(), from, Coming->Anywhere};
    ReadAhead = true;
  }

  /// The work goes on while the rows arrive. This thread reports.
  void ApplyInOrder(const Operation& work) {
    if (AppliedToStanding(work)) return;
    const int threads = Coming->Anywhere ? ThreadsOf(Options) : 1;
    ArrivingPicture source(*Coming, threads);
    std::exception_ptr failed;
    std::atomic<bool> done = false;
    std::mutex access;
    std::condition_variable changed;
    std::thread worker = files::StartThread([&] {
      try {
        Whole = work.Apply(source.Of(), {.Stores = Options.Stores, .Threads = threads});
      } catch (...) {
        failed = std::current_exception();
      }
      const std::lock_guard lock(access);
      done = true;
      changed.notify_one();
    });
    const struct Join {
      ArrivingPicture& Source;
      std::thread& Worker;
      ~Join() {
        if (!Worker.joinable()) return;
        Source.GiveUp();
        Worker.join();
      }
    } join{source, worker};
    Report.Begin("reading", Of.Height);
    std::unique_lock lock(access);
    for (std::int64_t told = 0; !done;) {
      changed.wait_for(lock, std::chrono::milliseconds(50));
      const std::int64_t now = std::min<std::int64_t>(source.RowsRead(), Of.Height);
      if (now > told) Report.Step(now - told);
      told = now;
      Report.Tick();
    }
    lock.unlock();
    worker.join();
    source.RequireAll();
    if (failed) std::rethrow_exception(failed);
    Coming.reset();
    Turned.reset();
    ReadAhead = false;
  }

  void ApplyWhole(const Operation& work) {
    files::StoreOptions stores = Options.Stores;
    stores.MemoryLimit /= std::max(1, work.Pictures());
    if (Coming) {
      Standing = Picture();
      if (Turned) Turned->ReadOnce();
      Whole = Gather(*Coming->From(0), stores, Report);
      Coming.reset();
      Turned.reset();
      ReadAhead = false;
    }
    Report.Begin("working");
    if (work.DependsOn(Of).Of != Kind::Bands) {
      Whole = work.Apply(std::move(Whole), {.Stores = stores, .Threads = ThreadsOf(Options)});
      return;
    }
    const BandChain chain({&work}, Of);
    const RowRange all{0, chain.Result().Height}, rows = chain.SourceOf(all);
    if (rows.Count() < Of.Height)
      Whole = Whole.ClipImage({0, std::int32_t(rows.First), Of.Width, std::int32_t(rows.Count())});
    Whole = chain.Apply(std::move(Whole), all, {.Stores = stores, .Threads = ThreadsOf(Options)});
  }

  std::optional<RowSource> Coming;
  /// What those come from, if it was turned.
  std::shared_ptr<TurnedRows> Turned;
  /// Whether those come from bands, which read ahead themselves.
  bool ReadAhead = false;
  /// The source itself, where that is a picture in memory and nothing was done to it yet.
  Picture Standing;
  /// The picture that it is a part of, or itself.
  Picture StandsIn;
  Rect StandsAt;
  Picture Whole;
  Shape Of;
  /// Operations that were made on the way, for as long as rows come.
  std::shared_ptr<std::vector<std::unique_ptr<const Operation>>> Kept =
      std::make_shared<std::vector<std::unique_ptr<const Operation>>>();
  std::vector<const Operation*> Bands;
  Shape BandsFrom;
  const RunOptions& Options;
  files::Progress& Report;
};

}

Shape ResultOf(const Shape& source, const Chain& chain) {
  Shape shape = source;
  for (const auto& work : chain) shape = work->Result(shape);
  return shape;
}

std::unique_ptr<Rows> Through(OpenFile file, const Chain& chain, const RunOptions& options,
                              files::Progress& progress) {
  Stream stream(std::move(file), options, progress);
  for (const auto& work : chain) stream.Add(*work);
  return stream.Take();
}

Picture ResultOf(const Picture& source, const Shape& shape, const Chain& chain, const RunOptions& options,
                 files::Progress& progress) {
  std::optional<Rect> part;
  Shape of = shape;
  std::size_t first = 0;
  // What is cut out first is seen as a part.
  for (; first < chain.size() && !source.Parent() && !source.IsMapping(); ++first) {
    const std::optional<Rect> cut = chain[first]->Cuts();
    if (!cut) break;
    of = chain[first]->Result(of);
    part = {(part ? part->X : 0) + cut->X, (part ? part->Y : 0) + cut->Y, cut->Width, cut->Height};
  }
  Stream stream(source, part, of, options, progress);
  for (; first < chain.size(); ++first) stream.Add(*chain[first]);
  return stream.TakePicture();
}

Picture Gather(Rows& rows, const files::StoreOptions& stores, files::Progress& progress) {
  const Shape& shape = rows.About();
  const Picture picture = files::MakePictures(stores, {{shape.Width, shape.Height, shape.Of}})[0];
  progress.Begin("reading", shape.Height);
  for (std::int32_t y = 0; y < shape.Height; ++y, progress.Step()) ReadRows(rows, RowOf(picture, y), 0, 1);
  return picture;
}

namespace {

void Write(Stream& stream, Format format, files::ImageWriter& writer, files::Progress& progress) {
  const InFormat converted(format);
  if (stream.About().Of != format) stream.Add(converted);
  const std::unique_ptr<Rows> rows = stream.Take();
  const std::int32_t height = rows->About().Height;
  progress.Begin("writing", height);
  const auto together =
      std::int32_t(std::clamp<std::int64_t>(RowsAtOnceBytes / std::int64_t(rows->RowBytes()), 1, height));
  Bytes room(rows->RowBytes() * std::size_t(together));
  for (std::int32_t y = 0; y < height;) {
    const RowBlock block =
        rows->Next(room.data(), std::ptrdiff_t(rows->RowBytes()), std::min(together, height - y));
    writer.WriteRows(block.First, block.Stride, block.Count);
    y += block.Count;
    progress.Step(block.Count);
  }
  writer.Finish();
}

}

void Run(OpenFile file, const Chain& chain, Format format, files::ImageWriter& writer,
         const RunOptions& options, files::Progress& progress) {
  Stream stream(std::move(file), options, progress);
  for (const auto& work : chain) stream.Add(*work);
  Write(stream, format, writer, progress);
}

void Run(const Picture& source, const Shape& shape, Format format, files::ImageWriter& writer,
         const RunOptions& options, files::Progress& progress) {
  Stream stream(source, {}, shape, options, progress);
  Write(stream, format, writer, progress);
}

}
