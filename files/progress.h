#pragma once
#include <cstdint>
#include <stdexcept>
#include <string>

namespace picturezor::files {

/// Thrown out of long work that was told to stop.
class Cancelled : public std::runtime_error {
 public:
  Cancelled() : std::runtime_error("cancelled") {}
};

/// What long work tells of itself, and where it may be told to stop: an implementation throws Cancelled from
/// a call. Work on several threads reports from the one that was called.
class Progress {
 public:
  virtual ~Progress() = default;
  /// A stage of so many steps begins; 0 where nobody can tell.
  virtual void Begin(const std::string& stage, std::int64_t steps = 0) = 0;
  /// Steps of the stage are done.
  virtual void Step(std::int64_t steps = 1) = 0;
  /// The work goes on.
  virtual void Tick() = 0;
};

/// For those who don't want to know.
class Silence final : public Progress {
 public:
  void Begin(const std::string&, std::int64_t) override {}
  void Step(std::int64_t) override {}
  void Tick() override {}
};

}
