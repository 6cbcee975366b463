#pragma once
#include <cstdint>

#include "image/picture_data.h"
#include "scale/kernels.h"

namespace zor {

/// One source line's share in an output line. The line is counted from the first one that the output line
/// looks at.
struct ContributionEntry {
  float Weight;
  std::int32_t Pixel;
};

/// What goes into one output line: `Count` source lines in rising order, all within the picture, and what to
/// divide by. Beyond an edge there are no lines; the division makes up for them. Lines with the same weights
/// share their entries.
struct Contribution {
  const ContributionEntry* Entries;
  std::int32_t Count;
  /// The first source line.
  std::int32_t First;
  /// The sum of the weights before they were rounded, rounded once.
  float Sum;
  /// A line with the same weights that comes first, if it is known, otherwise this one.
  std::int32_t Alike;

  std::int32_t PixelAt(std::int32_t entry) const { return First + Entries[entry].Pixel; }
  /// The last source line, of at least one.
  std::int32_t Last() const { return PixelAt(Count - 1); }
};

/// The contributions of one axis, freed with the table.
class ContributionTable {
 public:
  /// Of an axis that goes from `sourceCount` lines to `outputCount`; `scale` is output divided by source. A
  /// line whose list can't be allocated stays empty. After each line the picture may yield, if it is given.
  ContributionTable(std::int32_t outputCount, std::int32_t sourceCount, double scale, ScaleKernel kernel,
                    PictureData* yields);
  ~ContributionTable();
  ContributionTable(const ContributionTable&) = delete;
  /// False without memory for the table itself.
  explicit operator bool() const { return Lines != nullptr; }
  const Contribution& operator[](std::int32_t line) const { return Lines[line]; }
  std::int32_t Count() const { return LineCount; }

 private:
  struct EntryBlock;
  class Filler;

  Contribution* Lines;
  std::int32_t LineCount;
  EntryBlock* Blocks = nullptr;
};

}
