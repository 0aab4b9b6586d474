// A failed invariant stops the fuzzer with a crash it can report and minimise.
#pragma once

namespace qm::fuzz {

inline void Require(bool holds) {
  if (!holds) __builtin_trap();
}

}  // namespace qm::fuzz
