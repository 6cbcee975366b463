#pragma once
#include <cstddef>
#include <cstdint>

namespace picturezor::tiles {

// The inner loops of BoxLevels. They are whole-number arithmetic, and divisions that are exact, so every
// processor's form of them gives the same.

/// Pixels of `channels` channels into a plane each, `stride` samples from plane to plane; and back.
void Split(const std::uint8_t* pixels, std::ptrdiff_t count, int channels, std::uint8_t* planes,
           std::ptrdiff_t stride);
void Join(const std::uint8_t* planes, std::ptrdiff_t stride, std::ptrdiff_t count, int channels,
          std::uint8_t* pixels);

/// sums[x] = samples[2 x] + samples[2 x + 1]
void SumPairs(const std::uint8_t* samples, std::ptrdiff_t count, std::uint16_t* sums);
void SumPairs(const std::uint16_t* samples, std::ptrdiff_t count, std::uint16_t* sums);

/// Puts or adds samples[x] >> shift.
void PutShifted(const std::uint16_t* samples, std::ptrdiff_t count, int shift, std::uint32_t* sums);
void AddShifted(const std::uint16_t* samples, std::ptrdiff_t count, int shift, std::uint32_t* sums);

/// quotients[x] = sums[x] / divisor, for sums below 2^31 whose quotients are samples.
void Divide(const std::uint32_t* sums, std::ptrdiff_t count, std::int32_t divisor, std::uint8_t* quotients);

}
