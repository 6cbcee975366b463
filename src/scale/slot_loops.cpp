#include "scale/slot_loops.h"

#include <cstring>
#include <limits>

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

const SlotLoops PlainLoops{Width, Widen, Sum, MakeRows};

const SlotLoops& LoopsFor([[maybe_unused]] Target target) {
#if defined(__x86_64__) || defined(__i386__)
  constexpr const SlotLoops* all[] = {&PlainLoops, &AVX2Loops, &AVX512Loops, &VNNILoops};
  return *all[int(target)];
#else
  return PlainLoops;
#endif
}

PreparedLines::PreparedLines(const ContributionTable& table)
    : Loops(&LoopsFor(CurrentTarget)), Lines(table) {}

}
