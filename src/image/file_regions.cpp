#include "image/file_regions.h"

#include <sys/mman.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <utility>

#include "image/stores.h"

namespace zor {
namespace {

constexpr std::int64_t LargePage = 2 << 20, SmallestWindow = 16 << 20, MostBeside = 96 << 20;

/// Whether there is room for more than the window.
bool IsRoomy(const PictureData& data) { return sizeof(void*) > 4 && data.MappingBlockSize <= MostBeside; }

Sample* AddressIn(const FileRegion& region, std::int64_t first, std::int64_t end) {
  const bool holds = region.Start && first >= region.First && end <= region.End;
  return holds ? region.Start + std::ptrdiff_t(first - region.First) : nullptr;
}

void Unmap(FileRegion& region) {
  if (region.Start) munmap(region.Start, std::size_t(region.End - region.First));
  region = {};
}

/// Maps all pages of a window in one go that would cost a fault each. For reading, since a page that isn't
/// written stays clean.
void Populate([[maybe_unused]] const FileRegion& region) {
#ifdef MADV_POPULATE_READ
  // Not every system can, and what it leaves out comes with a fault.
  if (madvise(region.Start, std::size_t(region.End - region.First), MADV_POPULATE_READ) != 0) errno = 0;
#endif
}

/// Maps the bytes in the place of a region.
Sample* Map(const PictureData& data, FileRegion& region, std::int64_t first, std::int64_t end) {
  Unmap(region);
  std::int64_t from = first, to = end;
  if (IsRoomy(data) && end - first >= LargePage) {
    from = first / LargePage * LargePage;
    to = std::max(end, std::min((end + LargePage - 1) / LargePage * LargePage, data.TotalSize));
  }
  const auto bytes = std::size_t(to - from);
  void* start =
      mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_SHARED, data.Samples->FileDescriptor, off_t(from));
  if (start == MAP_FAILED) return nullptr;
#ifdef MADV_HUGEPAGE
  // Not every file system has large pages.
  if (to - from >= LargePage && madvise(start, bytes, MADV_HUGEPAGE) != 0) errno = 0;
#endif
  region = {static_cast<Sample*>(start), from, to};
  return AddressIn(region, first, end);
}

FileRegions* RegionsOf(PictureData& data) {
  if (!data.Regions) data.Regions = static_cast<FileRegions*>(std::calloc(1, sizeof(FileRegions)));
  return data.Regions;
}

}

Sample* WindowBytes(PictureData& data, std::int64_t first, std::int64_t end, std::int64_t above) {
  FileRegions* regions = RegionsOf(data);
  if (!regions) return nullptr;
  auto& [window, other] = *regions;
  if (Sample* at = AddressIn(window, first, end)) return at;
  std::swap(window, other);
  if (Sample* at = AddressIn(window, first, end)) return at;
  if (!IsRoomy(data)) Unmap(other);
  if (IsRoomy(data) && above > 0 && Map(data, window, std::max<std::int64_t>(first - above, 0), end))
    return AddressIn(window, first, end);
  const bool follows = other.Start && first >= other.First && first <= other.End;
  Sample* at = Map(data, window, first, end);
  // Where windows follow one another all of their rows are needed, elsewhere a few may be.
  if (at && follows) Populate(window);
  return at;
}

Sample* BytesBeside(PictureData& data, std::int64_t first, std::int64_t end) {
  FileRegions* regions = RegionsOf(data);
  if (!regions) return nullptr;
  for (const FileRegion* region : {&regions->Window, &regions->Other})
    if (Sample* at = AddressIn(*region, first, end)) return at;
  return Map(data, regions->Other, first, end);
}

std::int64_t MostBytesBeside(const PictureData& data) {
  return IsRoomy(data) && data.MappingBlockSize >= SmallestWindow ? MostBeside : 0;
}

void DropRegions(PictureData& data) {
  if (!data.Regions) return;
  Unmap(data.Regions->Window);
  Unmap(data.Regions->Other);
  std::free(data.Regions);
  data.Regions = nullptr;
}

}
