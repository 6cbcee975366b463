#pragma once
#include <filesystem>
#include <optional>
#include <string>

#include "grid.h"
#include "image_file.h"
#include "pictures.h"
#include "progress.h"
#include "rows.h"
#include "run.h"

namespace picturezor::tiles {

struct TilesOptions {
  Layout How = Layout::DeepZoom;
  /// The edge of a tile in pixels; for DeepZoom without the overlap, which neighbours share on each side.
  std::int32_t Tile = 256, Overlap = 0;
  /// The type of the tiles, by its name.
  std::string Type = "jpg";
  files::WriteOptions Writing;
  /// The kernel that makes the smaller levels, by its name.
  std::string Kernel = "box";
  /// Makes each smaller level of the smallest copy of the picture in the file that is at least as large,
  /// where there is one.
  bool UseLevels = false;
  /// What shows through where the tiles' type has no alpha, and beside the picture in whole squares.
  Color Background{255, 255, 255};
  /// Tiles that show nothing but the background, or nothing at all, aren't written.
  bool SkipBlank = false;
  /// The start of the address under which the folder of a IIIF pyramid will be found.
  std::string Address;
  /// Adds a page that shows the pyramid.
  bool Page = false;
  /// Goes on with a folder that was interrupted.
  bool Resume = false;
  /// Divides the work among so many runs, which share a folder and may be at work at once. Each makes one
  /// Part, counted from 1; a last run, without a Part, makes the smaller levels and completes the pyramid. It
  /// has the same bytes as one that a single run makes. A part that is made already isn't made again.
  std::int32_t Parts = 0, Part = 0;
  flow::RunOptions Running;
};

/// Makes an image pyramid called `target`: a folder, or one ZIP where the name ends in .zip or .szi. `source`
/// names the file in what is told of it. The levels are those of Grid, each the `Scale` of the whole picture.
/// With the kernel box the file is read once, and memory is taken for some rows of tiles of each level; with
/// others, or with UseLevels, it is read once for each level, and there are no parts. Throws files::Failure.
void MakeTiles(flow::OpenFile file, const std::filesystem::path& source, const std::filesystem::path& target,
               const TilesOptions& options, files::Progress& progress);

}
