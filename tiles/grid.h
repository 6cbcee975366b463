#pragma once
#include <cstdint>
#include <string>
#include <vector>

#include "image_file.h"

namespace picturezor::tiles {

/// How a pyramid is cut, and what its files are called.
enum class Layout {
  /// NAME.dzi, and NAME_files/LEVEL/COLUMN_ROW: level 0 is one pixel.
  DeepZoom,
  /// Image API 3, level 0: NAME/info.json, and NAME/REGION/SIZE/0/default.
  IIIF,
  /// NAME/ZOOM/COLUMN/ROW: zoom 0 is one tile, and all tiles are whole squares.
  XYZ
};

/// Where the tiles of a pyramid lie. Level 0 is the picture itself here, and each one has half the columns
/// and rows of the one before, rounded up: down to a pixel for DeepZoom, else to a tile.
class Grid {
 public:
  /// `overlap` is what a tile has of its neighbours on each side, in pixels; 0 but for DeepZoom.
  Grid(files::Extent picture, Layout layout, std::int32_t tile, std::int32_t overlap);

  Layout Of() const { return How; }
  std::int32_t Tile() const { return Edge; }
  std::int32_t Overlap() const { return Shared; }
  int LevelCount() const { return int(Sizes.size()); }
  files::Extent Level(int level) const { return Sizes[std::size_t(level)]; }
  /// Tiles side by side, and one below the other.
  std::int32_t Across(int level) const { return Count(Level(level).Width); }
  std::int32_t Down(int level) const { return Count(Level(level).Height); }
  /// The pixels of its level that a tile shows.
  Rect TileAt(int level, std::int32_t column, std::int32_t row) const;
  /// Whether a tile that the edge of the picture cuts is filled up to a square.
  bool Fills() const { return How == Layout::XYZ; }
  /// The tile's file, of a pyramid called `name`; `ending` begins with a point.
  std::string TileName(const std::string& name, const std::string& ending, int level, std::int32_t column,
                       std::int32_t row) const;
  /// The file that describes the pyramid, and what it says. `id` is the address under which a IIIF pyramid
  /// will be found.
  std::string DescriptionName(const std::string& name) const;
  std::string Description(const std::string& ending, const std::string& id) const;

 private:
  std::int32_t Count(std::int32_t pixels) const { return (pixels - 1) / Edge + 1; }

  Layout How;
  std::int32_t Edge, Shared;
  std::vector<files::Extent> Sizes;
};

/// A text between the quotes of JSON.
std::string QuotedForJSON(const std::string& text);

}
