#include "arriving_picture.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <span>
#include <string>
#include <string_view>
#include <thread>
#include <utility>

#include "failure.h"
#include "worker_threads.h"

namespace picturezor::flow {

namespace {

/// A cursor is so far ahead of its reader, and keeps so much behind it.
constexpr std::int64_t BytesAhead = 4 << 20, BytesBehind = 4 << 20;
/// Smaller pictures are gone through several times, in stripes that fit a cache, and so are kept whole.
constexpr std::int64_t BytesKeptWhole = 16 << 20;
constexpr std::int64_t MostChunkBytes = 1 << 20;
constexpr std::int64_t RowUnit = 64;
/// Readers that touch a place together are some.
constexpr std::int64_t MostVainTouches = 10000;

std::int64_t RoundedUp(std::int64_t bytes, std::int64_t unit) { return (bytes + unit - 1) / unit * unit; }

[[noreturn]] void FailBySystem() {
  throw files::Failure(std::string("no room for a picture that arrives: ") + std::strerror(errno));
}

/// For what can't be and can't be told otherwise: a reader is in the midst of the module.
[[noreturn]] void EndProcess(std::string_view line) {
  if (write(STDERR_FILENO, line.data(), line.size()) < 0) std::abort();
  std::abort();
}

}

struct ArrivingPicture::Cursor {
  /// The chunk that it fills next, and the furthest one that a reader wanted of it.
  std::int64_t Next = 0, Wanted = -1;
  /// The chunk that it is filling, or -1.
  std::int64_t Filling = -1;
  /// When a reader was last here.
  std::int64_t Used = 0;
  /// The chunks filled, in order, whose slots are the cursor's.
  std::deque<std::int64_t> Filled;
  std::vector<std::int32_t> FreeSlots;
  /// Its rows end, and new ones begin with the chunk `Next`.
  bool StartsOver = false;
  std::thread Thread;

  // The thread's own: a row that goes on in the next chunk.
  std::unique_ptr<Rows> Source;
  Bytes Row;
  std::int64_t RowInHand = -1;
};

ArrivingPicture::ArrivingPicture(const RowSource& rows, int readers)
    : From(rows), RowBytes(rows.Of.RowBytes()), RowSize(RoundedUp(RowBytes, RowUnit)) {
  try {
    Reserve(rows.Anywhere ? std::max(readers, 1) : 1);
    const std::span<std::uint8_t> all(Range, std::size_t(TotalBytes));
    Shown = Picture(MemoryBlock::Over(all), rows.Of.Width, rows.Of.Height, rows.Of.Of, std::int32_t(RowSize));
    if (!Shown.Valid()) throw files::Failure("a picture of this size can't arrive");
    Touched.emplace(Range, std::size_t(TotalBytes), [this](std::uintptr_t address) { OnTouch(address); });
    // The first rows are wanted for certain.
    Cursors.front()->Wanted = 0;
    Cursors.front()->Used = ++Touches;
    for (const auto& cursor : Cursors)
      cursor->Thread = files::StartThread([this, &own = *cursor] { Run(own); });
  } catch (...) {
    Release();
    throw;
  }
}

ArrivingPicture::~ArrivingPicture() { Release(); }

void ArrivingPicture::Release() {
  GiveUp();
  for (const auto& cursor : Cursors)
    if (cursor->Thread.joinable()) cursor->Thread.join();
  Touched.reset();
  Shown = Picture();
  if (Range) munmap(Range, Chunks.size() * std::size_t(ChunkBytes));
  if (Slots) munmap(Slots, SlotBytes);
  if (File >= 0) close(File);
}

void ArrivingPicture::Reserve(int cursors) {
  const std::int64_t page = sysconf(_SC_PAGESIZE);
  TotalBytes = RowSize * From.Of.Height;
  ChunkBytes = std::clamp(RoundedUp(TotalBytes / 16, page), RoundedUp(64 << 10, page), MostChunkBytes);
  Ahead = BytesAhead / ChunkBytes;
  Behind = (TotalBytes <= BytesKeptWhole ? BytesKeptWhole : BytesBehind) / ChunkBytes;
  Chunks.resize(std::size_t((TotalBytes + ChunkBytes - 1) / ChunkBytes));
  // Those that are kept, and the one that is being filled.
  const std::int64_t slots = std::min(Ahead + Behind + 2, std::int64_t(Chunks.size()) + 1);
  SlotBytes = std::size_t(slots * cursors * ChunkBytes);
  const auto reserved = [](void* place) {
    return place == MAP_FAILED ? nullptr : static_cast<std::uint8_t*>(place);
  };
  Range = reserved(mmap(nullptr, Chunks.size() * std::size_t(ChunkBytes), PROT_NONE,
                        MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0));
  if (!Range) FailBySystem();
  File = memfd_create("picturezor", MFD_CLOEXEC);
  if (File < 0 || ftruncate(File, off_t(SlotBytes)) != 0) FailBySystem();
  Slots = reserved(mmap(nullptr, SlotBytes, PROT_READ | PROT_WRITE, MAP_SHARED, File, 0));
  if (!Slots) FailBySystem();
  for (int i = 0; i < cursors; ++i) {
    Cursors.push_back(std::make_unique<Cursor>());
    Cursor& cursor = *Cursors.back();
    // The handler of a fault allocates nothing.
    cursor.FreeSlots.reserve(std::size_t(slots));
    for (std::int64_t s = 0; s < slots; ++s) cursor.FreeSlots.push_back(std::int32_t(i * slots + s));
  }
}

void ArrivingPicture::OnTouch(std::uintptr_t address) {
  const auto chunk = std::int64_t(address - reinterpret_cast<std::uintptr_t>(Range)) / ChunkBytes;
  std::unique_lock lock(Access);
  while (!GaveUp) {
    Chunk& touched = Chunks[std::size_t(chunk)];
    if (touched.Shown) {
      // Another reader has been faster, or this isn't one.
      Vain = address == LastTouch ? Vain + 1 : 0;
      LastTouch = address;
      if (Vain > MostVainTouches) EndProcess("picturezor: a picture was written to while it arrived\n");
      return;
    }
    Cursor& cursor = CursorFor(chunk);
    cursor.Wanted = std::max(cursor.Wanted, chunk);
    cursor.Used = ++Touches;
    Changed.notify_all();
    if (touched.Slot >= 0) return Show(chunk);
    Changed.wait(lock);
  }
}

ArrivingPicture::Cursor& ArrivingPicture::CursorFor(std::int64_t chunk) {
  const bool filled = Chunks[std::size_t(chunk)].Slot >= 0;
  Cursor* idle = Cursors.front().get();
  for (const auto& cursor : Cursors) {
    // It may have passed by the chunk, which another one had filled, and has given up since.
    const bool soon = Cursors.size() == 1 || chunk <= cursor->Next + Ahead;
    const bool comes = chunk == cursor->Filling || (chunk >= cursor->Next && soon && cursor->Wanted >= 0);
    if (filled ? std::ranges::find(cursor->Filled, chunk) != cursor->Filled.end() : comes) return *cursor;
    if (cursor->Used < idle->Used) idle = cursor.get();
  }
  Hide(*idle, ChunkCount());
  idle->StartsOver = true;
  idle->Filling = -1;
  idle->Next = idle->Wanted = chunk;
  return *idle;
}

void ArrivingPicture::Show(std::int64_t chunk) {
  Chunk& shown = Chunks[std::size_t(chunk)];
  void* const place = Range + chunk * ChunkBytes;
  if (mmap(place, std::size_t(ChunkBytes), PROT_READ, MAP_SHARED | MAP_FIXED | MAP_POPULATE, File,
           off_t(shown.Slot * ChunkBytes)) != place)
    EndProcess("picturezor: not enough memory for a picture that arrives\n");
  shown.Shown = true;
}

void ArrivingPicture::Hide(Cursor& cursor, std::int64_t end) {
  while (!cursor.Filled.empty() && cursor.Filled.front() < end) {
    const std::int64_t chunk = cursor.Filled.front();
    cursor.Filled.pop_front();
    const Chunk hidden = std::exchange(Chunks[std::size_t(chunk)], {});
    cursor.FreeSlots.push_back(hidden.Slot);
    void* const place = Range + chunk * ChunkBytes;
    if (hidden.Shown && mmap(place, std::size_t(ChunkBytes), PROT_NONE,
                             MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE | MAP_FIXED, -1, 0) != place)
      EndProcess("picturezor: not enough memory for a picture that arrives\n");
  }
}

bool ArrivingPicture::MayFill(const Cursor& cursor) const {
  return cursor.Wanted >= 0 && cursor.Next < ChunkCount() && cursor.Next <= cursor.Wanted + Ahead &&
         (!cursor.FreeSlots.empty() || cursor.Filled.front() < cursor.Wanted - Behind);
}

void ArrivingPicture::Run(Cursor& cursor) {
  std::unique_lock lock(Access);
  for (;;) {
    Changed.wait(lock, [&] { return GaveUp || MayFill(cursor); });
    if (GaveUp) return;
    Hide(cursor, cursor.Wanted - Behind);
    const bool startsOver = std::exchange(cursor.StartsOver, false);
    const std::int64_t chunk = cursor.Filling = cursor.Next++;
    const std::int32_t slot = cursor.FreeSlots.back();
    cursor.FreeSlots.pop_back();
    lock.unlock();
    try {
      if (startsOver) cursor.Source.reset();
      Fill(cursor, chunk, Slots + slot * ChunkBytes);
    } catch (...) {
      Fail(std::current_exception());
      return;
    }
    lock.lock();
    cursor.Filling = -1;
    if (cursor.StartsOver || Chunks[std::size_t(chunk)].Slot >= 0) {
      cursor.FreeSlots.push_back(slot);
      continue;
    }
    Chunks[std::size_t(chunk)].Slot = slot;
    cursor.Filled.push_back(chunk);
    Changed.notify_all();
  }
}

void ArrivingPicture::Fill(Cursor& cursor, std::int64_t chunk, std::uint8_t* into) {
  const std::int64_t begin = chunk * ChunkBytes, end = std::min(begin + ChunkBytes, TotalBytes);
  if (!cursor.Source) {
    cursor.Source = From.From(begin / RowSize);
    cursor.Row.resize(std::size_t(RowBytes));
    cursor.RowInHand = -1;
  }
  for (std::int64_t row = begin / RowSize; row * RowSize < end && !GaveUp;) {
    const std::int64_t at = row * RowSize;
    const std::int64_t whole =
        at < begin || row == cursor.RowInHand ? 0 : (end - at + RowSize - RowBytes) / RowSize;
    if (whole > 0) {
      ReadRows(*cursor.Source, into + (at - begin), RowSize, std::int32_t(whole));
      Read += whole;
      row += whole;
      continue;
    }
    if (row != cursor.RowInHand) {
      ReadRows(*cursor.Source, cursor.Row.data(), RowSize, 1);
      ++Read;
      cursor.RowInHand = row;
    }
    const std::int64_t first = std::max(at, begin), last = std::min(at + RowBytes, end);
    if (first < last)
      std::memcpy(into + (first - begin), &cursor.Row[std::size_t(first - at)], std::size_t(last - first));
    ++row;
  }
}

void ArrivingPicture::ShowZeros() {
  if (Range && mmap(Range, Chunks.size() * std::size_t(ChunkBytes), PROT_READ,
                    MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE | MAP_FIXED, -1, 0) != Range)
    EndProcess("picturezor: not enough memory for a picture that arrives\n");
}

void ArrivingPicture::Fail(const std::exception_ptr& reason) {
  {
    const std::lock_guard lock(Access);
    if (!Failed) Failed = reason;
  }
  GiveUp();
}

void ArrivingPicture::GiveUp() {
  {
    const std::lock_guard lock(Access);
    if (!GaveUp.exchange(true)) ShowZeros();
  }
  Changed.notify_all();
}

void ArrivingPicture::RequireAll() const {
  const std::lock_guard lock(Access);
  if (Failed) std::rethrow_exception(Failed);
}

}
