#pragma once
#include <cstdint>
#include <vector>

#include "grid.h"

namespace picturezor::tiles {

/// What one of several runs makes of a pyramid: some rows of tiles of each of the larger levels. The smaller
/// ones are made when all have ended, out of the sums that each keeps of rows of its own.
struct Share {
  /// Rows of tiles of each level, First and on, up to End.
  struct TileRows {
    std::int32_t First = 0, End = 0;
  };
  std::vector<TileRows> Levels;
  /// As many levels are made by shares, from the picture itself on.
  int Shared = 0;
  /// Rows of the source that it reads: its tiles need some of its neighbours' rows.
  std::int32_t First = 0, End = 0;
  /// Those of them that are its own.
  std::int32_t FirstOwn = 0, EndOwn = 0;
};

/// What `part`, 0 to `parts` - 1, makes. A single one makes all. `parts` are no more than the picture has
/// rows of tiles.
Share ShareOf(const Grid& grid, std::int32_t part, std::int32_t parts);
/// What is left to be made then.
Share RestOf(const Grid& grid, std::int32_t parts);

}
