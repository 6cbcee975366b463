#pragma once
#include <cstdint>
#include <functional>
#include <span>
#include <vector>

#include "image_file.h"

namespace picturezor::tiles {

/// The lines of a source that become one line of a level: from First on, Count of them, all of one weight.
struct BoxLine {
  std::int32_t First = 0, Count = 0;
  std::int32_t Last() const { return First + Count - 1; }
};
/// As the kernel box of the module's `Scale` takes them. Two lines of a level share a line of the source
/// whose middle lies where they meet.
std::vector<BoxLine> BoxLines(std::int32_t level, std::int32_t source);

/// Smaller copies of a picture out of its rows, each as it comes to be by `Scale` of the whole picture with
/// the kernel box: the mean along the row, cut off to a whole number, and then the mean of those down the
/// column, cut off too. Each copy is made of the picture itself and not of a larger copy, which would be cut
/// off once more. What the sums have in common is summed up once.
class BoxLevels {
 public:
  /// The most rows and columns of a source.
  static constexpr std::int32_t MostLines = 1 << 23;

  /// `levels` are the sizes of the copies, the one with the number k having 1 / 2^(k + 1) of the columns and
  /// rows, rounded up. Samples of `channels` channels stand side by side.
  BoxLevels(files::Extent source, int channels, std::span<const files::Extent> levels);
  ~BoxLevels();
  BoxLevels(const BoxLevels&) = delete;

  /// What rows of the source mean for one level.
  struct LevelPart {
    /// Sums of the row that began above them; empty without one.
    std::vector<std::uint32_t> Head;
    bool HeadEnds = false;
    /// The rows that they hold all of.
    Bytes Whole;
    /// Sums of the row that goes on below them.
    std::vector<std::uint32_t> Tail;
  };
  using Part = std::vector<LevelPart>;
  /// Room that one thread works in.
  struct Scratch;
  struct DeleteScratch {
    void operator()(Scratch* scratch) const;
  };
  std::unique_ptr<Scratch, DeleteScratch> MakeScratch() const;

  /// `count` rows of the source from `first` on. Several threads may do this at once.
  Part Reduce(const std::uint8_t* rows, std::ptrdiff_t stride, std::int32_t first, std::int32_t count,
              Scratch& scratch) const;
  /// The first part to come begins at row `first` of the source. A row of a level that began above is given
  /// too, and is wrong.
  void BeginAt(std::int32_t first);
  /// Takes the parts in the order of their rows. Gives the rows of the levels as they are complete. Levels
  /// that a part leaves out, or has nothing of, are left alone.
  void Add(const Part& part,
           const std::function<void(int level, std::int32_t y, const std::uint8_t* row)>& onRow);

 private:
  struct LevelPlan;

  void ReduceRow(const LevelPlan& level, int k, Scratch& scratch, std::uint32_t* sums, bool adds) const;

  /// The first row of a level that ends at a row of the source or below it.
  static std::int32_t FirstOpen(const LevelPlan& level, std::int32_t first);

  const std::int32_t Width;
  const int Channels;
  /// So many levels have lines of 2, 4, 8... columns each.
  int Even = 0;
  /// What the sums of the others are made of: so many columns as a power of two.
  int BlockPower = 0;
  std::vector<LevelPlan> Levels;
};

}
