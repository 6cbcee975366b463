#pragma once
#include <cstdint>

namespace zor {

/// Works on the indexes first to last of something; nothing when first is above last. On a thread of its own
/// it calls no host service and keeps to its range.
using ParallelWorker = void (*)(std::int32_t first, std::int32_t last, void* context);

/// Calls worker over the indexes 0 to count - 1, in one contiguous range a thread, and returns when all are
/// done. `threads` below 0 runs all of it here; 0 takes a thread a processor; more than 32 count as 32.
///
/// The threads are made when they are first needed, are parked between calls and end with the process. The
/// calling thread lets the host's other threads run meanwhile. One of these that comes here too does its work
/// itself, without yielding. A range whose thread can't be made is done here; after a fork the child makes
/// threads of its own, and does here what the parent's were doing.
void ParallelFor(std::int32_t threads, std::int32_t count, void* context, ParallelWorker worker);

}
