#pragma once
#include <chrono>
#include <string>

#include "progress.h"

namespace picturezor::cli {

/// A bar on the terminal's standard error, for work that takes more than a second; nothing elsewhere.
class ProgressBar final : public files::Progress {
 public:
  ProgressBar() = default;
  ProgressBar(const ProgressBar&) = delete;
  ~ProgressBar() override { Clear(); }

  /// Shows bars from now on, if standard error is a terminal.
  void Enable();
  void Begin(const std::string& stage, std::int64_t steps = 0) override;
  void Step(std::int64_t steps = 1) override {
    Steps += steps;
    if (Enabled) Tick();
  }
  void Tick() override;
  /// Takes the bar off the line, for other text.
  void Clear();

 private:
  using Clock = std::chrono::steady_clock;
  bool Enabled = false, Drawn = false;
  std::string Stage;
  std::int64_t Steps = 0, Whole = 0;
  Clock::time_point Started = Clock::now(), StageStarted = Started, LastDrawn = Started;
};

}
