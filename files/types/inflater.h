#pragma once
#include <cstdint>
#include <memory>
#include <span>

namespace picturezor::files {

/// Unpacks a zlib stream (RFC 1950) piece by piece: by ISA-L where the library is built with it, which takes
/// less than half the time, by zlib elsewhere.
class Inflater {
 public:
  Inflater();
  ~Inflater();

  /// Takes bytes off the front of `in` and puts what they become at the front of `out`, until one of them is
  /// used up or the stream ends. Throws Failure for what no stream has.
  void Unpack(std::span<const std::uint8_t>& in, std::span<std::uint8_t>& out);
  /// Whether the stream has come to its end, and its checksum was right.
  bool Ended() const;

  /// The CRC-32 of PNG, gzip and zlib, of bytes behind others whose sum is known; 0 to begin with.
  static std::uint32_t Checksum(std::uint32_t before, std::span<const std::uint8_t> bytes);

 private:
  struct State;
  std::unique_ptr<State> Of;
};

}
