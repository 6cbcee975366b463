#pragma once
#include "image/walk.h"
#include "scale/exact_passes.h"

namespace zor {

/// The first pass in whole numbers, for processors with AVX-512 VBMI and VNNI.
///
/// A byte permutation of 64 bytes of a row puts four samples of one channel side by side in each of 16 lanes,
/// wherever the planes lie, and one instruction adds four products to each lane. A lane is a channel of an
/// output pixel, or a part of one: where an output pixel takes in many source pixels, several lanes share
/// them. A share of 24 bits is three digits of 8 bits, each with a sum of its own; where the shares of all
/// lines end in zeros, as with dyadic weights, fewer digits do.
class FixedPointRows {
 public:
  /// How many rows are made best together.
  static constexpr int RowsTogether = 4;

  FixedPointRows(const ScalePair& pair, const ContributionTable& table, std::int32_t sourceWidth);
  /// False where there is no such form: on another processor, for luma, where too many lines are always in
  /// doubt, and without memory for it.
  explicit operator bool() const { return Built; }
  /// Columns are made in groups of so many pixels; a run of columns begins with a group.
  int GroupPixels() const { return Pixels; }
  /// Makes some columns of up to RowsTogether rows, out of as many rows of the source. into[r] is where
  /// the first pixel goes.
  void Run(const Sample* const* from, Sample* const* into, int rows, const PixelOrder& order,
           Columns columns) const;

 private:
  friend struct GroupMaker;
  friend struct GroupRunner;
  struct GroupPattern;
  struct ColumnGroup;
  struct Shares;

  bool Build();

  const ScalePair& Pair;
  const ContributionTable& Table;
  std::int32_t ResultWidth;
  /// The plane offset that comes first, from there to the last one, and to the end of the last pixel.
  std::int32_t Lead = 0, Spread = 0;
  std::int64_t RowBytes = 0;
  /// Output pixels of a group, lanes that share a sample, digits of a share.
  int Pixels = 0, Parts = 0, Digits = 0;
  bool Built = false;
  Buffer GroupMemory, PatternMemory;
  ColumnGroup* Groups = nullptr;
};

}
