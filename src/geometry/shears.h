#pragma once
#include <array>

#include "image/groups.h"

namespace zor {

/// How far a shear moves a line: whole pixels, and the part of each sample, 0 to 1, that goes one further.
struct Shift {
  std::int32_t Whole;
  double Part;
};
/// Towards minus infinity, so that the part isn't negative.
Shift ShiftBy(double distance);

/// A shear's pictures, with the planes of one group in both, and the samples that stand where nothing comes.
struct Shear {
  PictureData &From, &Into;
  PlaneList In, Out;
  std::array<Sample, 5> Background;
};

/// Each sample keeps what it doesn't give to the next one along its line; both ends of the line blend into
/// the background. All of the line is written in `Into`, whose extent bounds it. Rows 0 .. height - 1, by a
/// shift for each. False when a row can't be reached or there is no memory.
bool ShearRows(const Shear& shear, const Shift* shifts, std::int32_t height);
/// The same for all columns of the source; `Into` has as many.
bool ShearColumns(const Shear& shear, const Shift* shifts);

}
