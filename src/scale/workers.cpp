#include "scale/workers.h"

#include <pthread.h>
#include <signal.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>

#include "frame/host_services.h"

namespace zor {
namespace {

constexpr int MostSlots = 32;

/// A slice of the work with its thread. What the mutex guards is `Pending`: while it is set the slice belongs
/// to the thread, otherwise to the caller. Slots keep off each other's cache lines.
struct alignas(128) WorkerSlot {
  pthread_mutex_t Mutex;
  pthread_cond_t Wake, Finished;
  bool Started, Pending;
  std::int32_t First, Last;
  void* Context;
  ParallelWorker Worker;
};

WorkerSlot WorkerTable[MostSlots];

/// Set while somebody uses the table; and whether that is this thread.
std::atomic_flag TableInUse;
thread_local bool UsesTable;

void* RunSlices(void* argument) {
  auto& slot = *static_cast<WorkerSlot*>(argument);
  pthread_mutex_lock(&slot.Mutex);
  for (;;) {
    while (!slot.Pending) pthread_cond_wait(&slot.Wake, &slot.Mutex);
    pthread_mutex_unlock(&slot.Mutex);
    slot.Worker(slot.First, slot.Last, slot.Context);
    pthread_mutex_lock(&slot.Mutex);
    slot.Pending = false;
    pthread_cond_signal(&slot.Finished);
  }
}

/// A fork takes the table along but not the threads. A caller that forked while it waited finds its slices
/// pending without a thread, and does them itself.
void ForgetThreads() {
  for (WorkerSlot& slot : WorkerTable) {
    slot.Started = false;
    slot.Pending = slot.Pending && UsesTable;
  }
  if (!UsesTable) TableInUse.clear();
}

bool Start(WorkerSlot& slot) {
  static const int watched = pthread_atfork(nullptr, nullptr, ForgetThreads);
  if (watched != 0) return false;
  // Monotonic, so that a wait ends on time when somebody sets the clock.
  pthread_condattr_t monotonic;
  pthread_condattr_init(&monotonic);
  pthread_condattr_setclock(&monotonic, CLOCK_MONOTONIC);
  pthread_mutex_init(&slot.Mutex, nullptr);
  pthread_cond_init(&slot.Wake, nullptr);
  pthread_cond_init(&slot.Finished, &monotonic);
  pthread_condattr_destroy(&monotonic);
  slot.Pending = false;
  // Signals are the program's business, but for those that what a thread does raises for itself: the program
  // may have a way to go on.
  sigset_t others, before;
  sigfillset(&others);
  for (const int own : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT, SIGTRAP}) sigdelset(&others, own);
  pthread_sigmask(SIG_SETMASK, &others, &before);
  pthread_t thread;
  slot.Started = pthread_create(&thread, nullptr, RunSlices, &slot) == 0;
  pthread_sigmask(SIG_SETMASK, &before, nullptr);
  if (slot.Started) pthread_detach(thread);
  return slot.Started;
}

int SlotCount(std::int32_t threads) {
  const long count = threads == 0 ? sysconf(_SC_NPROCESSORS_ONLN) : threads;
  return int(std::clamp(count, 1L, long{MostSlots}));
}

void Release(WorkerSlot& slot) {
  pthread_mutex_lock(&slot.Mutex);
  slot.Pending = true;
  pthread_mutex_unlock(&slot.Mutex);
  pthread_cond_signal(&slot.Wake);
}

/// Waits a millisecond for a slice, at the most. True when it is done.
bool FinishedSoon(WorkerSlot& slot) {
  timespec until;
  clock_gettime(CLOCK_MONOTONIC, &until);
  until.tv_nsec += 1000000;
  if (until.tv_nsec >= 1000000000) {
    until.tv_nsec -= 1000000000;
    ++until.tv_sec;
  }
  pthread_mutex_lock(&slot.Mutex);
  if (slot.Pending) pthread_cond_timedwait(&slot.Finished, &slot.Mutex, &until);
  const bool finished = !slot.Pending;
  pthread_mutex_unlock(&slot.Mutex);
  return finished;
}

void WaitFor(WorkerSlot& slot) {
  while (slot.Started) {
    if (FinishedSoon(slot)) return;
    REALYieldToRB();
  }
  // A child has the slice but no thread.
  if (slot.Pending) slot.Worker(slot.First, slot.Last, slot.Context);
  slot.Pending = false;
}

}

void ParallelFor(std::int32_t threads, std::int32_t count, void* context, ParallelWorker worker) {
  if (threads < 0 || TableInUse.test_and_set()) return worker(0, count - 1, context);
  UsesTable = true;
  const int slots = SlotCount(threads);
  const std::int32_t chunk = count / slots;
  bool started[MostSlots];
  for (int i = 0; i < slots; ++i) {
    WorkerSlot& slot = WorkerTable[i];
    slot.First = i * chunk;
    slot.Last = i == slots - 1 ? count - 1 : slot.First + chunk - 1;
    slot.Context = context;
    slot.Worker = worker;
    started[i] = slot.Started || Start(slot);
    if (started[i]) Release(slot);
  }
  for (int i = 0; i < slots; ++i)
    if (!started[i]) worker(WorkerTable[i].First, WorkerTable[i].Last, context);
  REALYieldToRB();
  for (int i = 0; i < slots; ++i)
    if (started[i]) WaitFor(WorkerTable[i]);
  UsesTable = false;
  TableInUse.clear();
}

}
