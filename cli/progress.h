#pragma once
#include <chrono>
#include <cstdint>
#include <string>

namespace picturezor::cli {

/// A bar on the terminal's standard error, for work that takes more than a second; nothing elsewhere.
class Progress {
 public:
  Progress() = default;
  Progress(const Progress&) = delete;
  ~Progress() { Clear(); }

  /// Shows bars from now on, if standard error is a terminal.
  void Enable();
  bool Shown() const { return Enabled; }
  /// Starts a stage of so many steps; 0 where nobody can tell.
  void Begin(std::string stage, std::int64_t steps = 0);
  void Step() {
    ++Steps;
    if (Enabled) Tick();
  }
  /// The work goes on.
  void Tick();
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
