#pragma once
#include "scale/fixed_point_rows.h"
#include "scale/slot_lines.h"

namespace zor {

// What a run over the columns works on: 16 lanes of four samples each.
inline constexpr int Lanes = 16, Taps = 4, VectorBytes = 64;

/// How the samples of a group are made; its weights follow in memory, the digits of a step one after the
/// other. Groups of the same lines, some pixels further, have one in common, so that all of them stay in the
/// first-level cache where a ratio is simple.
struct alignas(VectorBytes) FixedPointRows::GroupPattern {
  /// Which of 64 bytes goes where: Taps bytes a lane.
  std::uint8_t Index[VectorBytes];
  std::int32_t Bias[Lanes];
  std::uint32_t Doubtful[Lanes];
  Flat OfFlat[Lanes];

  const std::int8_t* Weights() const { return reinterpret_cast<const std::int8_t*>(this + 1); }
  std::int8_t* Weights() { return reinterpret_cast<std::int8_t*>(this + 1); }
};

/// A few output pixels side by side.
struct FixedPointRows::ColumnGroup {
  const GroupPattern* Pattern;
  /// Bytes from the row's first sample to the group's.
  std::int64_t Base;
  std::int32_t Steps;
  /// Steps whose 64 bytes all lie in the row.
  std::int32_t WholeSteps;
  std::int32_t FirstColumn;
  std::int32_t Columns;
};

}
