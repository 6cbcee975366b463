#include "shown_picture.h"

#include <algorithm>
#include <chrono>
#include <cmath>

#include "box_levels.h"
#include "failure.h"
#include "run.h"
#include "worker_threads.h"

namespace picturezor::tiles {

namespace {

constexpr std::int32_t TileEdge = 256;
/// A part is made of one that has at most so many times as many rows and columns.
constexpr double MostReduction = 4;
/// The small version's edge.
constexpr std::int32_t RoughEdge = 1024;
constexpr std::int32_t RowsTogether = 32;
constexpr auto MostWaited = std::chrono::seconds(3);

/// Sizes that differ by the way in which a half is rounded.
bool Alike(files::Extent a, files::Extent b) {
  return std::abs(a.Width - b.Width) <= 1 && std::abs(a.Height - b.Height) <= 1;
}

flow::Shape ShapeOf(const files::ImageReader& reader) {
  const files::ImageInfo info = files::Upright(reader.Info());
  return {info.Width, info.Height, info.Pixels, info.Density};
}

}

ShownPicture::ShownPicture(const Opener& opener, const files::StoreOptions& stores)
    : Open(opener),
      Stores(stores),
      Of(ShapeOf(*opener())),
      Grids({Of.Width, Of.Height}, Layout::XYZ, TileEdge, 0) {
  const auto reader = opener();
  for (const files::Extent size : reader->Info().Levels)
    if (std::shared_ptr<Plane> plane = FilePlane::Of(opener, size)) Planes.push_back(std::move(plane));
  if (std::shared_ptr<Plane> whole = FilePlane::Of(opener, {Of.Width, Of.Height}))
    Planes.insert(Planes.begin(), std::move(whole));
  Worker = files::StartThread([this] { Work(); });
}

ShownPicture::~ShownPicture() {
  Stop = true;
  Worker.join();
}

ShownPicture::State ShownPicture::Progress() const {
  const std::lock_guard lock(Access);
  return {RowsRead, Finished, FailedWith};
}

void ShownPicture::Put(std::shared_ptr<Plane> plane) {
  const std::lock_guard lock(Access);
  Planes.push_back(std::move(plane));
  std::ranges::stable_sort(Planes, std::ranges::greater{}, [](const auto& each) {
    return std::int64_t{each->Size().Width} * each->Size().Height;
  });
}

void ShownPicture::Work() {
  try {
    MakePlanes();
  } catch (const std::exception& failure) {
    const std::lock_guard lock(Access);
    FailedWith = failure.what();
  }
  Finished = true;
  RoughIs(nullptr);
}

void ShownPicture::RoughIs(std::shared_ptr<Plane> plane) {
  {
    const std::lock_guard lock(Access);
    if (plane) Rough = std::move(plane);
    RoughTried = true;
  }
  Changed.notify_all();
}

std::shared_ptr<Plane> ShownPicture::RoughInAMoment() {
  std::unique_lock lock(Access);
  Changed.wait_for(lock, MostWaited, [this] { return RoughTried; });
  return Rough;
}

void ShownPicture::MakePlanes() {
  // Levels that nothing of the file is near enough to.
  std::vector<int> missing;
  for (int level = 0; level < Grids.LevelCount(); ++level) {
    const bool served = std::ranges::any_of(Planes, [&](const auto& plane) {
      const double factor = double(plane->Size().Width) / Grids.Level(level).Width;
      return factor > 1 - 1.0 / Grids.Level(level).Width - 1e-9 && factor <= MostReduction;
    });
    if (!served) missing.push_back(level);
  }
  if (missing.empty()) {
    RowsRead = Of.Height;
    return;
  }
  RoughIs(RoughPlane(Open, RoughEdge, Stores.TempDirectory, Stop));
  const int channels = files::ChannelsOf(Of.Of);
  std::vector<std::shared_ptr<MappedPlane>> made(std::size_t(Grids.LevelCount()));
  for (const int level : missing) {
    made[std::size_t(level)] =
        std::make_shared<MappedPlane>(Grids.Level(level), channels, Stores.TempDirectory);
    Put(made[std::size_t(level)]);
  }
  std::vector<files::Extent> sizes;
  for (int level = 1; level < Grids.LevelCount(); ++level) sizes.push_back(Grids.Level(level));
  BoxLevels boxes({Of.Width, Of.Height}, channels, sizes);
  const auto scratch = boxes.MakeScratch();
  files::Silence silence;
  flow::OpenFile file{Open(), Open};
  const std::unique_ptr<flow::Rows> rows = flow::Through(std::move(file), {}, {.Stores = Stores}, silence);
  Bytes room(rows->RowBytes() * RowsTogether);
  for (std::int32_t y = 0; y < Of.Height && !Stop;) {
    const std::int32_t count = std::min(RowsTogether, Of.Height - y);
    std::uint8_t* place = made[0] ? made[0]->Row(y) : room.data();
    flow::ReadRows(*rows, place, std::ptrdiff_t(rows->RowBytes()), count);
    if (made[0]) made[0]->Add(count);
    boxes.Add(boxes.Reduce(place, std::ptrdiff_t(rows->RowBytes()), y, count, *scratch),
              [&](int level, std::int32_t row, const std::uint8_t* samples) {
                MappedPlane* into = made[std::size_t(level) + 1].get();
                if (!into) return;
                std::copy_n(samples, into->BytesOfRow(), into->Row(row));
                into->Add(1);
              });
    y += count;
    RowsRead = y;
  }
}

std::shared_ptr<Plane> ShownPicture::PlaneFor(int level, const Rect& part) const {
  const files::Extent size = Grids.Level(level);
  const std::lock_guard lock(Access);
  std::shared_ptr<Plane> best;
  for (const auto& plane : Planes) {
    const double factor = double(plane->Size().Width) / size.Width;
    const bool large = Alike(plane->Size(), size) || factor >= 1;
    const auto last =
        std::int64_t(std::ceil(double(part.Y + part.Height) * plane->Size().Height / size.Height));
    if (large && factor <= MostReduction &&
        plane->Rows() >= std::min<std::int64_t>(last, plane->Size().Height))
      best = plane;
  }
  return best;
}

Picture ShownPicture::Read(Plane& plane, int level, const Rect& part) const {
  const files::Extent size = Grids.Level(level), from = plane.Size();
  const bool same = Alike(from, size);
  const double across = same ? 1 : double(from.Width) / size.Width,
               down = same ? 1 : double(from.Height) / size.Height;
  const auto place = [](double at, std::int32_t most) {
    return std::int32_t(std::clamp<double>(at, 0, most));
  };
  // One pixel at least, where a smaller copy has been rounded down.
  const std::int32_t left = place(part.X * across, from.Width - 1),
                     top = place(part.Y * down, from.Height - 1);
  const std::int32_t right = std::max(left + 1, place(std::ceil((part.X + part.Width) * across), from.Width));
  const std::int32_t bottom = std::max(top + 1, place(std::ceil((part.Y + part.Height) * down), from.Height));
  const Rect area{left, top, right - left, bottom - top};
  Bytes samples(std::size_t(area.Width) * std::size_t(area.Height) * std::size_t(files::ChannelsOf(Of.Of)));
  plane.Read(area, samples.data());
  const Picture read(area.Width, area.Height, Of.Of);
  if (!read.Valid()) throw files::Failure("no memory for a part of the picture");
  const std::size_t rowBytes = samples.size() / std::size_t(area.Height);
  for (std::int32_t y = 0; y < area.Height; ++y)
    std::copy_n(samples.data() + std::size_t(y) * rowBytes, rowBytes, flow::RowOf(read, y));
  if (area.Width == part.Width && area.Height == part.Height) return read;
  const Picture scaled(part.Width, part.Height, Of.Of);
  const Kernel kernel = across < 1 ? Kernel::Triangle : Kernel::Box;
  if (!scaled.Scale(read, {}, kernel, part.Width, part.Height)) throw files::Failure("it can't be scaled");
  return scaled;
}

SampleTable ShownPicture::LevelTable() {
  {
    const std::lock_guard lock(Access);
    if (Levelled) return *Levelled;
  }
  int level = Grids.LevelCount() - 1;
  while (level > 0 && std::max(Grids.Level(level).Width, Grids.Level(level).Height) < RoughEdge / 2) --level;
  const files::Extent size = Grids.Level(level);
  const auto overview = PartOf(level, {0, 0, size.Width, size.Height});
  if (!overview) throw files::Failure("the picture isn't there yet");
  const SampleTable table = AutoLevelTable(overview->Of);
  if (!overview->Rough) {
    const std::lock_guard lock(Access);
    Levelled = table;
  }
  return table;
}

std::optional<ShownPicture::Part> ShownPicture::PartOf(int level, const Rect& part,
                                                       const Adjustments& adjustments) {
  const files::Extent size = Grids.Level(level);
  const flow::Chain chain = adjustments.Chain(Stores);
  flow::Shape shape{part.Width, part.Height, Of.Of, {}};
  std::int32_t margin = 0;
  for (const auto& work : chain) {
    margin += work->DependsOn(shape).Reach;
    shape = work->Result(shape);
  }
  const std::int32_t left = std::max(0, part.X - margin), top = std::max(0, part.Y - margin);
  const Rect wide{left, top, std::min(size.Width, part.X + part.Width + margin) - left,
                  std::min(size.Height, part.Y + part.Height + margin) - top};
  std::shared_ptr<Plane> plane = PlaneFor(level, wide);
  const bool rough = !plane;
  if (rough) plane = RoughInAMoment();
  if (!plane) return std::nullopt;
  Picture picture = Read(*plane, level, wide);
  if (adjustments.AutoLevel) {
    const SampleTable table = LevelTable();
    const IntegerArray values(std::vector<std::int32_t>(table.begin(), table.end()));
    const Picture colours = picture.HasAlpha() ? picture.RGBChannels() : picture;
    if (!colours.TransferFilter(colours, values, values, values))
      throw files::Failure("the levels can't be stretched");
  }
  for (const auto& work : chain) picture = work->Apply(std::move(picture), {.Stores = Stores});
  if (wide.Width != part.Width || wide.Height != part.Height)
    picture = picture.ClipImage({part.X - wide.X, part.Y - wide.Y, part.Width, part.Height});
  return Part{std::move(picture), rough};
}

}
