#pragma once
#include <bit>
#include <cstdint>
#include <type_traits>

#include "image/picture_data.h"

namespace zor {

/// The truncated mean of n samples from their sum, n odd and at least 3, as products and shifts instead of a
/// division, by Granlund and Montgomery, "Division by Invariant Integers using Multiplication" (1994), figure
/// 4.1. With N bits in a Sum and 2^s < n < 2^(s+1), a factor of 2^N + Multiplier is 2^(N+s+1) / n rounded up.
/// The last shift is a product too: it is the one of a Sum by a variable that compilers have vectors for.
template <class Sum>
struct BoxMean {
  using Wide = std::conditional_t<sizeof(Sum) == 2, std::uint32_t, std::uint64_t>;
  static constexpr int Bits = 8 * int(sizeof(Sum));

  explicit BoxMean(std::int64_t n) {
    const int shift = std::bit_width(std::uint64_t(n)) - 1;
    const std::uint64_t rest = (std::uint64_t{2} << shift) - std::uint64_t(n);
    Multiplier = Sum((rest << Bits) / std::uint64_t(n) + 1);
    Power = Sum(Sum{1} << (Bits - shift));
  }
  /// Whether the sums of n samples stay in a Sum.
  static bool Holds(std::int64_t n) { return n <= (std::int64_t{1} << Bits) / 256; }
  Sample operator()(Sum sum) const {
    const Sum high = Sum(Wide(sum) * Multiplier >> Bits), half = Sum(Sum(sum - high) >> 1);
    return Sample(Wide(Sum(high + half)) * Power >> Bits);
  }

  Sum Multiplier, Power;
};

/// For more samples than a picture in memory has to a side; then speed doesn't matter.
template <>
struct BoxMean<std::uint64_t> {
  explicit BoxMean(std::int64_t n) : Count(std::uint64_t(n)) {}
  Sample operator()(std::uint64_t sum) const { return Sample(sum / Count); }

  std::uint64_t Count;
};

}
