#include "fault_handler.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <mutex>

#include "failure.h"

namespace picturezor::flow {

struct FaultHandler::Entry {
  /// 0 where the entry is free.
  std::atomic<std::uintptr_t> First = 0;
  std::atomic<std::size_t> Bytes = 0;
  std::function<void(std::uintptr_t address)> OnTouch;
};

struct Handling {
  static std::array<FaultHandler::Entry, 64> Entries;
  static struct sigaction Before;
  static std::mutex Changing;

  static void PassOn(int signal, siginfo_t* info, void* context) {
    if (Before.sa_flags & SA_SIGINFO) return Before.sa_sigaction(signal, info, context);
    if (Before.sa_handler != SIG_DFL && Before.sa_handler != SIG_IGN) return Before.sa_handler(signal);
    // It comes again, and ends the process.
    std::signal(signal, SIG_DFL);
  }

  static void OnFault(int signal, siginfo_t* info, void* context) {
    const auto address = reinterpret_cast<std::uintptr_t>(info->si_addr);
    for (FaultHandler::Entry& entry : Entries) {
      const std::uintptr_t first = entry.First;
      if (first == 0 || address < first || address - first >= entry.Bytes) continue;
      const int kept = errno;
      entry.OnTouch(address);
      errno = kept;
      return;
    }
    PassOn(signal, info, context);
  }

  static void Install() {
    struct sigaction now {};
    sigaction(SIGSEGV, nullptr, &now);
    if (now.sa_flags & SA_SIGINFO && now.sa_sigaction == OnFault) return;
    Before = now;
    struct sigaction ours {};
    ours.sa_sigaction = OnFault;
    // On the stack that the program gave for it, if any; other signals may interrupt the wait.
    ours.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_NODEFER;
    sigaction(SIGSEGV, &ours, nullptr);
  }
};

std::array<FaultHandler::Entry, 64> Handling::Entries;
struct sigaction Handling::Before {};
std::mutex Handling::Changing;

FaultHandler::FaultHandler(const void* range, std::size_t bytes,
                           std::function<void(std::uintptr_t address)> onTouch)
    : Of(nullptr) {
  const std::lock_guard lock(Handling::Changing);
  for (Entry& entry : Handling::Entries)
    if (entry.First == 0) {
      Of = &entry;
      break;
    }
  if (!Of) throw files::Failure("too many pictures arrive at the same time");
  Handling::Install();
  Of->OnTouch = std::move(onTouch);
  Of->Bytes = bytes;
  Of->First = reinterpret_cast<std::uintptr_t>(range);
}

FaultHandler::~FaultHandler() {
  const std::lock_guard lock(Handling::Changing);
  Of->First = 0;
  Of->OnTouch = nullptr;
}

}
