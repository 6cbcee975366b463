#include "scale/slot_loops.h"

#include <cstring>
#include <limits>

#include "image/targets.h"

#ifdef __ARM_NEON
#include <arm_neon.h>
#endif

// What every processor of the architecture has.
#define VectorBytes 16
#define LOOP
#define LOOP_INLINE [[gnu::always_inline]] inline
#define NOINLINE [[gnu::noinline]]
#include "scale/slot_loops_body.h"

namespace zor {

const SlotLoops PlainPairs{Width, LinesInSlot, Widen, Sum, MakeRows};

PreparedLines::PreparedLines(const ContributionTable& table) : Loops(&PlainPairs), Lines(table, LinesInSlot) {
#if defined(__x86_64__) || defined(__i386__)
  if (CurrentTarget < Target::AVX2) return;
  Loops = &AVX2Pairs;
  if (Lines.DoubtfulLines() <= table.Count() / 16) return;
  Loops = &AVX2Floats;
  Lines = SlotTable(table, Loops->LinesInSlot);
#endif
}

}
