#include "image/targets.h"

namespace zor {
namespace {

Target BestTarget() {
#if defined(__x86_64__) || defined(__i386__)
  __builtin_cpu_init();
  const bool avx2 = __builtin_cpu_supports("avx2") && __builtin_cpu_supports("fma");
  if (avx2 && __builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512bw") &&
      __builtin_cpu_supports("avx512vl") && __builtin_cpu_supports("avx512dq"))
    return __builtin_cpu_supports("avx512vbmi") && __builtin_cpu_supports("avx512vnni") ? Target::AVX512VBMI
                                                                                        : Target::AVX512;
  if (avx2) return Target::AVX2;
#endif
  return Target::Plain;
}

}

Target CurrentTarget = BestTarget();

}
