#pragma once

namespace picturezor {

/// What the module as the fault tests build it counts of its calls to the system and to the host, and which
/// of them it makes fail.
struct Faults {
  /// Calls that could have failed since the last reset.
  int Calls;
  /// The first call that fails, counted from 1, and how many do; 0 is none.
  int First, Count;
  /// Only those that make threads count.
  bool ThreadsOnly;
  /// What the module holds of the system now.
  int Blocks, Descriptors;
};

}
