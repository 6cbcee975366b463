#pragma once
#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>

#include "conveyor.h"
#include "picturezor/picture.h"

namespace picturezor::files {

/// Makes the zlib stream of a PNG out of its rows, block by block on several threads: each block is deflated
/// with the end of the one before as its past, and ends at a byte.
///
/// Photographs get a filter for each row, and runs and Huffman codes after it, which is as small as a search
/// for repetitions and several times faster. Drawings get no filter and the search. Every few blocks a sample
/// of the rows is packed both ways to see which they are.
class PNGBlocks {
 public:
  using Sink = std::function<void(std::span<const std::uint8_t>)>;
  /// `step` is the bytes of a pixel. `level` is 0 (stored) to 9 (slow); 1 takes all for photographs. `sink`
  /// gets the stream in pieces, on the caller's thread.
  PNGBlocks(std::size_t rowBytes, int step, std::int64_t rows, std::optional<int> level, int threads,
            Sink sink);
  /// The next row; with the last one all of the stream has been given.
  void Add(const std::uint8_t* row);

 private:
  enum Way : int { Unknown, Photograph, Drawing };
  using SharedWay = std::shared_ptr<std::atomic<int>>;
  struct Block {
    /// Rows of the block, behind some of those above it.
    Bytes Rows;
    std::size_t Above = 0, Count = 0;
    /// Whether it finds out the way of its group, and that of the block before.
    bool Tries = false;
    SharedWay Mine, Before;
    /// Whether the first of the rows above is the picture's first.
    bool FromTop = false;
    bool First = false, Last = false;
    Bytes Packed;
    std::uint32_t Sum = 0;
  };

  void Start();
  void Pack(Block& block) const;
  Way Choose(const Block& block) const;
  Bytes Filtered(const Block& block, std::size_t first, std::size_t count, int way) const;
  Bytes Deflated(const Bytes& data, const Bytes& past, int way, bool last) const;
  void GiveOldest();

  std::size_t RowBytes, PastRows, RowsPerBlock;
  int Step, Level;
  std::int64_t Height, Begun = 0, Number = 0;
  Sink Into;
  std::size_t MostWaiting;
  std::unique_ptr<Block> Open;
  std::uint32_t Sum = 1;
  Conveyor<Block> Blocks;
};

}
