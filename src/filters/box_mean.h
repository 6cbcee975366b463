#pragma once
#include <bit>
#include <cstdint>
#include <type_traits>

#include "image/picture_data.h"

namespace zor {

/// The truncated mean of n samples from their sum, n odd and at least 3, as a product and a shift instead of
/// a division. What is summed up has to start at `Bias`.
///
/// With N bits in a Sum and 2^s < n < 2^(s+1), let m n = 2^(N+s) - e with m rounded down, so 0 < e < n.
/// If n - e <= 2^s, the multiplier is m + 1: for v < 2^N the product v (m + 1) / 2^(N+s) is v / n plus
/// v (n - e) / (n 2^(N+s)) < 1 / n, which reaches no further integer. Otherwise e < 2^s, the multiplier is m,
/// and sums are one too large: (v + 1) / n less (v + 1) e / (n 2^(N+s)) <= 1 / n isn't below v / n, but it is
/// below (v + 1) / n.
template <class Sum>
struct BoxMean {
  using Wide = std::conditional_t<sizeof(Sum) == 2, std::uint32_t, std::uint64_t>;
  static constexpr int Bits = 8 * int(sizeof(Sum));

  explicit BoxMean(std::int64_t n) : Shift(std::bit_width(std::uint64_t(n)) - 1) {
    const std::uint64_t power = std::uint64_t{1} << (Bits + Shift), rest = power % std::uint64_t(n);
    const bool up = std::uint64_t(n) - rest <= std::uint64_t{1} << Shift;
    Multiplier = Sum(power / std::uint64_t(n) + up);
    Bias = up ? 0 : 1;
  }
  /// Whether the sums of n samples stay in a Sum.
  static bool Holds(std::int64_t n) { return n <= (std::int64_t{1} << Bits) / 256; }
  Sample operator()(Sum sum) const { return Sample(Wide(sum) * Multiplier >> Bits >> Shift); }

  Sum Multiplier, Bias;
  int Shift;
};

/// For more samples than a picture in memory has to a side; then speed doesn't matter.
template <>
struct BoxMean<std::uint64_t> {
  explicit BoxMean(std::int64_t n) : Count(std::uint64_t(n)) {}
  Sample operator()(std::uint64_t sum) const { return Sample(sum / Count); }

  std::uint64_t Count, Bias = 0;
};

}
