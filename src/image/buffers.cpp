#include "image/buffers.h"

#include <sys/mman.h>

#include <cerrno>
#include <limits>

#include "image/stores.h"

namespace zor {

Buffer NewBuffer(std::size_t bytes) {
  auto* memory = static_cast<Sample*>(std::calloc(1, bytes));
  if (memory) WantLargePages(memory, bytes);
  return Buffer{memory};
}

Buffer NewBuffer(std::int64_t count, std::int64_t size) {
  const bool fits = size == 0 || count <= std::numeric_limits<std::ptrdiff_t>::max() / size;
  return fits ? NewBuffer(std::size_t(count * size)) : nullptr;
}

void WantLargePages([[maybe_unused]] Sample* memory, [[maybe_unused]] std::size_t bytes) {
#ifdef MADV_HUGEPAGE
  constexpr std::size_t few = 4 << 20;
  if (bytes < few) return;
  const std::size_t toPage = std::size_t(-reinterpret_cast<Word>(memory)) % std::size_t(PageSize);
  const std::size_t pages = (bytes - toPage) / std::size_t(PageSize) * std::size_t(PageSize);
  if (madvise(memory + toPage, pages, MADV_HUGEPAGE) != 0) errno = 0;
#endif
}

}
