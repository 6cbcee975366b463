#include "grid.h"

#include <algorithm>
#include <cstdio>

namespace picturezor::tiles {

namespace {

std::string Text(std::int64_t number) { return std::to_string(number); }

std::string DeepZoomDescription(const Grid& grid, const std::string& ending) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
         "<Image xmlns=\"http://schemas.microsoft.com/deepzoom/2008\" Format=\"" +
         ending.substr(1) + "\" Overlap=\"" + Text(grid.Overlap()) + "\" TileSize=\"" + Text(grid.Tile()) +
         "\">\n  <Size Width=\"" + Text(grid.Level(0).Width) + "\" Height=\"" + Text(grid.Level(0).Height) +
         "\"/>\n</Image>\n";
}

std::string IIIFDescription(const Grid& grid, const std::string& ending, const std::string& id) {
  const files::Extent last = grid.Level(grid.LevelCount() - 1);
  std::string factors;
  for (int level = 0; level < grid.LevelCount(); ++level)
    factors += (level ? ", " : "") + Text(std::int64_t{1} << level);
  const std::string format = ending.substr(1);
  std::string formats;
  if (format != "jpg")
    formats = "  \"extraFormats\": [\"" + format + "\"],\n  \"preferredFormats\": [\"" + format + "\"],\n";
  return "{\n  \"@context\": \"http://iiif.io/api/image/3/context.json\",\n  \"id\": \"" + QuotedForJSON(id) +
         "\",\n  \"type\": \"ImageService3\",\n  \"protocol\": \"http://iiif.io/api/image\",\n"
         "  \"profile\": \"level0\",\n  \"width\": " +
         Text(grid.Level(0).Width) + ",\n  \"height\": " + Text(grid.Level(0).Height) + ",\n" + formats +
         "  \"sizes\": [{\"width\": " + Text(last.Width) + ", \"height\": " + Text(last.Height) +
         "}],\n  \"tiles\": [{\"width\": " + Text(grid.Tile()) + ", \"height\": " + Text(grid.Tile()) +
         ", \"scaleFactors\": [" + factors + "]}]\n}\n";
}

/// What scripts for maps ask for; there is no standard.
std::string XYZDescription(const Grid& grid, const std::string& ending) {
  return "{\n  \"width\": " + Text(grid.Level(0).Width) + ",\n  \"height\": " + Text(grid.Level(0).Height) +
         ",\n  \"tileSize\": " + Text(grid.Tile()) +
         ",\n  \"minZoom\": 0,\n  \"maxZoom\": " + Text(grid.LevelCount() - 1) +
         ",\n  \"tiles\": \"{z}/{x}/{y}" + ending + "\"\n}\n";
}

}

Grid::Grid(files::Extent picture, Layout layout, std::int32_t tile, std::int32_t overlap)
    : How(layout), Edge(tile), Shared(layout == Layout::DeepZoom ? overlap : 0) {
  const std::int32_t smallest = layout == Layout::DeepZoom ? 1 : tile;
  Sizes.push_back(picture);
  while (std::max(Sizes.back().Width, Sizes.back().Height) > smallest) {
    const files::Extent size = Sizes.back();
    Sizes.push_back({size.Width / 2 + size.Width % 2, size.Height / 2 + size.Height % 2});
  }
}

Rect Grid::TileAt(int level, std::int32_t column, std::int32_t row) const {
  const files::Extent size = Level(level);
  const std::int64_t left = std::int64_t{column} * Edge, top = std::int64_t{row} * Edge;
  const std::int64_t x = std::max<std::int64_t>(0, left - Shared),
                     y = std::max<std::int64_t>(0, top - Shared);
  const std::int64_t right = std::min<std::int64_t>(size.Width, left + Edge + Shared);
  const std::int64_t bottom = std::min<std::int64_t>(size.Height, top + Edge + Shared);
  return {std::int32_t(x), std::int32_t(y), std::int32_t(right - x), std::int32_t(bottom - y)};
}

std::string Grid::TileName(const std::string& name, const std::string& ending, int level, std::int32_t column,
                           std::int32_t row) const {
  const int number = LevelCount() - 1 - level;
  switch (How) {
    case Layout::DeepZoom:
      return name + "_files/" + Text(number) + "/" + Text(column) + "_" + Text(row) + ending;
    case Layout::XYZ: return name + "/" + Text(number) + "/" + Text(column) + "/" + Text(row) + ending;
    case Layout::IIIF: break;
  }
  const Rect tile = TileAt(level, column, row);
  std::string region = "full";
  if (Across(level) > 1 || Down(level) > 1) {
    const files::Extent whole = Level(0);
    const std::int64_t x = std::int64_t{tile.X} << level, y = std::int64_t{tile.Y} << level;
    const std::int64_t span = std::int64_t{Edge} << level;
    region = Text(x) + "," + Text(y) + "," + Text(std::min(span, whole.Width - x)) + "," +
             Text(std::min(span, whole.Height - y));
  }
  // All of a picture that isn't made smaller is its largest size.
  const std::string size =
      level == 0 && region == "full" ? "max" : Text(tile.Width) + "," + Text(tile.Height);
  return name + "/" + region + "/" + size + "/0/default" + ending;
}

std::string Grid::DescriptionName(const std::string& name) const {
  switch (How) {
    case Layout::DeepZoom: return name + ".dzi";
    case Layout::IIIF: return name + "/info.json";
    case Layout::XYZ: break;
  }
  return name + "/tiles.json";
}

std::string Grid::Description(const std::string& ending, const std::string& id) const {
  switch (How) {
    case Layout::DeepZoom: return DeepZoomDescription(*this, ending);
    case Layout::IIIF: return IIIFDescription(*this, ending, id);
    case Layout::XYZ: break;
  }
  return XYZDescription(*this, ending);
}

std::string QuotedForJSON(const std::string& text) {
  std::string quoted;
  for (const char c : text)
    if (c == '"' || c == '\\') {
      quoted += '\\';
      quoted += c;
    } else if (static_cast<unsigned char>(c) < 0x20) {
      char code[8];
      std::snprintf(code, sizeof code, "\\u%04x", unsigned(c));
      quoted += code;
    } else {
      quoted += c;
    }
  return quoted;
}

}
