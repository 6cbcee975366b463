#include "make_tiles.h"

#include <algorithm>
#include <array>
#include <functional>

#include "box_levels.h"
#include "conveyor.h"
#include "failure.h"
#include "kept_sums.h"
#include "page.h"
#include "share.h"
#include "step.h"
#include "target.h"
#include "tile_pixels.h"
#include "tile_rows.h"
#include "worker_threads.h"

namespace picturezor::tiles {

namespace {

using files::Failure;
using std::filesystem::path;

/// Rows that go through the kernel together begin at a multiple of this.
constexpr std::int32_t RowsTogether = 32;
/// Jobs that wait, for each thread.
constexpr std::size_t JobsAhead = 16;

const files::FileType& TileType(const std::string& name) {
  static constexpr std::array shown{"PNG", "JPEG", "WebP", "AVIF"};
  const files::FileType& type = files::TypeByName(name);
  if (std::ranges::find(shown, std::string_view(type.Name)) == shown.end() || !type.Create)
    throw files::UsageFailure("--format: no browser shows tiles of the type " + name);
  return type;
}

/// Work for any thread, and what the thread that put it does afterwards, in order.
struct Job {
  std::function<void(int thread)> Work;
  std::function<void()> Then;
};

class Maker {
 public:
  Maker(const flow::Shape& shape, const Grid& grid, const Share& share, const std::string& name,
        const files::FileType& type, TileTarget& target, const TilesOptions& options)
      : Grids(grid),
        Own(share),
        Name(name),
        Ending(type.Extensions.front()),
        Type(type),
        Into(target),
        Options(options),
        Writing(options.Writing),
        TileFormat(files::StorableFormat(name + Ending, type, shape.Of)),
        LevelFormat(shape.Of),
        Pixels(shape.Of, TileFormat, options.Background),
        Threads(files::ThreadsFor(options.Running.Threads)),
        Jobs(Threads, [](Job& job, int thread) { job.Work(thread); }) {
    Writing.Threads = 1;
    for (int level = 0; level < Grids.LevelCount(); ++level) {
      const auto& [first, end] = Own.Levels[std::size_t(level)];
      Levels.push_back(std::make_unique<TileRows>(Grids, level, files::ChannelsOf(shape.Of), first, end));
    }
    for (int level = 1; level < Grids.LevelCount(); ++level) {
      Smaller.push_back(Grids.Level(level));
      Samples.push_back(std::size_t(Smaller.back().Width) * std::size_t(files::ChannelsOf(shape.Of)));
    }
  }

  const std::string& TileEnding() const { return Ending; }

  /// The picture itself, out of the rows of its share, and with it the other levels by the kernel box. What
  /// its own rows mean for levels that aren't made now is kept.
  void MakeAll(flow::Rows& rows, files::Progress& progress, SumsWriter* keeper) {
    BoxLevels boxes(Grids.Level(0), files::ChannelsOf(LevelFormat), Smaller);
    boxes.BeginAt(Own.First);
    const WaitForJobs waiting{Jobs};
    std::vector<decltype(boxes.MakeScratch())> scratch;
    for (int i = 0; i < Threads; ++i) scratch.push_back(boxes.MakeScratch());
    const auto finish = [this, &boxes, keeper](BoxLevels::Part& part, bool own) {
      const int left = Own.Shared - 1;
      if (keeper && own) keeper->Add(part, left);
      part.resize(std::size_t(left));
      AddTo(boxes, part);
    };
    MakeLevel(0, Own.First, Own.End, rows, progress,
              [&](std::shared_ptr<Band>&& band, std::int32_t first, std::int32_t count) {
                struct Reduction {
                  std::shared_ptr<Band> Of;
                  BoxLevels::Part Part;
                };
                auto reduction = std::make_shared<Reduction>(Reduction{std::move(band), {}});
                const bool own = first >= Own.FirstOwn && first < Own.EndOwn;
                Put({[=, &boxes, &scratch](int thread) {
                       reduction->Part =
                           boxes.Reduce(reduction->Of->Row(first), std::ptrdiff_t(reduction->Of->RowBytes),
                                        first, count, *scratch[std::size_t(thread)]);
                       reduction->Of.reset();
                     },
                     [=] { finish(reduction->Part, own); }});
              });
  }

  /// One level alone, whole.
  void MakeOne(int level, flow::Rows& rows, files::Progress& progress) {
    MakeLevel(level, 0, Grids.Level(level).Height, rows, progress,
              [](std::shared_ptr<Band>&&, std::int32_t, std::int32_t) {});
  }

  /// The levels that all parts have left.
  void Join(const SharedFolderTarget& from, const std::string& task, files::Progress& progress) {
    BoxLevels boxes(Grids.Level(0), files::ChannelsOf(LevelFormat), Smaller);
    boxes.BeginAt(0);
    const WaitForJobs waiting{Jobs};
    for (std::int32_t number = 1; number <= Options.Parts; ++number)
      if (!HasSums(from.PartName(number), task))
        throw Failure(from.PartName(number), "this part isn't made yet");
    progress.Begin("joining parts", Options.Parts);
    for (std::int32_t number = 1; number <= Options.Parts; ++number, progress.Step()) {
      SumsReader sums(from.PartName(number), task);
      while (const auto part = sums.Next(Own.Shared - 1, Samples)) {
        AddTo(boxes, *part);
        while (Jobs.Size() > JobsAhead * std::size_t(Threads)) Finish();
      }
    }
    while (Jobs.Size() > 0) Finish();
    if (!std::ranges::all_of(Levels, [](const auto& level) { return level->Done(); }))
      throw Failure(from.PartName(Options.Parts), "parts are damaged; remove them, and make them again");
  }

 private:
  /// Jobs know of what stands beside this, and are dropped before it goes away.
  struct WaitForJobs {
    files::Conveyor<Job>& Of;
    ~WaitForJobs() { Of.Clear(); }
  };

  void AddTo(BoxLevels& boxes, const BoxLevels::Part& part) {
    boxes.Add(part, [this](int level, std::int32_t y, const std::uint8_t* row) {
      TileRows& into = *Levels[std::size_t(level) + 1];
      // Others have those above and below.
      if (into.Done() || y != into.Next()) return;
      std::copy_n(row, into.Filling()->RowBytes, into.Place());
      Gathered(level + 1, 1);
    });
  }

  template <class OnRows>
  void MakeLevel(int level, std::int32_t first, std::int32_t end, flow::Rows& rows, files::Progress& progress,
                 OnRows&& onRows) {
    LevelRead = level;
    TileRows& into = *Levels[std::size_t(level)];
    const std::size_t rowBytes = rows.RowBytes();
    progress.Begin("making tiles", end - first);
    for (std::int32_t y = first, count = 0; y < end; y += count) {
      count = std::min(end - y, RowsTogether - y % RowsTogether);
      for (const std::int32_t border : {into.Next(), Own.FirstOwn, Own.EndOwn})
        if (border > y) count = std::min(count, border - y);
      const bool forTiles = !into.Done() && y == into.Next();
      if (forTiles) count = std::min(count, into.Room());
      // Rows of a neighbour are needed for smaller levels alone.
      auto band = forTiles ? into.Filling()
                           : std::make_shared<Band>(Band{y, rowBytes, Bytes(rowBytes * std::size_t(count))});
      flow::ReadRows(rows, band->Row(y), std::ptrdiff_t(rowBytes), count);
      // No longer held here, since who is done with a band gives it back by that.
      onRows(std::move(band), y, count);
      if (forTiles)
        Gathered(level, count);
      else
        while (Jobs.Size() > JobsAhead * std::size_t(Threads)) Finish();
      progress.Step(count);
    }
    while (Jobs.Size() > 0) Finish();
  }

  void Put(Job job) {
    // What follows from a job may put others.
    Jobs.Put(std::make_unique<Job>(std::move(job)));
  }

  void Finish() {
    const std::unique_ptr<Job> job = Jobs.Take();
    if (job->Then) job->Then();
  }

  /// Rows of a level are at their place.
  void Gathered(int level, std::int32_t count) {
    TileRows& rows = *Levels[std::size_t(level)];
    rows.Add(count);
    while (!rows.Done()) {
      // The band behind the next is still being cut into tiles. Only where rows are read may other jobs be
      // taken meanwhile: those of the levels below stand behind jobs that have been taken.
      while (level == LevelRead && rows.Room() == 0 &&
             (rows.Waits() || Jobs.Size() > JobsAhead * std::size_t(Threads)))
        Finish();
      const auto complete = rows.Take();
      if (!complete) return;
      MakeTilesOf(level, *complete);
    }
  }

  void MakeTilesOf(int level, const TileRows::Complete& row) {
    if (Into.HasRow(level, row.Row)) return;
    const std::int32_t across = Grids.Across(level);
    for (std::int32_t column = 0; column < across; ++column) {
      auto file = std::make_shared<std::unique_ptr<files::Output>>();
      const bool last = column + 1 == across;
      Put({[=, this, band = row.Of](int) { *file = MakeTile(*band, level, column, row.Row); },
           [=, this, number = row.Row] {
             if (*file) Into.Add(**file);
             if (last) Into.AddRow(level, number);
           }});
    }
  }

  /// The tile's file, or none where it is blank.
  std::unique_ptr<files::Output> MakeTile(Band& band, int level, std::int32_t column,
                                          std::int32_t row) const {
    const Rect tile = Grids.TileAt(level, column, row);
    const int channels = files::ChannelsOf(LevelFormat);
    const auto start = [&](std::int32_t y) {
      return band.Row(tile.Y + y) + std::ptrdiff_t{tile.X} * channels;
    };
    if (Options.SkipBlank) {
      std::int32_t y = 0;
      while (y < tile.Height && Pixels.AreBlank(start(y), tile.Width)) ++y;
      if (y == tile.Height) return nullptr;
    }
    files::ImageInfo info;
    info.Width = Grids.Fills() ? Grids.Tile() : tile.Width;
    info.Height = Grids.Fills() ? Grids.Tile() : tile.Height;
    info.Pixels = TileFormat;
    auto file = Into.Begin(Grids.TileName(Name, Ending, level, column, row));
    const auto writer = Type.Create(file->Descriptor(), file->Target(), info, Writing);
    if (Pixels.Same() && info.Width == tile.Width && info.Height == tile.Height) {
      writer->WriteRows(start(0), std::ptrdiff_t(band.RowBytes), tile.Height);
    } else {
      const std::span<const std::uint8_t> outside = Pixels.Outside();
      Bytes empty;
      for (std::int32_t x = 0; x < info.Width; ++x) empty.insert(empty.end(), outside.begin(), outside.end());
      Bytes line = empty;
      for (std::int32_t y = 0; y < info.Height; ++y) {
        if (y < tile.Height) Pixels.Convert(start(y), tile.Width, line.data());
        writer->WriteRow(y < tile.Height ? line.data() : empty.data());
      }
    }
    writer->Finish();
    // Here, since an open file is one of few.
    file->Commit();
    return file;
  }

  const Grid& Grids;
  const Share& Own;
  const std::string Name, Ending;
  const files::FileType& Type;
  TileTarget& Into;
  const TilesOptions& Options;
  files::WriteOptions Writing;
  const Format TileFormat, LevelFormat;
  const TilePixels Pixels;
  std::vector<std::unique_ptr<TileRows>> Levels;
  /// Of the levels behind the first: their sizes, and the samples of a row.
  std::vector<files::Extent> Smaller;
  std::vector<std::size_t> Samples;
  const int Threads;
  int LevelRead = -1;
  files::Conveyor<Job> Jobs;
};

/// What the journal of an unfinished folder is compared with.
std::string TaskOf(const path& source, const flow::Shape& shape, const TilesOptions& options) {
  std::error_code failed;
  // Without the number of a page.
  path file = source;
  if (const std::string name = source.string(); !std::filesystem::exists(file, failed) && name.ends_with(']'))
    file = name.substr(0, name.rfind('['));
  const path whole = std::filesystem::weakly_canonical(file, failed);
  const auto changed = std::filesystem::last_write_time(file, failed).time_since_epoch().count();
  std::string task;
  for (const std::int64_t number :
       {std::int64_t(changed), std::int64_t(shape.Width), std::int64_t(shape.Height), std::int64_t(shape.Of),
        std::int64_t(options.How), std::int64_t(options.Tile), std::int64_t(options.Overlap),
        std::int64_t(options.Writing.Quality), std::int64_t(options.SkipBlank), std::int64_t(options.Parts),
        std::int64_t(options.UseLevels),
        std::int64_t(options.Background.Red << 16 | options.Background.Green << 8 | options.Background.Blue)})
    task += std::to_string(number) + " ";
  task += std::string(files::TypeByName(options.Type).Name) + " " + options.Kernel + " " + whole.string() +
          source.string().substr(file.string().size());
  std::ranges::replace(task, '\n', ' ');
  return task;
}

std::unique_ptr<flow::Rows> WholeRows(flow::OpenFile file, const TilesOptions& options,
                                      files::Progress& progress) {
  // Rows that come as they are need no thread that reads ahead: the other processors have tiles to make.
  if (file.Reader->Info().Orientation <= 2) return flow::RowsOf(std::move(file)).From(0);
  return flow::Through(std::move(file), {}, options.Running, progress);
}

/// Whether the file is read once more for each level.
bool ReadsAgain(const TilesOptions& options) { return options.UseLevels || options.Kernel != "box"; }

void MakeLevels(Maker& maker, const Grid& grid, flow::OpenFile file, const TilesOptions& options,
                files::Progress& progress) {
  const auto again = file.Again;
  const std::unique_ptr<flow::Rows> rows = WholeRows(std::move(file), options, progress);
  if (!ReadsAgain(options)) return maker.MakeAll(*rows, progress, nullptr);
  maker.MakeOne(0, *rows, progress);
  for (int level = 1; level < grid.LevelCount(); ++level) {
    const files::Extent size = grid.Level(level);
    const auto open = [&] {
      auto reader = again();
      const bool upright = reader->Info().Orientation <= 4;
      if (options.UseLevels && !reader->Info().Levels.empty())
        reader->Reduce(upright ? size.Width : size.Height, upright ? size.Height : size.Width);
      return reader;
    };
    flow::OpenFile from{open(), open};
    const flow::Shape copy = flow::ShapeOf(from);
    if (copy.Width == size.Width && copy.Height == size.Height) {
      maker.MakeOne(level, *WholeRows(std::move(from), options, progress), progress);
      continue;
    }
    flow::Chain chain;
    chain.push_back(
        steps::MakeOperation(*steps::FindStep("scale"),
                             std::map<std::string, std::string>{{"width", std::to_string(size.Width)},
                                                                {"height", std::to_string(size.Height)},
                                                                {"kernel", options.Kernel}},
                             {.Stores = options.Running.Stores, .Note = {}}));
    maker.MakeOne(level, *flow::Through(std::move(from), chain, options.Running, progress), progress);
  }
}

/// What a SZI says of its picture; see version 1.0 of that format.
std::string SlideProperties(const flow::Shape& shape) {
  const auto property = [](const char* name, std::int32_t value) {
    return std::string("    <property>\n      <name>") + name + "</name>\n      <value type=\"gint\">" +
           std::to_string(value) + "</value>\n    </property>\n";
  };
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
         "<image xmlns=\"http://www.pathozoom.com/szi\" version=\"1.0\">\n  <properties>\n" +
         property("ImageWidth", shape.Width) + property("ImageHeight", shape.Height) +
         "  </properties>\n</image>\n";
}

void RequireDivisible(const Grid& grid, const path& source, int orientation, bool zip,
                      const TilesOptions& options) {
  const std::string option = options.Part > 0 ? "--part: " : "--join: ";
  if (zip) throw files::UsageFailure(option + "only a folder can be made by parts");
  if (options.Resume) throw files::UsageFailure("--resume: parts go on by themselves");
  if (ReadsAgain(options))
    throw files::UsageFailure(option + "parts are made of the picture itself, by the kernel box");
  if (orientation > 2) throw Failure(source, "it isn't stored upright, so it can't be made by parts");
  if (options.Parts > grid.Down(0))
    throw files::UsageFailure(option + "there are only " + std::to_string(grid.Down(0)) +
                              " rows of tiles to divide");
}

}

void MakeTiles(flow::OpenFile file, const path& source, const path& named, const TilesOptions& options,
               files::Progress& progress) {
  const files::FileType& type = TileType(options.Type);
  const flow::Shape shape = flow::ShapeOf(file);
  const path target = named.has_filename() ? named : named.parent_path();
  const bool slide = target.extension() == ".szi", zip = slide || target.extension() == ".zip";
  const bool described = options.How == Layout::DeepZoom && target.extension() == ".dzi";
  const std::string name = (zip || described ? target.stem() : target.filename()).string();
  if (name.empty() || name == "." || name == "..") throw files::UsageFailure(target, "a name is missing");
  if (options.How != Layout::DeepZoom && options.Overlap > 0)
    throw files::UsageFailure("--overlap: only the layout deepzoom has that");
  if (zip && options.Resume) throw files::UsageFailure("--resume: only a folder can be gone on with");
  if (slide && options.How != Layout::DeepZoom)
    throw files::UsageFailure(target, "a SZI holds the layout deepzoom");
  if (!file.Again && (ReadsAgain(options) || options.Resume || options.Parts > 0))
    throw files::UsageFailure(
        source,
        "standard input comes once: with --part, --join, --resume, --use-levels and other "
        "kernels than box the image is read again");
  if (options.Page) OpenSeadragonFolder();
  const std::string tile = name + std::string(type.Extensions.front());
  files::StorableFormat(tile, type, shape.Of);
  files::RequireStorableSize(tile, type, options.Tile + 2 * options.Overlap,
                             options.Tile + 2 * options.Overlap);
  const Grid grid({shape.Width, shape.Height}, options.How, options.Tile, options.Overlap);
  const bool divided = options.Parts > 0;
  if (divided) RequireDivisible(grid, source, file.Reader->Info().Orientation, zip, options);
  const std::string task = TaskOf(source, shape, options);
  std::unique_ptr<TileTarget> into;
  const SharedFolderTarget* shared = nullptr;
  if (zip) {
    into = std::make_unique<ZipTarget>(target, slide ? name : std::string());
  } else if (divided) {
    auto folder = std::make_unique<SharedFolderTarget>(target.parent_path(), name, task, options.Part > 0);
    shared = folder.get();
    into = std::move(folder);
  } else {
    into = std::make_unique<FolderTarget>(target.parent_path(), name, task, options.Resume);
  }
  if (options.Part > 0 && HasSums(shared->PartName(options.Part), task)) return;
  const bool joins = divided && options.Part == 0;
  const Share share = joins ? RestOf(grid, options.Parts)
                            : ShareOf(grid, divided ? options.Part - 1 : 0, divided ? options.Parts : 1);
  Maker maker(shape, grid, share, name, type, *into, options);
  if (options.Part > 0) {
    SumsWriter sums(shared->PartName(options.Part), task);
    const flow::RowSource rows = flow::RowsOf(std::move(file));
    maker.MakeAll(*rows.From(share.First), progress, &sums);
    // The tiles are there before the file that says so.
    return sums.Commit();
  }
  if (joins)
    maker.Join(*shared, task, progress);
  else
    MakeLevels(maker, grid, std::move(file), options, progress);
  const std::string id =
      (options.Address.empty() ? std::string("http://localhost") : options.Address) + "/" + name;
  WriteText(*into, grid.DescriptionName(name), grid.Description(maker.TileEnding(), id));
  if (slide) WriteText(*into, "scan-properties.xml", SlideProperties(shape));
  if (options.Page) WritePage(*into, grid, name, maker.TileEnding(), shape.Density);
  into->Commit();
}

}
