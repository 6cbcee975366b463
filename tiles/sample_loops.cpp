#include "sample_loops.h"

#include <bit>

#if defined(__x86_64__) && defined(__GNUC__) && !defined(__clang__)
#define TILES_EVERY_TARGET [[gnu::target_clones("avx2", "default")]]
#else
#define TILES_EVERY_TARGET
#endif

namespace picturezor::tiles {

namespace {

template <int N>
[[gnu::always_inline]] inline void SplitBy(const std::uint8_t* __restrict pixels, std::ptrdiff_t count,
                                           std::uint8_t* __restrict planes, std::ptrdiff_t stride) {
  for (std::ptrdiff_t x = 0; x < count; ++x)
    for (int c = 0; c < N; ++c) planes[c * stride + x] = pixels[x * N + c];
}

template <int N>
[[gnu::always_inline]] inline void JoinBy(const std::uint8_t* __restrict planes, std::ptrdiff_t stride,
                                          std::ptrdiff_t count, std::uint8_t* __restrict pixels) {
  for (std::ptrdiff_t x = 0; x < count; ++x)
    for (int c = 0; c < N; ++c) pixels[x * N + c] = planes[c * stride + x];
}

}

TILES_EVERY_TARGET
void Split(const std::uint8_t* pixels, std::ptrdiff_t count, int channels, std::uint8_t* planes,
           std::ptrdiff_t stride) {
  switch (channels) {
    case 1: return SplitBy<1>(pixels, count, planes, stride);
    case 2: return SplitBy<2>(pixels, count, planes, stride);
    case 3: return SplitBy<3>(pixels, count, planes, stride);
    case 4: return SplitBy<4>(pixels, count, planes, stride);
    case 5: return SplitBy<5>(pixels, count, planes, stride);
  }
}

TILES_EVERY_TARGET
void Join(const std::uint8_t* planes, std::ptrdiff_t stride, std::ptrdiff_t count, int channels,
          std::uint8_t* pixels) {
  switch (channels) {
    case 1: return JoinBy<1>(planes, stride, count, pixels);
    case 2: return JoinBy<2>(planes, stride, count, pixels);
    case 3: return JoinBy<3>(planes, stride, count, pixels);
    case 4: return JoinBy<4>(planes, stride, count, pixels);
    case 5: return JoinBy<5>(planes, stride, count, pixels);
  }
}

TILES_EVERY_TARGET
void SumPairs(const std::uint8_t* __restrict samples, std::ptrdiff_t count, std::uint16_t* __restrict sums) {
  for (std::ptrdiff_t x = 0; x < count; ++x) sums[x] = std::uint16_t(samples[2 * x] + samples[2 * x + 1]);
}

TILES_EVERY_TARGET
void SumPairs(const std::uint16_t* __restrict samples, std::ptrdiff_t count, std::uint16_t* __restrict sums) {
  for (std::ptrdiff_t x = 0; x < count; ++x) sums[x] = std::uint16_t(samples[2 * x] + samples[2 * x + 1]);
}

TILES_EVERY_TARGET
void PutShifted(const std::uint16_t* __restrict samples, std::ptrdiff_t count, int shift,
                std::uint32_t* __restrict sums) {
  for (std::ptrdiff_t x = 0; x < count; ++x) sums[x] = std::uint32_t(samples[x] >> shift);
}

TILES_EVERY_TARGET
void AddShifted(const std::uint16_t* __restrict samples, std::ptrdiff_t count, int shift,
                std::uint32_t* __restrict sums) {
  for (std::ptrdiff_t x = 0; x < count; ++x) sums[x] += std::uint32_t(samples[x] >> shift);
}

TILES_EVERY_TARGET
void Divide(const std::uint32_t* __restrict sums, std::ptrdiff_t count, std::int32_t divisor,
            std::uint8_t* __restrict quotients) {
  if (std::has_single_bit(std::uint32_t(divisor))) {
    const int shift = std::countr_zero(std::uint32_t(divisor));
    for (std::ptrdiff_t x = 0; x < count; ++x) quotients[x] = std::uint8_t(sums[x] >> shift);
    return;
  }
  // A quotient that isn't whole is further from the next whole number than it is rounded.
  const double by = divisor;
  for (std::ptrdiff_t x = 0; x < count; ++x)
    quotients[x] = std::uint8_t(std::int32_t(double(std::int32_t(sums[x])) / by));
}

}
