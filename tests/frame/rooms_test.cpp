#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <regex>
#include <string>

namespace zor {
namespace {

using std::filesystem::path;

/// How high a folder of src/ stands; rooms of one height don't know each other.
const std::map<std::string, int> Heights = {{"frame", 0},   {"image", 1},    {"exchange", 2},   {"scale", 2},
                                            {"filters", 2}, {"geometry", 2}, {"composition", 2}};
/// The roof stands in frame/, but above the rooms.
const std::map<std::string, int> Roof = {{"picture_class.cpp", 3}, {"factory_class.cpp", 3}, {"load.cpp", 3}};

/// Calls body(file, included) for each `#include "..."` below a folder of the project.
template <class Body>
void ForEachInclude(const char* folder, Body&& body) {
  const std::regex include("^\\s*#include \"([^\"]+)\"");
  for (const auto& entry :
       std::filesystem::recursive_directory_iterator(path(PICTUREZOR_SOURCE_DIR) / folder)) {
    if (entry.path().extension() != ".h" && entry.path().extension() != ".cpp") continue;
    std::ifstream file(entry.path());
    for (std::string line; std::getline(file, line);)
      if (std::smatch match; std::regex_search(line, match, include))
        body(entry.path(), path(match[1].str()));
  }
}

// Catches an arrow that points up, and a room that includes another room.
TEST(Rooms, IncludeOnlyWhatLiesBelow) {
  int arrows = 0;
  ForEachInclude("src", [&](const path& file, const path& included) {
    const std::string from = file.parent_path().filename(), to = included.begin()->string();
    ASSERT_TRUE(Heights.contains(from)) << file << " stands in no room";
    ASSERT_TRUE(Heights.contains(to)) << file << " includes " << included;
    const auto roof = Roof.find(file.filename());
    const int height = from == "frame" && roof != Roof.end() ? roof->second : Heights.at(from);
    EXPECT_TRUE(from == to || Heights.at(to) < height) << file << " includes " << included;
    ++arrows;
  });
  EXPECT_GT(arrows, 50);
}

// The host is somebody else's program: it knows the records, and nothing else of the module.
TEST(Rooms, HostKnowsOnlyTheRecords) {
  ForEachInclude("host", [&](const path& file, const path& included) {
    if (std::filesystem::exists(path(PICTUREZOR_SOURCE_DIR) / "src" / included)) {
      EXPECT_EQ(included, path("frame/records.h")) << file;
    }
  });
}

}
}
