#pragma once
#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "grid.h"
#include "picturezor/object.h"

namespace picturezor::tiles {

/// Rows of a level from which a row of tiles is cut.
struct Band {
  std::int32_t FirstRow = 0;
  std::size_t RowBytes = 0;
  Bytes Samples;
  std::uint8_t* Row(std::int32_t y) { return Samples.data() + std::size_t(y - FirstRow) * RowBytes; }
};

/// Gathers the rows of a level until a row of tiles is complete, with what it shares with its neighbours.
class TileRows {
 public:
  /// Those of some rows of tiles: `first` and on, up to `end`.
  TileRows(const Grid& grid, int level, int channels, std::int32_t first, std::int32_t end);

  /// Where the next rows go, and how many of them fit.
  std::uint8_t* Place() { return Current->Row(NextRow); }
  std::int32_t Room() const { return Done() ? 0 : End() - NextRow; }
  bool Done() const { return TileRow == EndTileRow; }
  std::int32_t Next() const { return NextRow; }
  const std::shared_ptr<Band>& Filling() const { return Current; }
  /// So many rows are there.
  void Add(std::int32_t count) { NextRow += count; }
  /// The next row of tiles, if it is complete.
  struct Complete {
    std::shared_ptr<Band> Of;
    std::int32_t Row = 0;
  };
  std::optional<Complete> Take();
  /// Whether somebody still uses the band that the rows behind a complete one go to. There are two, and more
  /// where Take isn't put off meanwhile.
  bool Waits() const { return Spare && Spare.use_count() > 1; }

 private:
  std::int32_t Begin() const;
  std::int32_t End() const;
  void Start();

  const Grid& Of;
  const int Level;
  const std::size_t RowBytes;
  std::int32_t TileRow, NextRow = 0;
  const std::int32_t EndTileRow;
  std::shared_ptr<Band> Current, Spare;
};

}
