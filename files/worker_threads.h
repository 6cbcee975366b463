#pragma once
#include <functional>
#include <thread>

namespace picturezor::files {

/// The processors that this process may use, at least one.
int Processors();

/// The threads that an option asks for: 0 stands for one a processor.
inline int ThreadsFor(int asked) { return asked > 0 ? asked : Processors(); }

/// A thread that signals to the process don't interrupt: they are the calling threads' business.
std::thread StartThread(std::function<void()> work);

}
