#include "png_rows.h"

#include <algorithm>
#include <cstring>

namespace picturezor::files {

namespace {

/// The one of left, above and corner that is nearest to left + above - corner.
struct Paeth {
  int operator()(int left, int above, int corner) const {
    const auto l = std::int16_t(above - corner), a = std::int16_t(left - corner);
    const auto c = std::int16_t(l + a);
    const auto toLeft = std::int16_t(l < 0 ? -l : l), toAbove = std::int16_t(a < 0 ? -a : a);
    const auto toCorner = std::int16_t(c < 0 ? -c : c);
    const auto second = std::int16_t(toAbove <= toCorner ? above : corner);
    return toLeft <= (toAbove < toCorner ? toAbove : toCorner) ? std::int16_t(left) : second;
  }
};

template <class Predict>
std::uint64_t FilterBy(Predict predict, const std::uint8_t* row, const std::uint8_t* above,
                       std::uint8_t* __restrict out, std::size_t bytes, std::size_t step) {
  std::uint64_t sum = 0;
  const auto at = [&](std::size_t i, int left, int corner) {
    out[i] = std::uint8_t(row[i] - predict(left, int(above[i]), corner));
  };
  const std::size_t first = std::min(bytes, step);
  for (std::size_t i = 0; i < first; ++i) at(i, 0, 0);
  for (std::size_t i = first; i < bytes; ++i) at(i, row[i - step], above[i - step]);
  // In pieces whose sum fits 32 bits, which the compiler adds side by side.
  constexpr std::size_t piece = 1 << 20;
  for (std::size_t start = 0; start < bytes; start += piece) {
    const std::size_t end = std::min(bytes, start + piece);
    std::uint32_t part = 0;
    for (std::size_t i = start; i < end; ++i) part += std::min<std::uint8_t>(out[i], std::uint8_t(-out[i]));
    sum += part;
  }
  return sum;
}

/// The sum is that of the distances from zero.
std::uint64_t Filter(RowFilter filter, const std::uint8_t* row, const std::uint8_t* above, std::uint8_t* out,
                     std::size_t bytes, int step) {
  const auto by = [&](auto predict) { return FilterBy(predict, row, above, out, bytes, std::size_t(step)); };
  switch (filter) {
    case RowFilter::Sub: return by([](int left, int, int) { return left; });
    case RowFilter::Up: return by([](int, int up, int) { return up; });
    default: return by(Paeth{});
  }
}

}

void FilterRow(const std::uint8_t* row, const std::uint8_t* above, std::uint8_t* out, std::uint8_t* spare,
               std::size_t bytes, int step) {
  std::uint64_t least = UINT64_MAX;
  for (const RowFilter filter : {RowFilter::Paeth, RowFilter::Sub, RowFilter::Up}) {
    std::uint8_t* into = least == UINT64_MAX ? out : spare;
    const std::uint64_t sum = Filter(filter, row, above, into + 1, bytes, step);
    if (sum >= least) continue;
    least = sum;
    into[0] = std::uint8_t(filter);
    if (into == spare) std::memcpy(out, spare, bytes + 1);
  }
}

}
