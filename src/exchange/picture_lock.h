#pragma once
#include <memory>

#include "frame/host_services.h"
#include "image/groups.h"

namespace zor {

struct UnlockObject {
  void operator()(void* object) const { REALUnlockObject(object); }
};
/// A reference to a host object, given back at the end of the scope unless it is released.
using HeldPicture = std::unique_ptr<HostPicture, UnlockObject>;
using HeldObject = std::unique_ptr<void, UnlockObject>;

/// How the pixels of a host picture lie, by the code of the layout. 4 bytes are a top byte, red, green, blue.
enum class HostLayout : std::int32_t { None = 0, RowTable = 8, GWorld24 = 12, GWorld32 = 13 };

/// A host picture that is open for its pixels, with a cursor that goes from row to row; for the length of one
/// operation. All zero when it isn't in use. Between locking and the end no row costs a call of the host.
struct HostPictureLock {
  /// Bytes from one row to the next; rows in a table stand where the table says.
  std::int32_t RowBytes = 0;
  std::int32_t Width = 0, Height = 0;
  /// 3 or 4.
  std::int32_t PixelBytes = 0;
  HostLayout Layout = HostLayout::None;
  Sample *CurrentRow = nullptr, *FirstRow = nullptr;
  /// With a reference.
  HostPicture* Picture = nullptr;
  /// Locked; null where the rows stand in a table.
  void* PixMap = nullptr;
  Sample* const* RowTable = nullptr;
  std::int32_t Y = 0;
  bool ClearCacheOnRelease = false;

  HostPictureLock() = default;
  HostPictureLock(const HostPictureLock&) = delete;
  ~HostPictureLock();
};

// A lock function takes an unused lock. True means that the lock stands, with a reference of its own; after
// false nothing is held. The first picture that is locked decides for the process whether pictures are
// GWorlds or tables of rows: those of the other kind can't be locked afterwards.

/// Opens a picture of the caller. One in another form is drawn into a fresh one first, and the lock stands on
/// that.
bool LockPictureForReading(HostPictureLock& lock, HostPicture* picture);
/// Opens a new picture, 1 to 32767 pixels on a side.
bool LockNewPicture(HostPictureLock& lock, std::int32_t width, std::int32_t height);
/// To the next row. Behind the last one the cursor stands on row 0 again.
void AdvanceLockRow(HostPictureLock& lock);
/// Ends the lock and gives its picture, with a reference for the caller.
HostPicture* FinishPictureLock(HostPictureLock& lock);

/// Red, green and blue of the pixels under the cursor, from column x on.
PlaneList ColoursOf(const HostPictureLock& lock, std::int32_t x = 0);

/// What the record behind a table of rows says.
struct RowTableRecord {
  std::int32_t Zero = 0, Width = 0, Height = 0, NotZero = 0;
  Sample* const* Rows = nullptr;
  /// False on a record of some other kind.
  bool Usable() const { return Zero == 0 && Rows; }
};
RowTableRecord ReadRowTable(const PictureDescription& description);

}
