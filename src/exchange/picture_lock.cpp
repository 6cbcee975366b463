#include "exchange/picture_lock.h"

#include <atomic>
#include <cstring>
#include <utility>

#include "exchange/host_drawing.h"
#include "image/lifecycle.h"

namespace zor {
namespace {

constexpr std::int32_t MostPixels = 32767;

// Which kind of pictures this process has met; set once and for good, by whichever thread comes first.
std::atomic<bool> GWorldPathSeen = false, RowTablePathSeen = false;

template <class T>
T ReadAt(const void* record, std::size_t offset) {
  T value;
  std::memcpy(&value, static_cast<const char*>(record) + offset, sizeof value);
  return value;
}

void Stand(HostPictureLock& lock, HostPicture* picture, const PictureDescription& description) {
  lock.Picture = Locked(picture);
  lock.Width = description.Width;
  lock.Height = description.Height;
}

bool LockGWorld(HostPictureLock& lock, HostPicture* picture, const PictureDescription& description) {
  GWorldPathSeen = true;
  void* pixMap = description.Data ? GetGWorldPixMap(description.Data) : nullptr;
  const std::int32_t depth = pixMap ? GetPixDepth(pixMap) : 0;
  if ((depth == 24 || depth == 32) && LockPixels(pixMap)) {
    if (void* base = GetPixBaseAddr(pixMap)) {
      Stand(lock, picture, description);
      lock.Layout = depth == 24 ? HostLayout::GWorld24 : HostLayout::GWorld32;
      lock.PixelBytes = depth / 8;
      lock.PixMap = pixMap;
      lock.RowBytes = GetPixRowBytes(pixMap);
      lock.FirstRow = lock.CurrentRow = static_cast<Sample*>(base);
      return true;
    }
    UnlockPixels(pixMap);
  }
  unlockPictureDescription(picture);
  return false;
}

bool LockRowTable(HostPictureLock& lock, HostPicture* picture) {
  PictureDescription description{};
  if (!REALLockPictureDescription(picture, &description, RowTableForm)) return false;
  RowTablePathSeen = true;
  const RowTableRecord record = ReadRowTable(description);
  if (description.Kind != RowTableForm || !record.Usable() || record.NotZero == 0) {
    unlockPictureDescription(picture);
    return false;
  }
  Stand(lock, picture, description);
  lock.Layout = HostLayout::RowTable;
  lock.PixelBytes = 4;
  lock.RowBytes = lock.Width * 4;
  lock.RowTable = record.Rows;
  lock.FirstRow = lock.CurrentRow = record.Rows[0];
  return true;
}

/// What a picture whose pixels can't be reached shows, in a fresh one; null when there is no way.
HeldPicture Converted(HostPicture* picture) {
  for (const std::int32_t form : {1, 2, 3}) {
    PictureDescription description{};
    if (!REALLockPictureDescription(picture, &description, form)) continue;
    GWorldPathSeen = true;
    unlockPictureDescription(picture);
    return HeldPicture(ConvertToFreshPicture(picture, description.Width, description.Height));
  }
  return nullptr;
}

bool LockPicture(HostPictureLock& lock, HostPicture* picture, bool mayConvert, bool clearCacheOnRelease) {
  if (!picture) return false;
  lock.ClearCacheOnRelease = clearCacheOnRelease;
  if (RowTablePathSeen) return LockRowTable(lock, picture);
  PictureDescription description{};
  lockPictureDescription(picture, &description);
  if (description.Kind == GWorldForm) return LockGWorld(lock, picture, description);
  unlockPictureDescription(picture);
  if (mayConvert)
    // A fresh one that would have to be converted itself would never come to an end.
    if (const HeldPicture fresh = Converted(picture))
      return LockPicture(lock, fresh.get(), false, clearCacheOnRelease);
  return !GWorldPathSeen && LockRowTable(lock, picture);
}

void ReleasePictureLock(HostPictureLock& lock) {
  if (lock.PixMap) UnlockPixels(std::exchange(lock.PixMap, nullptr));
  HostPicture* picture = std::exchange(lock.Picture, nullptr);
  if (!picture) return;
  unlockPictureDescription(picture);
  if (lock.ClearCacheOnRelease) REALPictureClearCache(picture);
  REALUnlockObject(picture);
}

}

HostPictureLock::~HostPictureLock() { ReleasePictureLock(*this); }

bool LockPictureForReading(HostPictureLock& lock, HostPicture* picture) {
  return LockPicture(lock, picture, true, false);
}

bool LockNewPicture(HostPictureLock& lock, std::int32_t width, std::int32_t height) {
  if (width < 1 || width > MostPixels || height < 1 || height > MostPixels) return false;
  const HeldPicture picture(newPicture(width, height, 32));
  if (!LockPicture(lock, picture.get(), false, true)) return false;
  // Rows as long as what was asked for are written.
  if (lock.Width >= width && lock.Height >= height) return true;
  ReleasePictureLock(lock);
  return false;
}

void AdvanceLockRow(HostPictureLock& lock) {
  if (++lock.Y >= lock.Height)
    lock.CurrentRow = lock.FirstRow;
  else
    lock.CurrentRow =
        lock.RowTable ? lock.RowTable[lock.Y] : lock.FirstRow + std::ptrdiff_t{lock.Y} * lock.RowBytes;
}

HostPicture* FinishPictureLock(HostPictureLock& lock) {
  HostPicture* result = Locked(lock.Picture);
  ReleasePictureLock(lock);
  if (result) REALPictureClearCache(result);
  return result;
}

PlaneList ColoursOf(const HostPictureLock& lock, std::int32_t x) {
  const std::int32_t first = lock.PixelBytes - 3 + x * lock.PixelBytes;
  return {3, lock.PixelBytes, {first, first + 1, first + 2}};
}

RowTableRecord ReadRowTable(const PictureDescription& description) {
  const void* record = description.Data;
  if (!record) return {};
  return {ReadAt<std::int32_t>(record, RowRecord::Zero), ReadAt<std::int32_t>(record, RowRecord::Width),
          ReadAt<std::int32_t>(record, RowRecord::Height), ReadAt<std::int32_t>(record, RowRecord::NotZero),
          ReadAt<Sample* const*>(record, RowRecord::Rows)};
}

}
