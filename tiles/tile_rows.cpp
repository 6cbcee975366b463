#include "tile_rows.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace picturezor::tiles {

TileRows::TileRows(const Grid& grid, int level, int channels, std::int32_t first, std::int32_t end)
    : Of(grid),
      Level(level),
      RowBytes(std::size_t(grid.Level(level).Width) * std::size_t(channels)),
      TileRow(first),
      EndTileRow(end) {
  if (Done()) return;
  NextRow = Begin();
  Start();
}

std::int32_t TileRows::Begin() const { return Of.TileAt(Level, 0, TileRow).Y; }
std::int32_t TileRows::End() const { return Begin() + Of.TileAt(Level, 0, TileRow).Height; }

void TileRows::Start() {
  const std::shared_ptr<Band> before = std::exchange(Current, std::exchange(Spare, nullptr));
  if (!Current || Current.use_count() > 1) Current = std::make_shared<Band>();
  Current->FirstRow = Begin();
  Current->RowBytes = RowBytes;
  Current->Samples.resize(RowBytes * std::size_t(End() - Begin()));
  if (before && NextRow > Begin())
    std::memcpy(Current->Row(Begin()), before->Row(Begin()), RowBytes * std::size_t(NextRow - Begin()));
  Spare = before;
}

std::optional<TileRows::Complete> TileRows::Take() {
  if (Done() || Room() > 0) return std::nullopt;
  Complete complete{Current, TileRow++};
  if (!Done()) Start();
  return complete;
}

}
