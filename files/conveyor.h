#pragma once
#include <condition_variable>
#include <deque>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>
#include <vector>

#include "worker_threads.h"

namespace picturezor::files {

/// Work on several threads whose results come out in the order in which it was put in. The caller's thread is
/// one of them: it works while it would wait. Jobs begin in order, so one may wait for what an earlier one
/// finds out. One thread puts and takes.
template <class Job>
class Conveyor {
 public:
  /// `work` gets a job and the number of its thread, from 0 to `threads` - 1.
  Conveyor(int threads, std::function<void(Job&, int)> work) : Most(threads), Work(std::move(work)) {}
  Conveyor(const Conveyor&) = delete;
  ~Conveyor() {
    {
      const std::lock_guard lock(Guard);
      Ending = true;
    }
    Changed.notify_all();
    for (std::thread& thread : Threads) thread.join();
  }

  std::size_t Size() const { return Places.size(); }

  void Put(std::unique_ptr<Job> job) {
    {
      const std::lock_guard lock(Guard);
      Places.push_back(std::make_unique<Place>());
      Places.back()->Of = std::move(job);
      Waiting.push_back(Places.back().get());
    }
    Changed.notify_all();
    // A single job is done by who waits for it.
    if (Places.size() > 1 && Threads.empty())
      for (int i = 1; i < Most; ++i) Threads.push_back(StartThread([this, i] { Serve(i); }));
  }

  /// The oldest job, done. Throws what its work threw.
  std::unique_ptr<Job> Take() {
    std::unique_lock lock(Guard);
    Place& oldest = *Places.front();
    while (!oldest.Done)
      if (Waiting.empty())
        Changed.wait(lock);
      else
        DoNext(lock, 0);
    const auto place = std::move(Places.front());
    Places.pop_front();
    if (place->Failed) std::rethrow_exception(place->Failed);
    return std::move(place->Of);
  }

  /// Drops all jobs, those that have begun when they are done.
  void Clear() {
    std::unique_lock lock(Guard);
    Waiting.clear();
    Changed.wait(lock, [this] { return Working == 0; });
    Places.clear();
  }

 private:
  struct Place {
    std::unique_ptr<Job> Of;
    bool Done = false;
    std::exception_ptr Failed;
  };

  void Serve(int number) {
    std::unique_lock lock(Guard);
    for (;;) {
      Changed.wait(lock, [this] { return Ending || !Waiting.empty(); });
      if (Ending) return;
      DoNext(lock, number);
    }
  }

  void DoNext(std::unique_lock<std::mutex>& lock, int number) {
    Place& place = *Waiting.front();
    Waiting.pop_front();
    ++Working;
    lock.unlock();
    std::exception_ptr failed;
    try {
      Work(*place.Of, number);
    } catch (...) {
      failed = std::current_exception();
    }
    lock.lock();
    --Working;
    place.Failed = failed;
    place.Done = true;
    Changed.notify_all();
  }

  int Most;
  std::function<void(Job&, int)> Work;
  std::mutex Guard;
  std::condition_variable Changed;
  /// In order; only the caller adds and removes.
  std::deque<std::unique_ptr<Place>> Places;
  std::deque<Place*> Waiting;
  int Working = 0;
  bool Ending = false;
  std::vector<std::thread> Threads;
};

}
