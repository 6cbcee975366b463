#include "run.h"

#include <algorithm>

#include "band_rows.h"
#include "failure.h"
#include "in_format.h"
#include "threads.h"

namespace picturezor::flow {

namespace {

/// Bytes that bands take where they need no more.
constexpr std::int64_t FewBandBytes = 32 << 20;

using Kind = Dependence::Kind;

int ThreadsOf(const RunOptions& options) { return options.Threads > 0 ? options.Threads : Processors(); }

/// Rows on their way through operations: they come one by one, or all of them stand in a picture.
class Stream {
 public:
  Stream(std::unique_ptr<Rows> rows, const RunOptions& options, files::Progress& progress)
      : Coming(std::move(rows)), Of(Coming->About()), Options(options), Report(progress) {}

  const Shape& About() const { return Of; }

  void Add(const Operation& work) {
    const Shape result = work.Result(Of);
    if (work.DependsOn(Of).Of != Kind::Bands || Options.Stores.Kind != files::Store::Auto ||
        !JoinsBands(work)) {
      FlushBands();
      ApplyWhole(work);
    }
    Of = result;
  }

  std::unique_ptr<Rows> Take() {
    if (Coming && Options.Stores.Kind != files::Store::Auto)
      Whole = Gather(*TakeComing(), Options.Stores, Report);
    FlushBands();
    // Where nothing is left to do they are read ahead.
    if (Coming && !ReadAhead) AddBands(BandChain({}, Of));
    return Coming ? std::move(Coming) : RowsOf(Whole, Of);
  }

 private:
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

  void AddBands(BandChain chain) {
    if (!Coming) Coming = RowsOf(std::exchange(Whole, {}), BandsFrom);
    const BandSizes sizes = ChooseBands(chain, ThreadsOf(Options), MemoryFor(chain));
    Coming = std::make_unique<BandRows>(std::move(Coming), std::move(chain), ThreadsOf(Options), sizes);
    ReadAhead = true;
  }

  std::unique_ptr<Rows> TakeComing() {
    ReadAhead = false;
    return std::exchange(Coming, nullptr);
  }

  void ApplyWhole(const Operation& work) {
    files::StoreOptions stores = Options.Stores;
    stores.MemoryLimit /= std::max(1, work.Pictures());
    if (Coming) Whole = Gather(*TakeComing(), stores, Report);
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

  std::unique_ptr<Rows> Coming;
  /// Whether those come from bands, which read ahead themselves.
  bool ReadAhead = false;
  Picture Whole;
  Shape Of;
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

std::unique_ptr<Rows> Open(std::unique_ptr<files::ImageReader> reader, const RunOptions& options,
                           files::Progress& progress) {
  if (reader->Info().Orientation <= 2) return RowsOf(std::move(reader));
  const Shape shape = ShapeOf(reader->Info());
  const Picture picture = files::MakePictures(options.Stores, {{shape.Width, shape.Height, shape.Of}})[0];
  files::ReadInto(picture, *reader, progress);
  return RowsOf(picture, shape);
}

std::unique_ptr<Rows> Through(std::unique_ptr<Rows> source, const Chain& chain, const RunOptions& options,
                              files::Progress& progress) {
  Stream stream(std::move(source), options, progress);
  for (const auto& work : chain) stream.Add(*work);
  return stream.Take();
}

Picture Gather(Rows& rows, const files::StoreOptions& stores, files::Progress& progress) {
  const Shape& shape = rows.About();
  const Picture picture = files::MakePictures(stores, {{shape.Width, shape.Height, shape.Of}})[0];
  progress.Begin("reading", shape.Height);
  for (std::int32_t y = 0; y < shape.Height; ++y, progress.Step()) ReadRow(rows, RowOf(picture, y));
  return picture;
}

void Run(std::unique_ptr<files::ImageReader> reader, const Chain& chain, Format format,
         files::ImageWriter& writer, const RunOptions& options, files::Progress& progress) {
  const InFormat converted(format);
  Stream stream(Open(std::move(reader), options, progress), options, progress);
  for (const auto& work : chain) stream.Add(*work);
  if (stream.About().Of != format) stream.Add(converted);
  const std::unique_ptr<Rows> rows = stream.Take();
  const std::int32_t height = rows->About().Height;
  progress.Begin("writing", height);
  Bytes room(rows->RowBytes());
  for (std::int32_t y = 0; y < height; ++y, progress.Step()) writer.WriteRow(rows->Next(room.data()));
  writer.Finish();
}

}
