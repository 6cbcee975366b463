#pragma once
#include <filesystem>
#include <map>
#include <optional>
#include <string>

#include "grid.h"
#include "target.h"

namespace picturezor::tiles {

/// The folder with openseadragon.min.js, its images and its licence: the environment variable
/// PICTUREZOR_OPENSEADRAGON names it, else it stands beside the program's folder or is installed. Throws
/// files::Failure where it isn't there.
std::filesystem::path OpenSeadragonFolder();
/// The contents of its files, by their names from there on.
std::map<std::string, std::string> OpenSeadragonFiles();

/// The pixels of a metre as pages read it; 0 where nobody knows.
std::string PerMetre(const std::optional<files::Resolution>& density);

/// Writes a page that shows a pyramid, with OpenSeadragon beside it: NAME.html for DeepZoom, else
/// NAME/index.html.
void WritePage(TileTarget& target, const Grid& grid, const std::string& name, const std::string& ending,
               const std::optional<files::Resolution>& density);

/// Writes a file of a pyramid.
void WriteText(TileTarget& target, const std::string& name, std::string_view text);

}
