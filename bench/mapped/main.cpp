// What the system does for mapped pictures, beside `cp` of the same bytes: prints a table, with a column for
// each directory that is given.

#include <sys/resource.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

#include "picturezor/host.h"
#include "picturezor/picture.h"

namespace {

using namespace picturezor;

constexpr std::int32_t Width = 40000, Height = 26667;
constexpr int Rounds = 3;

struct Seconds {
  double Wall, System;
};

/// Of this process and of the programs that it ran.
Seconds Now() {
  Seconds now{std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count(), 0};
  for (const int whose : {RUSAGE_SELF, RUSAGE_CHILDREN}) {
    rusage used{};
    getrusage(whose, &used);
    now.System += double(used.ru_stime.tv_sec) + double(used.ru_stime.tv_usec) * 1e-6;
  }
  return now;
}

Picture Mapped(const std::string& file, std::int32_t width, std::int32_t height) {
  Picture picture = Picture::Mapped(file, width, height, Format::RGB);
  if (picture.Valid()) return picture;
  std::fprintf(stderr, "%s: no picture can be there\n", file.c_str());
  std::exit(2);
}

struct Work {
  std::string Name;
  std::function<void(const Picture& picture, const std::string& directory)> Do;
};

const std::vector<Work> Works{
    {"`FillRectRGB`", [](const Picture& picture, const std::string&) { picture.FillRectRGB(200, 100, 50); }},
    {"`VMirror`", [](const Picture& picture, const std::string&) { picture.VMirror(); }},
    {"`BoxBlurFilter`, radius 3, into another one",
     [](const Picture& picture, const std::string& directory) {
       picture.BoxBlurFilter(Mapped(directory + "/picturezor-b", Width, Height), 3);
     }},
    {"`Rotate90` into another one",
     [](const Picture& picture, const std::string& directory) {
       picture.Rotate90(Mapped(directory + "/picturezor-b", Height, Width));
     }},
    {"`cp`",
     [](const Picture&, const std::string& directory) {
       const std::string copy = directory + "/picturezor-c";
       if (std::system(("cp --reflink=never '" + directory + "/picturezor-a' '" + copy + "'").c_str()) != 0)
         std::exit(2);
       std::remove(copy.c_str());
     }},
};

std::string Median(std::vector<Seconds> of) {
  std::ranges::sort(of, {}, &Seconds::Wall);
  char text[64];
  std::snprintf(text, sizeof text, "%.1f, %.1f", of[of.size() / 2].Wall, of[of.size() / 2].System);
  return text;
}

}

int main(int count, char** arguments) {
  Host::Load();
  const std::vector<std::string> directories(arguments + 1, arguments + count);
  std::vector<std::vector<std::vector<Seconds>>> taken(Works.size());
  for (std::size_t d = 0; d < directories.size(); ++d)
    for (int round = 0; round < Rounds; ++round) {
      const Picture picture = Mapped(directories[d] + "/picturezor-a", Width, Height);
      for (std::size_t w = 0; w < Works.size(); ++w) {
        taken[w].resize(directories.size());
        const Seconds before = Now();
        Works[w].Do(picture, directories[d]);
        const Seconds after = Now();
        taken[w][d].push_back({after.Wall - before.Wall, after.System - before.System});
      }
    }
  std::printf("| %d x %d RGB: wall, system s |", Width, Height);
  for (const std::string& directory : directories) std::printf(" %s |", directory.c_str());
  std::printf("\n|---|");
  for (std::size_t d = 0; d < directories.size(); ++d) std::printf("--:|");
  for (std::size_t w = 0; w < Works.size(); ++w) {
    std::printf("\n| %s |", Works[w].Name.c_str());
    for (const auto& of : taken[w]) std::printf(" %s |", Median(of).c_str());
  }
  std::printf("\n");
}
