#include "worker_threads.h"

#include <sched.h>

#include <algorithm>
#include <csignal>

namespace picturezor::files {

int Processors() {
  cpu_set_t allowed;
  if (sched_getaffinity(0, sizeof allowed, &allowed) == 0) return std::max(1, CPU_COUNT(&allowed));
  return std::max(1, int(std::thread::hardware_concurrency()));
}

std::thread StartThread(std::function<void()> work) {
  sigset_t held, before;
  sigfillset(&held);
  // What the thread does itself comes to it.
  for (const int own : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT, SIGTRAP}) sigdelset(&held, own);
  pthread_sigmask(SIG_BLOCK, &held, &before);
  const struct Restore {
    const sigset_t& Before;
    ~Restore() { pthread_sigmask(SIG_SETMASK, &Before, nullptr); }
  } restore{before};
  return std::thread(std::move(work));
}

}
