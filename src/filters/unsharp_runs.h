#pragma once
#include <array>

#include "image/picture_data.h"

namespace zor {

/// The push of UnsharpFilter in whole numbers, for vectors of integers: a sample a beside b becomes
/// b + (Multiplier d + Bias >> Shift) with d = a - b, unless d is among the doubtful differences.
struct WholeFactor {
  static constexpr std::int32_t Bias = 256;

  /// Takes the finest scale whose products fit.
  explicit WholeFactor(double factor);

  double Factor;
  /// Without a scale whose products fit, whole numbers can't stand for the factor at all.
  bool Fits;
  std::int32_t Multiplier = 0, Shift = 20;
  /// The differences for which the formula in doubles may give something else: bit d + 256, and whether there
  /// are any.
  std::array<std::uint32_t, 16> Doubtful{};
  bool AnyDoubtful = false;
};

/// Pushes the samples of a row in vectors: whole numbers, and doubles where a difference is doubtful. For a
/// factor that fits, Target::AVX512 or better, and rows that don't overlap.
void PushRunAVX512(Sample* samples, const Sample* beside, std::ptrdiff_t count, const WholeFactor& factor,
                   std::int32_t threshold);

}
