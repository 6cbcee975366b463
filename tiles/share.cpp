#include "share.h"

#include <algorithm>

#include "box_levels.h"

namespace picturezor::tiles {

namespace {

/// How many levels `parts` runs share: those with a row of tiles for each of them.
int SharedLevels(const Grid& grid, std::int32_t parts) {
  int count = 0;
  while (count < grid.LevelCount() && grid.Down(count) >= parts) ++count;
  return count;
}

}

Share ShareOf(const Grid& grid, std::int32_t part, std::int32_t parts) {
  Share share;
  share.Shared = SharedLevels(grid, parts);
  share.Levels.resize(std::size_t(grid.LevelCount()));
  const int smallest = share.Shared - 1;
  const std::int32_t height = grid.Level(0).Height;
  const auto border = [&](std::int32_t number) { return std::int64_t{grid.Down(smallest)} * number / parts; };
  const auto own = [&](std::int32_t number) {
    return number == parts
               ? height
               : std::int32_t(std::min<std::int64_t>((border(number) * grid.Tile()) << smallest, height));
  };
  share.First = share.FirstOwn = own(part);
  share.End = share.EndOwn = own(part + 1);
  for (int level = 0; level <= smallest; ++level) {
    Share::TileRows& rows = share.Levels[std::size_t(level)];
    const auto first = [&](std::int32_t number) {
      return std::int32_t(std::min<std::int64_t>(border(number) << (smallest - level), grid.Down(level)));
    };
    rows = {first(part), first(part + 1)};
    const std::vector<BoxLine> lines = BoxLines(grid.Level(level).Height, height);
    const Rect last = grid.TileAt(level, 0, rows.End - 1);
    share.First = std::min(share.First, lines[std::size_t(grid.TileAt(level, 0, rows.First).Y)].First);
    share.End = std::max(share.End, lines[std::size_t(last.Y + last.Height - 1)].Last() + 1);
  }
  return share;
}

Share RestOf(const Grid& grid, std::int32_t parts) {
  Share share;
  share.Levels.resize(std::size_t(grid.LevelCount()));
  share.Shared = SharedLevels(grid, parts);
  for (int level = share.Shared; level < grid.LevelCount(); ++level)
    share.Levels[std::size_t(level)].End = grid.Down(level);
  return share;
}

}
