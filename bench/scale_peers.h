#pragma once
#include <vector>

#include "race.h"

namespace picturezor::bench {

struct Sizes {
  const char* Name;
  int FromWidth, FromHeight, IntoWidth, IntoHeight;
};

/// What else does the same work here: antialiased, along both axes, 8 bits, with this kernel, on one thread.
/// Each works on pixels as it keeps them itself: zimg on one plane after the other, the others on interleaved
/// ones.
std::vector<Contender> ScalePeers(Format format, Kernel kernel, const Sizes& sizes);

}
