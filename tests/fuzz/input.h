#pragma once
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>

namespace picturezor {

/// The bytes of a fuzzer's input, taken as numbers; zeros once they are used up.
class Input {
 public:
  explicit Input(std::span<const std::uint8_t> bytes) : Bytes(bytes) {}
  bool AtEnd() const { return At >= Bytes.size(); }
  std::uint8_t Byte() { return AtEnd() ? 0 : Bytes[At++]; }
  /// From first to last, both included; at most 256 of them.
  int Between(int first, int last) { return first + Byte() % (last - first + 1); }
  std::int32_t Word() {
    std::uint32_t word = 0;
    for (int i = 0; i < 4; ++i) word = word << 8 | Byte();
    return std::int32_t(word);
  }
  /// Mostly small, now and then an extreme, sometimes anything.
  std::int32_t Integer() {
    constexpr std::int32_t extremes[] = {std::numeric_limits<std::int32_t>::max(),
                                         std::numeric_limits<std::int32_t>::min(),
                                         -1,
                                         255,
                                         256,
                                         65536};
    switch (Byte() % 4) {
      case 0: return extremes[Byte() % std::size(extremes)];
      case 1: return Word();
      default: return Between(-4, 60);
    }
  }
  double Real() {
    const std::uint8_t kind = Byte();
    if (kind % 4 != 0) return Integer() / (kind % 4 == 1 ? 1.0 : 16.0);
    std::uint64_t bits = std::uint64_t(std::uint32_t(Word())) << 32;
    bits |= std::uint32_t(Word());
    double value;
    std::memcpy(&value, &bits, sizeof value);
    return value;
  }

 private:
  std::span<const std::uint8_t> Bytes;
  std::size_t At = 0;
};

}
