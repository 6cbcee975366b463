#pragma once
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <exception>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <thread>

#include "inflater.h"
#include "picturezor/object.h"
#include "stream.h"

namespace picturezor::files {

/// The bytes of a PNG file as libpng gets them: chunk by chunk as they stand, but the pixels unpacked
/// already, in stored blocks of a zlib stream. So a faster library unpacks them, on a thread of its own,
/// while libpng does all the rest. The sums of the file's chunks and of its stream are looked at here; libpng
/// gets none of its own chunks' and is told not to ask.
class PNGSource {
 public:
  /// `ahead`: the pixels are unpacked on another thread, if one can be made.
  PNGSource(Stream file, bool ahead);
  PNGSource(const PNGSource&) = delete;
  ~PNGSource();

  /// What keeps the file from being read: in itself, or in the system.
  struct Fault {
    std::string Text;
    bool Damaged;
  };
  /// The next bytes; false where a fault was found.
  bool Read(std::uint8_t* into, std::size_t size);
  const Fault& Found() const { return Why; }

 private:
  Bytes NextPiece();
  Bytes NextOfChunk();
  Bytes TakeStored();

  void ReadOn(std::uint8_t* into, std::size_t size);
  // On the thread that unpacks, while there is one.
  void UnpackAhead();
  Bytes Stored();
  void FillPacked();
  void SkipPacked();

  bool IsPixels() const;
  void ReadHeader();
  void ReadFile(std::span<std::uint8_t> into);
  void ReadOfChunk(std::span<std::uint8_t> into);
  Bytes ReadSum();

  const Stream File;
  bool Ahead;

  enum class Stage { Signature, Header, Chunk, Pixels } Next = Stage::Signature;
  /// What libpng is getting, and how much of it is gone.
  Bytes Piece;
  std::size_t Gone = 0;
  Fault Why;

  /// Length and name of the chunk that the file stands in, what of its data is left, and their sum so far.
  Bytes Head;
  std::uint32_t Left = 0, Sum = 0;

  std::optional<Inflater> Unpacking;
  Bytes Room;
  std::span<const std::uint8_t> Packed;
  bool Last = false;

  std::thread Thread;
  std::mutex Guard;
  std::condition_variable Changed;
  /// Behind the last one stands an empty one, or the failure.
  std::deque<Bytes> Ready;
  std::exception_ptr Failed;
  bool Stopping = false;
};

}
