#pragma once
#include <cstring>
#include <utility>

#include "image/picture_data.h"
#include "image/targets.h"

namespace zor {

// Pixels that change places go through vectors of 16 bytes, written with the compiler's own shuffles, which
// every machine has. Some take many instructions where a processor can't shuffle bytes freely.

using Block = Sample __attribute__((vector_size(16)));
constexpr std::ptrdiff_t BlockBytes = 16;

inline Block LoadBlock(const Sample* from) {
  Block block;
  std::memcpy(&block, from, BlockBytes);
  return block;
}
inline void StoreBlock(Sample* into, Block block) { std::memcpy(into, &block, BlockBytes); }

/// Byte j of the result is byte Pick(j) of a and b in a row, 0 to 31.
template <auto Pick>
Block Shuffled(Block a, Block b) {
  return [&]<std::size_t... J>(std::index_sequence<J...>) {
    return __builtin_shufflevector(a, b, Pick(int(J))...);
  }
  (std::make_index_sequence<BlockBytes>{});
}

/// Whether bytes are shuffled in one instruction.
inline bool ShufflesBytes() { return CurrentTarget != Target::Plain; }

}
