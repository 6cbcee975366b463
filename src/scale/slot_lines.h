#pragma once
#include "image/walk.h"
#include "scale/contributions.h"

namespace zor {

/// What a flat run of samples of value v becomes: v, or one less; or that isn't known.
enum class Flat : std::uint8_t { Unknown, Stays, Falls };

/// Source lines stand in slots, two of them side by side: 2 k and 2 k + 1 are slot k.
inline constexpr int LinesInSlot = 2;

/// A line as quotients.h has it, in numbers of 16 bits. What it has no entry for has a share of 0.
struct SlotLine {
  /// The line's slots, and the first one that it or any line after it looks at: weights of 0 have no entries,
  /// so that a line may begin before the one before it.
  std::int32_t First, Count, Least;
  /// Made by the plain form.
  bool Plain;
  Flat OfFlat;

  /// The digits of the shares of a slot, its even source line first.
  struct Digits {
    std::int16_t High[2], Low[2];
  };
  const Digits* Of;
  /// A few slots in the middle may have a third digit, which is worth 2^TopShift of the high one.
  static constexpr int MostTops = 3, TopShift = 15;
  std::int32_t FirstTop, TopCount;
  std::int16_t Top[MostTops][LinesInSlot];
  /// Start + (sum of Top s << TopShift) + sum of High s is q' + D in units of 2^-Shift, and Gap is D + E; 0
  /// where nothing is ever in doubt.
  std::int32_t Start, Shift, Gap;
  /// With the low digits, ((all that but Start) << Left) + ((sum of Low s) >> Right) + FineStart, and its
  /// FineGap, are the same in units of 2^-FineShift.
  std::int32_t Left, Right;
  std::int32_t FineStart, FineShift, FineGap;
};

/// The lines of a table; the same lines share their numbers.
class SlotTable {
 public:
  /// None.
  SlotTable() = default;
  explicit SlotTable(const ContributionTable& table);
  /// False without memory.
  explicit operator bool() const { return Lines != nullptr; }
  const SlotLine& operator[](std::int32_t line) const { return Lines[line]; }
  /// The most slots that are needed for `together` lines in a row, if none comes back that was left behind.
  std::int32_t MostSlots(int together) const;

 private:
  Buffer LineMemory, NumberMemory;
  SlotLine* Lines = nullptr;
  std::int32_t LineCount = 0;
};

}
