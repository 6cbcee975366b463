#include <picturezor/picture.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <functional>
#include <utility>

// The short calls of bench.py from C++ on: a line each, its name and the microseconds of the fastest of some
// runs.

int main(int, char** arguments) {
  using namespace picturezor;
  using Clock = std::chrono::steady_clock;
  Host::Load(arguments[1]);
  const Picture picture(64, 64, Format::RGB);
  const std::pair<const char*, std::function<void()>> calls[] = {
      {"width", [&] { picture.Width(); }},
      {"channel_count", [&] { picture.ChannelCount(); }},
      {"fill_rect((0, 0, 1, 1), 7)",
       [&] {
         picture.FillRect({0, 0, 1, 1}, 7);
       }},
      {"row(0)", [&] { picture.Row(0); }},
      {"red_channel()", [&] { picture.RedChannel(); }},
      {"clip_image((0, 0, 1, 1))",
       [&] {
         picture.ClipImage({0, 0, 1, 1});
       }},
      {"clone()", [&] { picture.Clone(); }},
  };
  for (const auto& [name, call] : calls) {
    constexpr int times = 20000;
    double best = 1e9;
    for (int run = 0; run < 9; ++run) {
      const Clock::time_point start = Clock::now();
      for (int i = 0; i < times; ++i) call();
      best = std::min(best, std::chrono::duration<double, std::micro>(Clock::now() - start).count() / times);
    }
    std::printf("%s\t%.3f\n", name, best);
  }
}
