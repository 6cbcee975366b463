#include "page.h"

#include <cctype>
#include <cstdio>
#include <cstdlib>

#include "failure.h"
#include "input.h"
#include "pages.h"
#include "temporary_files.h"

namespace picturezor::tiles {

namespace {

using std::filesystem::path;

std::string InHTML(const std::string& text) {
  std::string escaped;
  for (const char c : text) switch (c) {
      case '&': escaped += "&amp;"; break;
      case '<': escaped += "&lt;"; break;
      case '>': escaped += "&gt;"; break;
      case '"': escaped += "&quot;"; break;
      default: escaped += c;
    }
  return escaped;
}

/// A name as a part of an address.
std::string InAddress(const std::string& text) {
  std::string escaped;
  for (const char c : text) {
    char code[4];
    std::snprintf(code, sizeof code, "%%%02X", unsigned(static_cast<unsigned char>(c)));
    const bool plain = std::isalnum(static_cast<unsigned char>(c)) ||
                       std::string_view("-._~").find(c) != std::string_view::npos;
    escaped += plain ? std::string(1, c) : code;
  }
  return escaped;
}

void ReplaceAll(std::string& text, const std::string& what, const std::string& with) {
  for (std::size_t at = 0; (at = text.find(what, at)) != text.npos; at += with.size())
    text.replace(at, what.size(), with);
}

/// What pyramid.js wants to know of a pyramid, as JSON.
std::string PyramidForPage(const Grid& grid, const std::string& base, const std::string& ending,
                           const std::optional<files::Resolution>& density) {
  constexpr const char* names[] = {"deepzoom", "iiif", "xyz"};
  return std::string("{\"layout\": \"") + names[int(grid.Of())] +
         "\", \"width\": " + std::to_string(grid.Level(0).Width) +
         ", \"height\": " + std::to_string(grid.Level(0).Height) +
         ", \"tile\": " + std::to_string(grid.Tile()) + ", \"overlap\": " + std::to_string(grid.Overlap()) +
         ", \"levels\": " + std::to_string(grid.LevelCount()) + ", \"format\": \"" + ending.substr(1) +
         "\", \"base\": \"" + QuotedForJSON(base) + "\", \"perMetre\": " + PerMetre(density) + "}";
}

}

std::string PerMetre(const std::optional<files::Resolution>& density) {
  constexpr double inchesOfMetre = 1 / 0.0254;
  char text[32];
  std::snprintf(text, sizeof text, "%.9g", density ? density->X * inchesOfMetre : 0);
  return text;
}

path OpenSeadragonFolder() {
  std::error_code failed;
  std::vector<path> places;
  if (const char* named = std::getenv("PICTUREZOR_OPENSEADRAGON")) places.emplace_back(named);
  const path program = std::filesystem::read_symlink("/proc/self/exe", failed).parent_path();
  for (const char* place : {"../openseadragon", "../share/picturezor/openseadragon"})
    places.push_back(program / place);
  for (const path& place : places)
    if (std::filesystem::exists(place / "openseadragon.min.js", failed)) return place;
  throw files::Failure(
      "OpenSeadragon, which pages need, isn't there: scripts/viewer fetches it, and the environment "
      "variable\n"
      "PICTUREZOR_OPENSEADRAGON names its folder");
}

std::map<std::string, std::string> OpenSeadragonFiles() {
  constexpr std::int64_t most = 64 << 20;
  const path folder = OpenSeadragonFolder();
  std::map<std::string, std::string> contents;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(folder))
    if (entry.is_regular_file()) {
      const files::Input input(entry.path());
      const auto bytes = input.All(most);
      contents[std::filesystem::relative(entry.path(), folder).generic_string()].assign(bytes.begin(),
                                                                                        bytes.end());
    }
  return contents;
}

void WriteText(TileTarget& target, const std::string& name, std::string_view text) {
  const auto file = target.Begin(name);
  files::WriteAll(file->Descriptor(), text, file->Target());
  file->Commit();
  target.Add(*file);
}

void WritePage(TileTarget& target, const Grid& grid, const std::string& name, const std::string& ending,
               const std::optional<files::Resolution>& density) {
  const bool beside = grid.Of() == Layout::DeepZoom;
  const std::string folder = beside ? name + "_files/" : name + "/";
  const std::string here = beside ? InAddress(name) + "_files/" : "./";
  std::string page(PyramidHTML);
  ReplaceAll(page, "%TITLE%", InHTML(name));
  ReplaceAll(page, "%OPENSEADRAGON%", here + "openseadragon");
  ReplaceAll(page, "%PYRAMID%", PyramidForPage(grid, here, ending, density));
  ReplaceAll(page, "%STYLE%", std::string(PyramidCSS));
  ReplaceAll(page, "%SCRIPT%", std::string(PyramidJS));
  WriteText(target, beside ? name + ".html" : name + "/index.html", page);
  for (const auto& [file, content] : OpenSeadragonFiles())
    WriteText(target, folder + "openseadragon/" + file, content);
}

}
