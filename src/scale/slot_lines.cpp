#include "scale/slot_lines.h"

#include <algorithm>
#include <limits>

#include "scale/quotients.h"

namespace zor {
namespace {

/// Slots from the first source line of a line to its last one.
std::int32_t SlotCount(const Contribution& line) {
  return line.Count == 0 ? 0 : line.Last() / LinesInSlot - line.First / LinesInSlot + 1;
}

/// The lines whose numbers have been made: of each set of weights those whose first source line stands first
/// in its slot, and those where it stands second.
class KnownLines {
 public:
  explicit KnownLines(std::int32_t count)
      : Memory(NewBuffer(std::int64_t{count} * LinesInSlot, sizeof(std::int32_t))) {}
  explicit operator bool() const { return Memory != nullptr; }
  void Forget(std::int32_t count) { std::fill_n(At(0), std::ptrdiff_t{count} * LinesInSlot, 0); }
  /// The line that has the numbers of line `of`, which is itself if it comes first.
  std::int32_t For(std::int32_t of, const Contribution& line) {
    std::int32_t& known = At(line.Alike)[line.First % LinesInSlot];
    if (known == 0) known = of + 1;
    return known - 1;
  }

 private:
  std::int32_t* At(std::int32_t line) {
    return reinterpret_cast<std::int32_t*>(Memory.get()) + std::ptrdiff_t{line} * LinesInSlot;
  }
  Buffer Memory;
};

}

SlotTable::SlotTable(const ContributionTable& table)
    : LineMemory(NewBuffer(table.Count(), sizeof(SlotLine))), LineCount(table.Count()) {
  KnownLines known(table.Count());
  if (!LineMemory || !known) return;
  std::int64_t slots = 0;
  for (std::int32_t i = 0; i < table.Count(); ++i)
    if (known.For(i, table[i]) == i) slots += SlotCount(table[i]);
  NumberMemory = NewBuffer(slots + 1, sizeof(SlotLine::Digits));
  if (!NumberMemory) return;
  known.Forget(table.Count());
  Lines = reinterpret_cast<SlotLine*>(LineMemory.get());
  auto* digits = reinterpret_cast<SlotLine::Digits*>(NumberMemory.get());
  for (std::int32_t i = 0; i < table.Count(); ++i) {
    const Contribution& from = table[i];
    SlotLine& line = Lines[i];
    if (const std::int32_t same = known.For(i, from); same != i) {
      line = Lines[same];
    } else {
      line.Count = SlotCount(from);
      MakeDigits(from, digits, line);
      digits += line.Count;
    }
    line.First = from.First / LinesInSlot;
  }
  std::int32_t least = std::numeric_limits<std::int32_t>::max();
  for (std::int32_t i = table.Count() - 1; i >= 0; --i) {
    if (Lines[i].Count > 0) least = std::min(least, Lines[i].First);
    Lines[i].Least = least;
  }
}

std::int32_t SlotTable::MostSlots(int together) const {
  std::int32_t most = 1, last = 0;
  for (std::int32_t i = 0; i < LineCount; ++i) {
    if (Lines[i].Count > 0) last = std::max(last, Lines[i].First + Lines[i].Count - 1);
    most = std::max(most, last - Lines[std::max(i - together + 1, 0)].Least + 1);
  }
  return most;
}

}
