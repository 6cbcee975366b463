#pragma once
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>

#include "image/picture_data.h"

namespace zor {

struct Freed {
  void operator()(void* memory) const { std::free(memory); }
};

/// Zeroed memory for the length of a call; null when there is none to be had.
using Buffer = std::unique_ptr<Sample[], Freed>;
Buffer NewBuffer(std::size_t bytes);
/// The same for `count` times `size` bytes, which may be more than a process can have.
Buffer NewBuffer(std::int64_t count, std::int64_t size);

/// Asks for large pages under memory that nobody has touched yet. The system hands out memory a page at a
/// time, and with small pages that takes several times as long as filling it. Where it has no large ones,
/// small ones do.
void WantLargePages(Sample* memory, std::size_t bytes);

}
