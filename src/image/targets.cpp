#include "image/targets.h"

namespace zor {
namespace {

Target BestTarget() {
#if defined(__x86_64__) || defined(__i386__)
  __builtin_cpu_init();
  if (__builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512bw") &&
      __builtin_cpu_supports("avx512vl"))
    return Target::AVX512;
  if (__builtin_cpu_supports("avx2")) return Target::AVX2;
#endif
  return Target::Plain;
}

}

Target CurrentTarget = BestTarget();

}
