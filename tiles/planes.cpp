#include "planes.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <utility>

#include "failure.h"
#include "temporary_files.h"

namespace picturezor::tiles {

std::unique_ptr<FilePlane> FilePlane::Of(const Opener& opener, files::Extent size) {
  std::unique_ptr<FilePlane> plane(new FilePlane(opener, size));
  auto reader = plane->TakeReader();
  const files::ImageInfo& info = reader->Info();
  if (!reader->StartsAnywhere() || info.Orientation != 1) return nullptr;
  if (info.Width != size.Width || info.Height != size.Height) return nullptr;
  plane->Free.push_back(std::move(reader));
  return plane;
}

std::unique_ptr<files::ImageReader> FilePlane::TakeReader() {
  {
    const std::lock_guard lock(Access);
    if (!Free.empty()) {
      auto reader = std::move(Free.back());
      Free.pop_back();
      return reader;
    }
  }
  auto reader = Open();
  if (reader->Info().Width != Size().Width) reader->Reduce(Size().Width, Size().Height);
  return reader;
}

void FilePlane::Read(const Rect& part, std::uint8_t* into) {
  auto reader = TakeReader();
  reader->Select(part);
  const std::ptrdiff_t rowBytes = std::ptrdiff_t{part.Width} * files::ChannelsOf(reader->Info().Pixels);
  reader->ReadRows(into, rowBytes, part.Height);
  // One that has thrown isn't used again.
  const std::lock_guard lock(Access);
  Free.push_back(std::move(reader));
}

MappedPlane::MappedPlane(files::Extent size, int channels, const std::filesystem::path& directory)
    : Plane(size),
      Channels(channels),
      RowBytes(std::size_t(size.Width) * std::size_t(channels)),
      Bytes(RowBytes * std::size_t(size.Height)) {
  const int file = files::NamelessFile(directory);
  int failed = posix_fallocate(file, 0, off_t(Bytes));
  if (!failed) {
    void* place = mmap(nullptr, Bytes, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
    if (place == MAP_FAILED)
      failed = errno;
    else
      Start = static_cast<std::uint8_t*>(place);
  }
  close(file);
  if (failed) throw files::Failure(directory, std::string("no room for a pyramid: ") + std::strerror(failed));
}

MappedPlane::~MappedPlane() { munmap(Start, Bytes); }

void MappedPlane::Read(const Rect& part, std::uint8_t* into) {
  const std::size_t count = std::size_t(part.Width) * std::size_t(Channels);
  for (std::int32_t y = 0; y < part.Height; ++y)
    std::memcpy(into + std::size_t(y) * count, Row(part.Y + y) + std::size_t(part.X) * std::size_t(Channels),
                count);
}

namespace {

/// What a person waits for without a thought.
constexpr auto Moment = std::chrono::milliseconds(600);
/// Pixels that a reader decodes in about that time.
constexpr std::int64_t PixelsOfMoment = 20'000'000;

/// Rows from all over the picture, more and more of them, while there is time.
std::unique_ptr<MappedPlane> OfSomeRows(files::ImageReader& reader, std::int32_t edge,
                                        const std::filesystem::path& directory,
                                        const std::atomic<bool>& stop) {
  const files::ImageInfo whole = reader.Info();
  const std::int32_t step = (std::max(whole.Width, whole.Height) - 1) / edge + 1;
  const files::Extent size{(whole.Width - 1) / step + 1, (whole.Height - 1) / step + 1};
  const int channels = files::ChannelsOf(whole.Pixels);
  auto plane = std::make_unique<MappedPlane>(size, channels, directory);
  Bytes row(std::size_t(whole.Width) * std::size_t(channels));
  std::vector<bool> read(std::size_t(size.Height));
  const auto end = std::chrono::steady_clock::now() + Moment;
  std::int32_t apart = 1;
  while (apart < size.Height) apart *= 2;
  for (; apart >= 1; apart /= 2)
    for (std::int32_t y = 0; y < size.Height; y += apart) {
      if (read[std::size_t(y)]) continue;
      if (stop) return nullptr;
      if (y > 0 && std::chrono::steady_clock::now() > end) {
        apart = 1;
        break;
      }
      const std::int32_t middle = std::min(y * step + step / 2, whole.Height - 1);
      reader.Select({0, middle, whole.Width, 1});
      reader.ReadRow(row.data());
      for (std::int32_t x = 0; x < size.Width; ++x)
        std::memcpy(plane->Row(y) + std::ptrdiff_t{x} * channels,
                    row.data() + std::ptrdiff_t{std::min(x * step + step / 2, whole.Width - 1)} * channels,
                    std::size_t(channels));
      read[std::size_t(y)] = true;
    }
  for (std::int32_t y = 1; y < size.Height; ++y)
    if (!read[std::size_t(y)]) std::memcpy(plane->Row(y), plane->Row(y - 1), plane->BytesOfRow());
  plane->Add(size.Height);
  return plane;
}

}

std::unique_ptr<MappedPlane> RoughPlane(const Opener& opener, std::int32_t edge,
                                        const std::filesystem::path& directory,
                                        const std::atomic<bool>& stop) {
  const auto reader = opener();
  reader->Reduce(edge / 2, edge / 2);
  const files::ImageInfo info = reader->Info();
  const bool few = std::int64_t{info.Width} * info.Height <= PixelsOfMoment;
  if (!few && reader->StartsAnywhere() && info.Orientation == 1)
    return OfSomeRows(*reader, edge, directory, stop);
  if (!few) return nullptr;
  const files::ImageInfo upright = files::Upright(info);
  const Picture whole(upright.Width, upright.Height, upright.Pixels);
  if (!whole.Valid()) return nullptr;
  files::Silence silence;
  files::ReadInto(whole, *reader, silence);
  const double factor = std::min(1.0, double(edge) / std::max(upright.Width, upright.Height));
  const files::Extent size{std::max(1, int(upright.Width * factor)),
                           std::max(1, int(upright.Height * factor))};
  const Picture small(size.Width, size.Height, upright.Pixels);
  if (!small.Scale(whole, {}, Kernel::Box, size.Width, size.Height)) return nullptr;
  auto plane = std::make_unique<MappedPlane>(size, files::ChannelsOf(upright.Pixels), directory);
  for (std::int32_t y = 0; y < size.Height; ++y) {
    const Bytes row = small.Row(y);
    std::memcpy(plane->Row(y), row.data(), plane->BytesOfRow());
  }
  plane->Add(size.Height);
  return plane;
}

}
