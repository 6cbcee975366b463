#pragma once
#include "scale/fixed_point_rows.h"

namespace zor {

// What a run over the columns works on: 16 lanes of four samples each.
inline constexpr int Lanes = 16, Taps = 4, VectorBytes = 64;

/// A few output pixels side by side.
struct alignas(VectorBytes) FixedPointRows::ColumnGroup {
  /// Which of 64 bytes goes where: Taps bytes a lane.
  std::uint8_t Index[VectorBytes];
  std::int32_t Bias[Lanes];
  std::uint32_t Doubtful[Lanes];
  /// Bytes from the row's first sample to the group's, and what each step adds to it.
  std::int64_t Base;
  std::int32_t Steps;
  /// Steps whose 64 bytes all lie in the row.
  std::int32_t WholeSteps;
  std::int32_t FirstColumn;
  std::int32_t Columns;
  const std::int8_t* Weights;
};

}
