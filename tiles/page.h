#pragma once
#include <filesystem>
#include <optional>
#include <string>

#include "grid.h"
#include "target.h"

namespace picturezor::tiles {

/// The folder with openseadragon.min.js, its images and its licence: the environment variable
/// PICTUREZOR_OPENSEADRAGON names it, else it stands beside the program's folder or is installed. Throws
/// files::Failure where it isn't there.
std::filesystem::path OpenSeadragonFolder();

/// What pyramid.js wants to know of a pyramid, as JSON.
std::string PyramidForPage(const Grid& grid, const std::string& base, const std::string& ending,
                           const std::optional<files::Resolution>& density);

/// Writes a page that shows a pyramid, with OpenSeadragon beside it: NAME.html for DeepZoom, else
/// NAME/index.html.
void WritePage(TileTarget& target, const Grid& grid, const std::string& name, const std::string& ending,
               const std::optional<files::Resolution>& density);

/// Writes a file of a pyramid.
/// Where OpenSeadragon is. Throws files::Failure where it isn't.
std::filesystem::path OpenSeadragonFolder();
void WriteText(TileTarget& target, const std::string& name, std::string_view text);

}
