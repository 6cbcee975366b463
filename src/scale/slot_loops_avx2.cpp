#include "scale/slot_loops.h"

#if defined(__x86_64__) || defined(__i386__)

#include <cstring>
#include <limits>

#define VectorBytes 32
#define LOOP [[gnu::target("avx2,fma")]]
#define LOOP_INLINE [[gnu::target("avx2,fma"), gnu::always_inline]] inline
#define NOINLINE [[gnu::noinline]]
#include "scale/slot_loops_body.h"

namespace zor {

const SlotLoops AVX2Loops{Width, Widen, Sum, MakeRows};

}

#endif
