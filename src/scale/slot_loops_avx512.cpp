#include "scale/slot_loops.h"

#if defined(__x86_64__) || defined(__i386__)

#include <cstring>
#include <limits>

#define VectorBytes 64
#define LOOP [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq")]]
#define LOOP_INLINE [[gnu::target("avx512f,avx512bw,avx512vl,avx512dq"), gnu::always_inline]] inline
#define NOINLINE [[gnu::noinline]]
#include "scale/slot_loops_body.h"

namespace zor {

const SlotLoops AVX512Loops{Width, Widen, Sum, MakeRows};

}

#endif
