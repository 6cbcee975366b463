#include "progress_bar.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <utility>

namespace picturezor::cli {

using namespace std::chrono_literals;

void ProgressBar::Enable() { Enabled = isatty(STDERR_FILENO); }

void ProgressBar::Begin(const std::string& stage, std::int64_t steps) {
  Stage = stage;
  Whole = steps;
  Steps = 0;
  StageStarted = Clock::now();
}

void ProgressBar::Tick() {
  if (!Enabled) return;
  const auto now = Clock::now();
  if (now - Started < 1s || now - LastDrawn < 100ms) return;
  LastDrawn = now;
  Drawn = true;
  constexpr int length = 40;
  std::string bar(length, ' ');
  if (Whole > 0) {
    const int filled = int(std::min<std::int64_t>(length, Steps * length / Whole));
    std::fill_n(bar.begin(), filled, '#');
    std::fprintf(stderr, "\r%-8s [%s] %3d%% \x1b[K", Stage.c_str(), bar.c_str(), int(Steps * 100 / Whole));
  } else {
    // Only that it goes on: a mark runs to and fro.
    const int at = int((now - StageStarted) / 100ms % (2 * (length - 3)));
    std::fill_n(bar.begin() + std::min(at, 2 * (length - 3) - at), 3, '#');
    std::fprintf(stderr, "\r%-8s [%s] %3d s \x1b[K", Stage.c_str(), bar.c_str(),
                 int((now - StageStarted) / 1s));
  }
  std::fflush(stderr);
}

void ProgressBar::Clear() {
  if (!std::exchange(Drawn, false)) return;
  std::fputs("\r\x1b[K", stderr);
  std::fflush(stderr);
}

}
