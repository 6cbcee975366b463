#pragma once
#include <gtest/gtest.h>

#include "image/targets.h"

namespace picturezor {

/// The target that the loaded module runs its row loops for.
zor::Target& TargetOfModule();

/// Runs body for each instruction set that this machine has, from what every processor has to the best.
template <class Body>
void ForEveryTarget(Body&& body) {
  const zor::Target best = TargetOfModule();
  for (int target = 0; target <= int(best); ++target) {
    SCOPED_TRACE(testing::Message() << "target " << target);
    TargetOfModule() = zor::Target(target);
    body();
  }
  TargetOfModule() = best;
}

}
