#include "png_source.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>
#include <system_error>

#include "failure.h"
#include "worker_threads.h"

namespace picturezor::files {

namespace {

constexpr std::size_t PieceBytes = 64 << 10, MostStored = 65535, MostReady = 16;
/// A chunk's length and name, or a block's last bit and its length twice.
constexpr std::size_t HeadBytes = 8, BlockHeadBytes = 5, SumBytes = 4;
/// A chunk with the head of a zlib stream.
const Bytes StreamHead{0, 0, 0, 2, 'I', 'D', 'A', 'T', 0x78, 0x01, 0, 0, 0, 0};

std::uint32_t Number(const std::uint8_t* at) {
  return std::uint32_t(at[0]) << 24 | std::uint32_t(at[1]) << 16 | std::uint32_t(at[2]) << 8 | at[3];
}
void Put(std::uint8_t* at, std::uint32_t number) {
  for (int i = 0; i < 4; ++i) at[i] = std::uint8_t(number >> (24 - 8 * i));
}

}

PNGSource::PNGSource(Stream file, bool ahead) : File(std::move(file)), Ahead(ahead) {}

PNGSource::~PNGSource() {
  {
    const std::lock_guard lock(Guard);
    Stopping = true;
  }
  Changed.notify_all();
  if (Thread.joinable()) Thread.join();
}

bool PNGSource::Read(std::uint8_t* into, std::size_t size) {
  try {
    ReadOn(into, size);
    return true;
  } catch (const Fault& fault) {
    Why = fault;
  } catch (const std::bad_alloc&) {
    Why = {"not enough memory", false};
  }
  return false;
}

void PNGSource::ReadOn(std::uint8_t* into, std::size_t size) {
  while (size > 0) {
    while (Gone == Piece.size()) {
      Piece = NextPiece();
      Gone = 0;
    }
    const std::size_t count = std::min(size, Piece.size() - Gone);
    std::memcpy(into, Piece.data() + Gone, count);
    into += count;
    size -= count;
    Gone += count;
  }
}

Bytes PNGSource::NextPiece() {
  switch (Next) {
    case Stage::Signature: {
      Bytes signature(HeadBytes);
      ReadFile(signature);
      Next = Stage::Header;
      return signature;
    }
    case Stage::Header:
      ReadHeader();
      if (!IsPixels() || Unpacking) {
        Next = Stage::Chunk;
        return Head;
      }
      Unpacking.emplace();
      Room.resize(PieceBytes);
      Next = Stage::Pixels;
      // Nothing is unpacked yet: perhaps nobody wants more than to see what the file is.
      return StreamHead;
    case Stage::Chunk: return NextOfChunk();
    case Stage::Pixels:
      if (Bytes stored = TakeStored(); !stored.empty()) return stored;
      if (Thread.joinable()) Thread.join();
      Next = Stage::Chunk;
      return Head;
  }
  return {};
}

Bytes PNGSource::NextOfChunk() {
  Bytes data(std::min<std::size_t>(Left, PieceBytes));
  ReadOfChunk(data);
  if (Left > 0) return data;
  const Bytes sum = ReadSum();
  data.insert(data.end(), sum.begin(), sum.end());
  Next = Stage::Header;
  return data;
}

Bytes PNGSource::TakeStored() {
  if (!Ahead) return Stored();
  if (!Thread.joinable()) try {
      Thread = StartThread([this] { UnpackAhead(); });
    } catch (const std::system_error&) {
      Ahead = false;
      return Stored();
    }
  std::unique_lock lock(Guard);
  Changed.wait(lock, [this] { return !Ready.empty() || Failed; });
  if (Ready.empty()) std::rethrow_exception(Failed);
  Bytes stored = std::move(Ready.front());
  Ready.pop_front();
  lock.unlock();
  Changed.notify_all();
  return stored;
}

void PNGSource::UnpackAhead() {
  try {
    for (bool more = true; more; Changed.notify_all()) {
      Bytes stored = Stored();
      more = !stored.empty();
      std::unique_lock lock(Guard);
      Changed.wait(lock, [this] { return Stopping || Ready.size() < MostReady; });
      if (Stopping) return;
      Ready.push_back(std::move(stored));
    }
  } catch (...) {
    {
      const std::lock_guard lock(Guard);
      Failed = std::current_exception();
    }
    Changed.notify_all();
  }
}

/// The next chunk that libpng gets of the pixels; empty behind the last one, with the header of the chunk
/// behind them at hand.
Bytes PNGSource::Stored() {
  if (Last) return {};
  constexpr std::size_t before = HeadBytes + BlockHeadBytes;
  Bytes chunk(before + MostStored + 2 * SumBytes);
  std::span<std::uint8_t> room(chunk.data() + before, MostStored);
  try {
    while (!room.empty() && !Unpacking->Ended()) {
      if (Packed.empty()) FillPacked();
      const std::size_t packed = Packed.size(), free = room.size();
      Unpacking->Unpack(Packed, room);
      Last = Packed.size() == packed && room.size() == free;
      if (Last) break;
    }
  } catch (const Failure& failure) {
    throw Fault{failure.what(), true};
  }
  const std::size_t count = MostStored - room.size();
  const bool ended = Unpacking->Ended();
  if (ended) {
    SkipPacked();
    Last = true;
  } else if (count == 0) {
    return {};
  }
  std::uint8_t* head = chunk.data() + HeadBytes;
  head[0] = ended;
  head[1] = std::uint8_t(count);
  head[2] = std::uint8_t(count >> 8);
  head[3] = std::uint8_t(~head[1]);
  head[4] = std::uint8_t(~head[2]);
  const std::size_t data = BlockHeadBytes + count + (ended ? SumBytes : 0);
  Put(chunk.data(), std::uint32_t(data));
  std::memcpy(chunk.data() + 4, "IDAT", 4);
  chunk.resize(HeadBytes + data + SumBytes);
  return chunk;
}

/// Leaves it empty where no pixels are left.
void PNGSource::FillPacked() {
  while (Left == 0 && IsPixels()) {
    ReadSum();
    ReadHeader();
  }
  if (!IsPixels()) return;
  const std::span<std::uint8_t> room(Room.data(), std::min<std::size_t>(Left, Room.size()));
  ReadOfChunk(room);
  Packed = room;
}

void PNGSource::SkipPacked() {
  while (IsPixels()) FillPacked();
}

bool PNGSource::IsPixels() const { return std::memcmp(Head.data() + 4, "IDAT", 4) == 0; }

void PNGSource::ReadHeader() {
  Head.resize(HeadBytes);
  ReadFile(Head);
  Left = Number(Head.data());
  Sum = Inflater::Checksum(0, std::span(Head).last(4));
}

void PNGSource::ReadFile(std::span<std::uint8_t> into) {
  if (std::fread(into.data(), 1, into.size(), File.get()) == into.size()) return;
  throw Fault{std::ferror(File.get()) ? std::strerror(errno) : "the PNG file is cut off", false};
}

void PNGSource::ReadOfChunk(std::span<std::uint8_t> into) {
  ReadFile(into);
  Left -= std::uint32_t(into.size());
  Sum = Inflater::Checksum(Sum, into);
}

Bytes PNGSource::ReadSum() {
  Bytes sum(SumBytes);
  ReadFile(sum);
  if (Number(sum.data()) != Sum) throw Fault{std::string(Head.begin() + 4, Head.end()) + ": CRC error", true};
  return sum;
}

}
