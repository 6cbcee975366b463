#include "image/lifecycle.h"

#include <time.h>

#include <cstdlib>
#include <cstring>
#include <limits>
#include <mutex>

#include "frame/classes.h"
#include "image/formats.h"
#include "image/image.h"
#include "image/stores.h"

namespace zor {
namespace {

constexpr std::int32_t MemoryRowUnit = 64;

/// The factory of the process, which any thread may set or ask.
PictureFactoryZOR* GlobalFactory = nullptr;
std::mutex FactoryMutex;

/// Rows in memory start 64 bytes apart or a multiple of it. False when such a row passes 32 bits.
bool SizeInMemory(PictureData& data) {
  data.RowSize = RoundedRowSize(data, MemoryRowUnit);
  data.TotalSize = std::int64_t{data.RowSize} * data.Height;
  return data.RowSize > 0;
}

/// The platform's clock in sixtieths of a second, as 32 bits that wrap round.
std::uint32_t TickCount() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return std::uint32_t(std::uint64_t(now.tv_sec) * 60 + std::uint64_t(now.tv_nsec) * 60 / 1000000000);
}

/// The picture that a factory's handler makes; nil without factory or handler.
PictureZOR* AskFactory(PictureFactoryZOR* factory, std::int32_t width, std::int32_t height,
                       std::int32_t format) {
  if (!factory) return nullptr;
  auto* handler =
      reinterpret_cast<NewPictureHandler*>(GetEventInstancePPC(factory, FactoryClass.Events[0].EventWord));
  return handler ? handler(factory, width, height, format) : nullptr;
}

/// The factory of the process with a reference for the caller, since another thread may set the next one
/// while this one works.
PictureFactoryZOR* TakeGlobalFactory() {
  const std::lock_guard lock(FactoryMutex);
  return Locked(GlobalFactory);
}

/// The picture if it is large enough; otherwise it is given back.
PictureZOR* Acceptable(PictureZOR* picture, std::int32_t width, std::int32_t height) {
  if (!picture) return nullptr;
  const PictureData& data = DataOf(picture);
  if (data.Valid && data.Width >= width && data.Height >= height) return picture;
  Unlock(picture);
  return nullptr;
}

bool CanAllocate(std::size_t size) {
  // Volatile, since a compiler may take memory that nobody uses for granted.
  void* volatile memory = std::calloc(1, size);
  const bool had = memory != nullptr;
  std::free(memory);
  return had;
}

}

PictureData& DataOf(PictureZOR* picture) {
  return *reinterpret_cast<PictureData*>(reinterpret_cast<char*>(picture) + PictureClass.InstanceOffsetSlot);
}

PictureZOR* NewPictureObject() { return static_cast<PictureZOR*>(PluginNewInstance(PictureClass.ClassName)); }

void Constructor(PictureZOR* self, Integer width, Integer height, Integer format) {
  PictureData& data = DataOf(self);
  if (!IsNew(data) || !InitImageLayout(&data, width, height, std::uint32_t(format))) return;
  data.Valid = SizeInMemory(data) && UseOwnMemory(data);
}

void Constructor(PictureZOR* self, MemoryBlock* buf, Integer width, Integer height, Integer format,
                 Integer rowSize) {
  PictureData& data = DataOf(self);
  if (!buf || rowSize < 0 || !IsNew(data) || !InitImageLayout(&data, width, height, std::uint32_t(format)))
    return;
  const std::int64_t total = std::int64_t{rowSize} * height;
  if (total > std::numeric_limits<std::uint32_t>::max() ||
      PackedRowBytes(data) > std::numeric_limits<std::int32_t>::max())
    return;
  data.RowSize = rowSize;
  data.TotalSize = total;
  if (!UseHostMemory(data, memoryBlockGetPtr(buf), buf)) return;
  data.MemoryTarget = Locked(buf);
  data.Valid = true;
}

void Constructor(PictureZOR* self, Integer width, Integer height, Integer format, Integer blockSize,
                 FolderItem* filePath) {
  PictureData& data = DataOf(self);
  if (!IsNew(data) || !InitImageLayout(&data, width, height, std::uint32_t(format))) return;
  data.RowSize = RoundedRowSize(data, PageSize);
  // A window of five rows must fit in MappingBlockSize.
  if (data.RowSize == 0 || data.RowSize > std::numeric_limits<std::int32_t>::max() / 5 / PageSize * PageSize)
    return;
  data.TotalSize = std::int64_t{data.RowSize} * height;
  char* path = FolderItemToPath(filePath);
  if (!path) return;
  data.Valid = UseMappedFile(data, path, blockSize);
  if (data.Samples) data.FileItem = Locked(filePath);
}

void Close(PictureZOR* self) {
  PictureData& data = DataOf(self);
  LeaveStore(data);
  Unlock(std::exchange(data.Parent, nullptr));
  Unlock(std::exchange(data.MemoryTarget, nullptr));
  Unlock(std::exchange(data.FileItem, nullptr));
  Unlock(std::exchange(data.Target, nullptr));
}

PictureZOR* Clone(PictureZOR* self) {
  PictureData& source = DataOf(self);
  if (source.IsMapping || !Usable(source)) return nullptr;
  Held result{NewPictureObject()};
  if (!result) return nullptr;

  // Everything but what belongs to one picture: its store, its references, its settings.
  PictureData& data = result.Data();
  data = source;
  data.YieldTicks = data.LastYieldTick = 0;
  data.Factory = nullptr;
  data.DebugPictureEnabled = 0;
  data.Parent = nullptr;
  data.MemoryTarget = nullptr;
  data.Target = nullptr;
  data.Samples = nullptr;
  data.RowOffset = data.MappingBlockSize = 0;

  // In a caller's block the last row may be longer than the way from row to row.
  data.TotalSize = std::int64_t{source.RowSize} * (source.Height - 1) + StoredRowBytes(source);
  if (!UseOwnMemory(data)) {
    data.RowGetter = nullptr;
    data.PixelBase = nullptr;
    return nullptr;
  }
  const Sample* first = source.PixelBase + std::ptrdiff_t{source.RowOffset} * source.RowSize;
  std::memcpy(data.PixelBase, first, std::size_t(data.TotalSize));
  data.TotalSize = source.TotalSize;
  data.RowGetter = source.RowGetter;
  data.RowsPerBlock = 0;
  return result.HandOn();
}

bool HasFactory(const PictureData& data) { return data.Factory || GlobalFactory; }

PictureZOR* AskFactories(const PictureData* data, std::int32_t width, std::int32_t height,
                         std::int32_t format) {
  const auto ask = [=](PictureFactoryZOR* factory) {
    return Acceptable(AskFactory(factory, width, height, format), width, height);
  };
  if (PictureZOR* picture = ask(data ? data->Factory : nullptr)) return picture;
  PictureFactoryZOR* const global = TakeGlobalFactory();
  PictureZOR* const picture = ask(global);
  Unlock(global);
  return picture;
}

PictureZOR* NewPictureInMemory(std::int32_t width, std::int32_t height, std::int32_t format) {
  PictureZOR* picture = NewPictureObject();
  if (!picture) return nullptr;
  Constructor(picture, width, height, format);
  return Acceptable(picture, width, height);
}

PictureZOR* CreatePictureThroughFactory(const PictureData* data, std::int32_t width, std::int32_t height,
                                        std::int32_t format) {
  PictureZOR* picture = AskFactories(data, width, height, format);
  return picture ? picture : NewPictureInMemory(width, height, format);
}

PictureZOR* CreatePictureZOR(PictureZOR* self, Integer width, Integer height, Integer format) {
  return CreatePictureThroughFactory(&DataOf(self), width, height, format);
}

PictureZOR* CreatePictureZOR(Integer width, Integer height, Integer format) {
  return CreatePictureThroughFactory(nullptr, width, height, format);
}

Int64 CalculateMemory(Integer width, Integer height, Integer format) {
  PictureData data{};
  if (!InitImageLayout(&data, width, height, std::uint32_t(format)) || !SizeInMemory(data)) return 0;
  return data.TotalSize;
}

Boolean CanAllocateImage(Integer width, Integer height, Integer format) {
  constexpr std::size_t Reserve = 1 << 20;
  const Int64 size = CalculateMemory(width, height, format);
  if (size == 0 || size > std::numeric_limits<std::uint32_t>::max()) return false;
  void* volatile reserve = std::calloc(1, Reserve);
  const bool had = reserve && CanAllocate(std::size_t(size));
  std::free(reserve);
  return had;
}

void SetFactory(PictureFactoryZOR* factory) {
  Locked(factory);
  {
    const std::lock_guard lock(FactoryMutex);
    std::swap(GlobalFactory, factory);
  }
  Unlock(factory);
}

MemoryBlock* Memory(PictureZOR* self, Word) {
  PictureData& data = DataOf(self);
  return data.PixelBase ? PtrToMemoryBlock(data.PixelBase) : nullptr;
}

Int64 TotalSize(PictureZOR* self, Word) { return DataOf(self).TotalSize; }

HostString* ImageFormatString(PictureZOR* self, Word) {
  const char* name = FormatName(std::uint32_t(DataOf(self).ImageFormat));
  return name ? BuildHostString(name, std::int32_t(std::strlen(name)), EncodingASCII) : nullptr;
}

void YieldCheck(PictureData& picture) {
  const std::uint32_t now = TickCount(), last = std::uint32_t(picture.LastYieldTick);
  // A clock that stepped back counts by its distance too.
  const std::uint32_t distance = std::int32_t(now - last) < 0 ? last - now : now - last;
  if (distance < std::uint32_t(picture.YieldTicks)) return;
  REALYieldToRB();
  picture.LastYieldTick = std::int32_t(TickCount());
}

}
