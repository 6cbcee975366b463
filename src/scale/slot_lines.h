#pragma once
#include "image/walk.h"
#include "scale/contributions.h"

namespace zor {

/// What a flat run of samples of value v becomes: v, or one less; or that isn't known.
enum class Flat : std::uint8_t { Unknown, Stays, Falls };

/// A line as quotients.h has it, in numbers of 16 bits or in single precision. Its source lines stand in
/// slots: in 16 bits two of them side by side, 2 k and 2 k + 1 being slot k, otherwise one. What the line has
/// no entry for has a share of 0.
struct SlotLine {
  /// The line's slots, and the first one that it or any line after it looks at: weights of 0 have no entries,
  /// so that a line may begin before the one before it.
  std::int32_t First, Count, Least;
  /// Made by the plain form.
  bool Plain;
  Flat OfFlat;

  /// In 16 bits: the digits of the shares of a slot, its even source line first.
  struct Digits {
    std::int16_t High[2], Low[2];
  };
  static constexpr int FractionBits = 8;
  /// What sums begin with, so that samples stand in a signed byte.
  static constexpr int Middle = 128;
  const Digits* Of;
  /// Start + sum of High s is q' + D - Middle in units of 2^-(Shift + FractionBits).
  std::int32_t Start;
  std::int32_t Shift;
  /// D + E in units of 2^-FractionBits, rounded up; 0 where nothing is ever in doubt.
  std::int32_t Gap;
  /// With both digits, ((sum of High s) << Left) + ((sum of Low s) >> Right) + FineStart, and its FineGap,
  /// are the same in units of 2^-(FineShift + FractionBits).
  std::int32_t Left, Right;
  std::int32_t FineStart, FineShift, FineGap;

  /// In single precision: SingleStart + sum of share s, in the order of the source lines, is q' - E, and
  /// SingleGap is E + D; or no less than q, and 0.
  const float* Shares;
  float SingleStart, SingleGap;
};

/// The lines of a table; the same lines share their numbers.
class SlotTable {
 public:
  /// None.
  SlotTable() = default;
  /// With one or two source lines in a slot.
  SlotTable(const ContributionTable& table, int linesInSlot);
  /// False without memory.
  explicit operator bool() const { return Lines != nullptr; }
  const SlotLine& operator[](std::int32_t line) const { return Lines[line]; }
  /// How many lines have samples in doubt.
  std::int32_t DoubtfulLines() const { return Doubtful; }
  /// The most slots that are needed for `together` lines in a row, if none comes back that was left behind.
  std::int32_t MostSlots(int together) const;

 private:
  Buffer LineMemory, NumberMemory;
  SlotLine* Lines = nullptr;
  std::int32_t LineCount = 0, Doubtful = 0;
};

}
