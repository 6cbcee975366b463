#pragma once
#include <functional>
#include <thread>

namespace picturezor::flow {

/// The processors that this process may use, at least one.
int Processors();

/// A thread that signals to the process don't interrupt: they are the calling threads' business.
std::thread StartThread(std::function<void()> work);

}
