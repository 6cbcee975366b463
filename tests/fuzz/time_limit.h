#pragma once
#include <sys/time.h>
#include <unistd.h>

#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <cstring>

namespace picturezor {

/// Ends the process, as a fault does, when the life of this object takes longer than its pixels are worth.
/// What counts is the processors' time, of all threads, so a busy machine makes no difference.
class TimeLimit {
 public:
  explicit TimeLimit(std::int64_t pixels) {
    std::signal(SIGPROF, Passed);
    Set(std::int64_t{FewSeconds} * 1000000 + pixels * MicrosecondsPerPixel);
  }
  ~TimeLimit() { Set(0); }
  TimeLimit(const TimeLimit&) = delete;

 private:
  // Ten times what the slowest rows take with sanitizers.
  static constexpr int FewSeconds = 2, MicrosecondsPerPixel = 10;

  static void Set(std::int64_t microseconds) {
    itimerval timer{};
    timer.it_value.tv_sec = decltype(timer.it_value.tv_sec)(microseconds / 1000000);
    timer.it_value.tv_usec = decltype(timer.it_value.tv_usec)(microseconds % 1000000);
    setitimer(ITIMER_PROF, &timer, nullptr);
  }
  static void Passed(int) {
    constexpr char text[] = "a call takes longer than its pixels are worth\n";
    if (write(STDERR_FILENO, text, sizeof text - 1) < 0) _exit(1);
    std::abort();
  }
};

}
