#pragma once
#include <atomic>
#include <condition_variable>
#include <exception>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "fault_handler.h"
#include "rows.h"

namespace picturezor::flow {

/// A picture whose rows arrive while they are read: of the memory that it seems to take only some megabytes
/// around the places that are read are there. It is to be read from top to bottom, by several threads each in
/// a part of its own. A thread that comes to a row that isn't there waits for it, in the handler of the
/// memory fault; one that goes back further than some megabytes is served too, by starting over.
///
/// The picture lies on a range of addresses that is cut into chunks. A cursor is a thread that fills chunks,
/// one after the other, from its place on; a filled one is shown in the range when a reader touches it, which
/// is how the reader's place is known.
class ArrivingPicture {
 public:
  /// `readers` threads read at most. Where rows can't be had from any place at little cost one cursor serves
  /// them all.
  ArrivingPicture(const RowSource& rows, int readers);
  ~ArrivingPicture();
  ArrivingPicture(const ArrivingPicture&) = delete;

  /// For reading only, and not beyond this object's life.
  const Picture& Of() const { return Shown; }
  /// Rows that have been read so far; more than there are where some were read twice.
  std::int64_t RowsRead() const { return Read; }
  /// Lets the readers go on at once: they meet zeros from now on.
  void GiveUp();
  /// Throws what kept rows from coming. The readers have met zeros then.
  void RequireAll() const;

 private:
  struct Cursor;

  void Reserve(int cursors);
  void Release();
  /// Called by a reader that has touched the range at a place where nothing is shown; returns when there is.
  void OnTouch(std::uintptr_t address);
  Cursor& CursorFor(std::int64_t chunk);
  void Show(std::int64_t chunk);
  void Hide(Cursor& cursor, std::int64_t end);
  void Run(Cursor& cursor);
  /// Whether a cursor may go on.
  bool MayFill(const Cursor& cursor) const;
  void Fill(Cursor& cursor, std::int64_t chunk, std::uint8_t* into);
  void Fail(const std::exception_ptr& reason);
  void ShowZeros();

  const RowSource From;
  const std::int64_t RowBytes, RowSize;
  std::int64_t ChunkCount() const { return std::int64_t(Chunks.size()); }

  std::int64_t TotalBytes = 0, ChunkBytes = 0;
  /// Chunks that a cursor is ahead of its reader, and keeps behind it.
  std::int64_t Ahead = 0, Behind = 0;
  std::uint8_t* Range = nullptr;
  /// The chunks' memory, of which the range shows those that are filled.
  int File = -1;
  std::uint8_t* Slots = nullptr;
  std::size_t SlotBytes = 0;

  mutable std::mutex Access;
  std::condition_variable Changed;
  struct Chunk {
    std::int32_t Slot = -1;
    bool Shown = false;
  };
  std::vector<Chunk> Chunks;
  std::vector<std::unique_ptr<Cursor>> Cursors;
  /// Counts touches; how often the same place was touched although it is shown.
  std::int64_t Touches = 0, Vain = 0;
  std::uintptr_t LastTouch = 0;
  std::atomic<bool> GaveUp = false;
  std::exception_ptr Failed;
  std::atomic<std::int64_t> Read = 0;
  std::optional<FaultHandler> Touched;
  Picture Shown;
};

}
