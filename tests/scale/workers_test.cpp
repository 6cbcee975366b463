#include "scale/workers.h"

#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <mutex>
#include <numeric>
#include <set>
#include <thread>

#include "frame/host_services.h"
#include "object_model.h"
#include "support/every_store.h"

namespace picturezor {
namespace {

using Range = std::pair<int, int>;

/// What a call of ParallelFor did.
struct Record {
  std::mutex Guard;
  std::vector<Range> Ranges{};
  std::set<std::thread::id> Threads{};

  void Run(int threads, int count) {
    zor::ParallelFor(threads, count, this, [](std::int32_t first, std::int32_t last, void* context) {
      auto& record = *static_cast<Record*>(context);
      const std::lock_guard lock(record.Guard);
      record.Ranges.emplace_back(first, last);
      record.Threads.insert(std::this_thread::get_id());
    });
    std::ranges::sort(Ranges);
  }
};

class ParallelFor : public testing::Test {
 protected:
  // The yield reaches the host through the resolver, as in the module.
  ParallelFor() {
    zor::SetResolver([](const char* name) { return model::ServiceNamed(name); });
  }
  ~ParallelFor() override { Host::OnYield({}); }
};

TEST_F(ParallelFor, SplitsIntoContiguousRanges) {
  const struct {
    int Threads, Count;
    std::vector<Range> Ranges;
  } cases[] = {
      {3, 10, {{0, 2}, {3, 5}, {6, 9}}},  {-1, 10, {{0, 9}}}, {1, 5, {{0, 4}}}, {2, 1, {{0, -1}, {0, 0}}},
      {3, 2, {{0, -1}, {0, -1}, {0, 1}}},
  };
  for (const auto& [threads, count, ranges] : cases) {
    SCOPED_TRACE(threads);
    Record record;
    record.Run(threads, count);
    EXPECT_EQ(record.Ranges, ranges);
    EXPECT_EQ(record.Threads.contains(std::this_thread::get_id()), threads < 0);
  }
  for (const int threads : {32, 33, 1000}) {
    Record record;
    record.Run(threads, 320);
    EXPECT_EQ(record.Ranges.size(), 32);
    EXPECT_EQ(record.Threads.size(), 32);
  }
  Record all;
  all.Run(0, 1000);
  EXPECT_EQ(all.Ranges.size(), std::min(32L, sysconf(_SC_NPROCESSORS_ONLN)));
}

// Catches slots overwritten while they are in use, and a caller that waits for itself.
TEST_F(ParallelFor, DoesAWorkThatComesMeanwhileItself) {
  std::atomic<int> inner = 0;
  int yields = 0;
  Host::OnYield([&] {
    ++yields;
    Record record;
    record.Run(4, 100);
    inner += record.Ranges == std::vector<Range>{{0, 99}};
    std::thread([&] {
      Record other;
      other.Run(4, 100);
      inner += other.Ranges == std::vector<Range>{{0, 99}};
    }).join();
  });
  Record record;
  record.Run(4, 100);
  EXPECT_EQ(record.Ranges, (std::vector<Range>{{0, 24}, {25, 49}, {50, 74}, {75, 99}}));
  EXPECT_GT(yields, 0);
  EXPECT_EQ(inner, 2 * yields);
}

/// Runs body in a child, which has ten seconds to end with exit code 0.
template <class Body>
void InChild(Body&& body) {
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    alarm(10);
    _exit(body() ? 0 : 1);
  }
  int status = 0;
  waitpid(child, &status, 0);
  EXPECT_TRUE(WIFEXITED(status)) << "signal " << WTERMSIG(status);
  EXPECT_EQ(WEXITSTATUS(status), 0);
}

std::vector<Range> Halves() {
  Record record;
  record.Run(2, 10);
  return record.Ranges;
}

// Catches a child that waits for threads which it doesn't have.
TEST_F(ParallelFor, WorksInAChild) {
  const std::vector<Range> halves{{0, 4}, {5, 9}};
  ASSERT_EQ(Halves(), halves);
  InChild([&] { return Halves() == halves && Halves() == halves; });
  // In one that is born while the parent's threads work, and goes on with the call itself.
  const pid_t parent = getpid();
  int forks = 0;
  Host::OnYield([&] {
    if (forks++ > 0) return;
    const pid_t child = fork();
    if (child == 0) {
      alarm(10);
      return;
    }
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
  });
  // Without a lock, which a thread of the parent may hold at the fork.
  std::atomic<int> done[10] = {};
  zor::ParallelFor(2, 10, done, [](std::int32_t first, std::int32_t last, void* context) {
    for (std::int32_t i = first; i <= last; ++i) ++static_cast<std::atomic<int>*>(context)[i];
  });
  if (getpid() != parent) {
    const bool whole = std::ranges::all_of(done, [](int times) { return times > 0; }) && Halves() == halves;
    _exit(whole ? 0 : 1);
  }
  EXPECT_THAT(done, testing::Each(testing::Eq(1)));
}

// A process may end while threads are parked, and while they work.
TEST_F(ParallelFor, LetsTheProcessEnd) {
  for (const bool working : {false, true})
    EXPECT_EXIT(
        {
          alarm(10);
          if (working) Host::OnYield([] { std::exit(7); });
          zor::ParallelFor(2, 2, nullptr, [](std::int32_t, std::int32_t, void*) { usleep(2000); });
          std::exit(7);
        },
        testing::ExitedWithCode(7), "");
}

}
}
