#include "image/stores.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <limits>
#include <mutex>
#include <new>
#include <utility>

#include "frame/host_services.h"
#include "image/buffers.h"
#include "image/file_regions.h"
#include "image/formats.h"

namespace zor {

std::int32_t PageSize = 4096;

void InitPageSize() { PageSize = std::max(getpagesize(), 4096); }

namespace {

static_assert(sizeof(off_t) == 8, "a file is larger than the memory that a 32-bit process can address");

constexpr std::int64_t Int32Max = std::numeric_limits<std::int32_t>::max();

/// The bytes that follow the last row of a file, so that its end is backed before anything is mapped.
constexpr std::size_t TailSize = 4096;

/// A store for one picture.
Store* NewStore() {
  void* memory = std::calloc(1, sizeof(Store));
  return memory ? new (memory) Store : nullptr;
}

/// All stores on files. A file loses its name before it leaves the list, so that nobody opens it in between.
Store* StoresOnFiles = nullptr;
std::mutex FilesMutex;

/// Whether a picture may be put on the file. One that another picture is on would lose its rows, and touching
/// those would end the process; a device, or a pipe, is no place for one.
bool MayBeOverwritten(int fileDescriptor) {
  struct stat file {};
  if (fstat(fileDescriptor, &file) != 0 || !S_ISREG(file.st_mode)) return false;
  for (const Store* store = StoresOnFiles; store; store = store->NextOnFile) {
    struct stat used {};
    if (fstat(store->FileDescriptor, &used) != 0) return false;
    if (used.st_dev == file.st_dev && used.st_ino == file.st_ino) return false;
  }
  return true;
}

/// Opens the file for the store. False, and the file left as it was, where no picture may be put on it.
bool OpenFile(Store& store) {
  const std::lock_guard lock(FilesMutex);
  // Cut once it is known that nobody is on it. Not waiting, since a pipe would wait for its other end.
  const int opened = open(store.Path, O_RDWR | O_CREAT | O_CLOEXEC | O_NONBLOCK, S_IRUSR | S_IWUSR);
  if (opened < 0) return false;
  if (!MayBeOverwritten(opened)) {
    close(opened);
    return false;
  }
  store.FileDescriptor = opened;
  store.NextOnFile = std::exchange(StoresOnFiles, &store);
  return true;
}

void EndFile(Store& store) {
  if (store.FileDescriptor < 0) return;
  // Where the file can't be cut, removing it frees its blocks all the same.
  if (ftruncate(store.FileDescriptor, 0) != 0) errno = 0;
  const std::lock_guard lock(FilesMutex);
  unlink(store.Path);
  Store** place = &StoresOnFiles;
  while (*place != &store) place = &(*place)->NextOnFile;
  *place = store.NextOnFile;
  close(store.FileDescriptor);
}

void EndStore(Store* store) {
  std::free(store->Memory);
  EndFile(*store);
  std::free(store->Path);
  if (store->Keeper) REALUnlockObject(store->Keeper);
  std::free(store);
}

/// Whether the file system says that it has this many bytes left. Asked before a block is taken: a file that
/// can't fit would fill the disk first and fail then, and others would find it full meanwhile.
bool HasRoom(int fileDescriptor, std::int64_t bytes) {
  struct statvfs system {};
  if (fstatvfs(fileDescriptor, &system) != 0 || system.f_frsize == 0) return true;
  return std::uint64_t(bytes) / system.f_frsize <= system.f_bavail;
}

/// Gives the file its size, with every block reserved: a sparse page that can't be backed later would end the
/// process in the middle of a row.
bool ReserveFile(int fileDescriptor, std::int64_t total) {
  if (ftruncate(fileDescriptor, 0) != 0 || !HasRoom(fileDescriptor, total)) return false;
  if (ftruncate(fileDescriptor, off_t(total + PageSize)) != 0) return false;
  if (lseek(fileDescriptor, off_t(total), SEEK_SET) != off_t(total)) return false;
  static constexpr char zeros[TailSize] = {};
  if (write(fileDescriptor, zeros, TailSize) != ssize_t(TailSize)) return false;
  int error;
  do error = posix_fallocate(fileDescriptor, 0, off_t(total + PageSize));
  while (error == EINTR);
  return error == 0;
}

void DropWindow(PictureData& data) {
  DropRegions(data);
  if (!data.WindowMapped) return;
  data.WindowMapped = false;
  data.PixelBase = nullptr;
  data.WindowFirstRow = data.WindowLastRow = -1;
}

/// Moves the window so that it starts two rows above the asked one, where the file allows.
/// The window of a picture that lacks the rows for one can't be placed.
void PlaceWindow(PictureData& data, std::int64_t storeRow) {
  const std::int64_t limit = data.TotalSize / data.RowSize - data.RowsPerBlock;
  const std::int64_t first = std::min(storeRow > 1 ? storeRow - 2 : storeRow, limit);
  const std::int64_t block = data.MappingBlockSize, from = first * data.RowSize;
  const bool upwards = data.WindowMapped && storeRow < data.WindowFirstRow;
  data.WindowMapped = false;
  data.WindowFirstRow = data.WindowLastRow = -1;
  data.PixelBase = first < 0 ? nullptr : WindowBytes(data, from, from + block, upwards ? block : 0);
  if (!data.PixelBase) return;
  data.WindowMapped = true;
  data.WindowFirstRow = std::int32_t(first);
  data.WindowLastRow = std::int32_t(first + data.RowsPerBlock - 1);
}

bool InWindow(const PictureData& data, std::int64_t storeRow) {
  return data.WindowMapped && storeRow >= data.WindowFirstRow && storeRow <= data.WindowLastRow;
}

Sample* WindowRow(PictureData& data, std::int64_t storeRow) {
  if (!InWindow(data, storeRow)) PlaceWindow(data, storeRow);
  if (!InWindow(data, storeRow)) return nullptr;
  return data.PixelBase + std::ptrdiff_t(storeRow - data.WindowFirstRow) * data.RowSize;
}

std::int64_t StoreRow(const PictureData& data, std::int32_t row) {
  return std::int64_t{row} + data.RowOffset;
}
std::int64_t MirroredStoreRow(const PictureData& data, std::int32_t row) {
  return std::int64_t{data.Height} - row - 1 + data.RowOffset;
}

/// The bytes of a picture's pixels, a run a row, by their addresses or by their places in its file. Pixels
/// without planes begin where the row does, whatever the view.
struct PixelRuns {
  std::int64_t First, Step, Bytes, Count;

  explicit PixelRuns(const PictureData& data) {
    const std::int32_t left = data.ChannelCount > 0 ? data.LeftEdge : 0;
    const std::int64_t base = data.IsMapping ? 0 : std::int64_t(reinterpret_cast<Word>(data.PixelBase));
    First = base + StoreRow(data, 0) * data.RowSize + left;
    Step = data.RowSize;
    Bytes = data.LeftEdge - left + PackedRowBytes(data);
    Count = data.Width > 0 ? data.Height : 0;
  }
  std::int64_t End() const { return First + Bytes; }
  /// Leaves the runs out that end at a place or before it, of which the first is one.
  void SkipTo(std::int64_t place) {
    const std::int64_t runs = Step > 0 ? std::min((place - End()) / Step + 1, Count) : Count;
    First += runs * Step;
    Count -= runs;
  }
};

/// Calls move(row, byte in it, bytes, place in the file), as pread and pwrite are called, for each row of a
/// rectangle until all its bytes are moved. False when the system moves none.
template <class Move>
bool MovePixels(const PictureData& picture, const Rectangle& pixels, Move&& move) {
  const std::int64_t left = picture.LeftEdge + std::int64_t{pixels.X} * picture.PixelSize;
  const std::ptrdiff_t bytes = std::ptrdiff_t{pixels.Width} * picture.PixelSize;
  for (std::int32_t y = 0; y < pixels.Height; ++y) {
    const std::int64_t place = StoreRowOf(picture, pixels.Y + y) * picture.RowSize + left;
    for (std::ptrdiff_t done = 0; done < bytes;) {
      const ssize_t moved = move(y, done, std::size_t(bytes - done), off_t(place + done));
      if (moved > 0)
        done += moved;
      else if (moved == 0 || errno != EINTR)
        return false;
    }
  }
  return true;
}

Sample* PlainRow(PictureData* data, std::int32_t row) {
  return data->PixelBase + std::ptrdiff_t(StoreRow(*data, row)) * data->RowSize;
}
Sample* PlainRowMirrored(PictureData* data, std::int32_t row) {
  return data->PixelBase + std::ptrdiff_t(MirroredStoreRow(*data, row)) * data->RowSize;
}
Sample* MappedRow(PictureData* data, std::int32_t row) { return WindowRow(*data, StoreRow(*data, row)); }
Sample* MappedRowMirrored(PictureData* data, std::int32_t row) {
  return WindowRow(*data, MirroredStoreRow(*data, row));
}

}

PictureData::RowFunction Mirrored(PictureData::RowFunction getter) {
  if (getter == PlainRow) return PlainRowMirrored;
  if (getter == PlainRowMirrored) return PlainRow;
  if (getter == MappedRow) return MappedRowMirrored;
  if (getter == MappedRowMirrored) return MappedRow;
  return getter;
}

bool IsMirrored(const PictureData& picture) {
  return picture.RowGetter == PlainRowMirrored || picture.RowGetter == MappedRowMirrored;
}

std::int32_t MostRowsTogether(const PictureData& data) {
  if (!data.IsMapping) return data.Height;
  // Those of the window but the two above the one that it was placed for.
  return std::max(data.RowsPerBlock - 2, std::int32_t(MostBytesBeside(data) / data.RowSize));
}

Sample* RowsTogether(PictureData& data, std::int32_t first, std::int32_t last) {
  if (!data.RowGetter) return nullptr;
  if (!data.IsMapping) return data.RowGetter(&data, first);
  const bool mirrored = IsMirrored(data);
  const std::int64_t top = mirrored ? MirroredStoreRow(data, last) : StoreRow(data, first);
  const std::int64_t bottom = top + last - first, size = data.RowSize;
  const auto held = [&] { return InWindow(data, top) && InWindow(data, bottom); };
  if (!held() && bottom - top < data.RowsPerBlock - 2) PlaceWindow(data, top);
  Sample* at = held() ? data.PixelBase + (top - data.WindowFirstRow) * size
               : (bottom - top + 1) * size > MostBytesBeside(data)
                   ? nullptr
                   : BytesBeside(data, top * size, (bottom + 1) * size);
  return at && mirrored ? at + (bottom - top) * size : at;
}

bool ReadPixels(const PictureData& picture, const Rectangle& pixels, Sample* into, std::ptrdiff_t stride) {
  const int file = picture.Samples->FileDescriptor;
  return MovePixels(picture, pixels,
                    [&](std::int32_t y, std::ptrdiff_t done, std::size_t bytes, off_t place) {
                      return pread(file, into + y * stride + done, bytes, place);
                    });
}

bool WritePixels(const PictureData& picture, const Rectangle& pixels, const Sample* from,
                 std::ptrdiff_t stride) {
  const int file = picture.Samples->FileDescriptor;
  return MovePixels(picture, pixels,
                    [&](std::int32_t y, std::ptrdiff_t done, std::size_t bytes, off_t place) {
                      return pwrite(file, from + y * stride + done, bytes, place);
                    });
}

std::int32_t RoundedRowSize(const PictureData& data, std::int32_t unit) {
  const std::int64_t rounded = (PackedRowBytes(data) + unit - 1) / unit * unit;
  return rounded <= Int32Max ? std::int32_t(rounded) : 0;
}

bool UseOwnMemory(PictureData& data) {
  if (data.TotalSize > Int32Max) return false;
  // Of so much the system hands out fresh pages, the large ones at multiples of their size: what stands
  // before the first of them and behind the last comes in small ones.
  constexpr std::size_t large = 2 << 20, fresh = 32 << 20;
  const auto bytes = std::size_t(data.TotalSize), spare = bytes < fresh ? 0 : large - 1;
  auto* memory = static_cast<Sample*>(std::calloc(1, bytes + spare));
  if (!memory) return false;
  Sample* first = spare == 0 ? memory : memory + std::size_t(-reinterpret_cast<Word>(memory)) % large;
  WantLargePages(first, bytes);
  Store* store = NewStore();
  if (!store) {
    std::free(memory);
    return false;
  }
  data.Samples = store;
  store->Memory = memory;
  data.PixelBase = first;
  data.RowsPerBlock = data.Height;
  data.RowGetter = PlainRow;
  return true;
}

bool UseHostMemory(PictureData& data, void* base, void* keeper) {
  Store* store = base ? NewStore() : nullptr;
  if (!store) return false;
  data.Samples = store;
  REALLockObject(keeper);
  store->Keeper = keeper;
  data.PixelBase = static_cast<Sample*>(base);
  data.RowsPerBlock = data.Height;
  data.RowGetter = PlainRow;
  return true;
}

bool UseMappedFile(PictureData& data, char* path, std::int32_t blockSize) {
  Store* store = NewStore();
  if (!store) {
    std::free(path);
    return false;
  }
  store->Path = path;
  if (!OpenFile(*store) || !ReserveFile(store->FileDescriptor, data.TotalSize)) {
    EndStore(store);
    return false;
  }
  data.Samples = store;
  data.WindowFirstRow = data.WindowLastRow = -1;
  data.PixelBase = nullptr;
  data.IsMapping = true;
  data.RowGetter = MappedRow;
  ComputeBlockSize(data, blockSize);
  return data.RowGetter(&data, 0) != nullptr;
}

void ShareStore(PictureData& view, const PictureData& parent) {
  view.Samples = parent.Samples;
  if (view.Samples) ++view.Samples->Pictures;
  if (!parent.IsMapping) {
    view.PixelBase = parent.PixelBase;
    return;
  }
  view.IsMapping = true;
  view.RowsPerBlock = parent.RowsPerBlock;
  view.MappingBlockSize = parent.MappingBlockSize;
  view.WindowFirstRow = view.WindowLastRow = -1;
  if (view.RowGetter) view.RowGetter(&view, 0);
}

void LeaveStore(PictureData& data) {
  DropWindow(data);
  data.PixelBase = nullptr;
  data.RowGetter = nullptr;
  Store* store = data.Samples;
  data.Samples = nullptr;
  if (store && --store->Pictures == 0) EndStore(store);
}

void ComputeBlockSize(PictureData& data, std::int32_t requested) {
  const std::int64_t page = PageSize;
  std::int64_t block = std::max(requested / page, page) * page;
  block = std::min(block, data.TotalSize);
  block = std::max(block, std::int64_t{5} * data.RowSize);
  block = std::min((block + page - 1) / page * page, Int32Max / page * page);
  data.MappingBlockSize = std::int32_t(block);
  data.RowsPerBlock = data.RowSize > 0 ? std::int32_t(block / data.RowSize) : data.Height;
}

void SetMappingBlockSize(PictureZOR* self, Word, Integer value) {
  PictureData& data = DataOf(self);
  if (!data.RowGetter) return;
  DropWindow(data);
  ComputeBlockSize(data, value);
  data.RowGetter(&data, 0);
}

bool SharePixels(const PictureData& a, const PictureData& b) {
  if (!a.Samples || !b.Samples || a.IsMapping != b.IsMapping) return false;
  if (a.IsMapping && a.Samples != b.Samples) return false;
  PixelRuns first(a), second(b);
  while (first.Count > 0 && second.Count > 0) {
    if (first.End() <= second.First)
      first.SkipTo(second.First);
    else if (second.End() <= first.First)
      second.SkipTo(first.First);
    else
      return true;
  }
  return false;
}

std::int64_t StoreRowOf(const PictureData& picture, std::int32_t y) {
  return IsMirrored(picture) ? MirroredStoreRow(picture, y) : StoreRow(picture, y);
}

bool RowsAreApart(const PictureData& picture) { return StoredRowBytes(picture) <= picture.RowSize; }

std::int32_t ReadAhead(const PictureData& read, Place from, const PictureData& written, Place into) {
  constexpr std::int32_t any = std::numeric_limits<std::int32_t>::max();
  if (read.Samples != written.Samples || !RowsAreApart(read) || !RowsAreApart(written))
    return SharePixels(read, written) ? 1 : any;
  if (StoreRowOf(read, from.Y) != StoreRowOf(written, into.Y)) return any;
  const auto column = [](const PictureData& picture, std::int32_t x) {
    return picture.LeftEdge / picture.PixelSize + x;
  };
  const std::int32_t ahead = column(written, into.X) - column(read, from.X);
  return ahead > 0 ? ahead : any;
}

}
