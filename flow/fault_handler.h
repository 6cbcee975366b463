#pragma once
#include <cstddef>
#include <cstdint>
#include <functional>

namespace picturezor::flow {

/// While this lives, a thread that touches an address of a range which it may not is sent to a function
/// instead of its death, and tries again when that has returned. Touches of other places go the way they went
/// before.
///
/// The function runs in a signal handler, but of a signal that the touch itself raised: it may do all that
/// code may do in whose midst such a touch can't be. The thread mustn't hold the signal SIGSEGV back.
class FaultHandler {
 public:
  /// Throws files::Failure where too many are alive.
  FaultHandler(const void* range, std::size_t bytes, std::function<void(std::uintptr_t address)> onTouch);
  ~FaultHandler();
  FaultHandler(const FaultHandler&) = delete;

 private:
  struct Entry;
  friend struct Handling;
  Entry* Of;
};

}
