#include "base/checked_allocation.h"

#include <atomic>

namespace qm {

namespace {
std::atomic<std::size_t> g_limit{0};
}  // namespace

void CheckAllocationSize(std::size_t bytes) {
  const std::size_t limit = g_limit.load(std::memory_order_relaxed);
  if (limit != 0 && bytes > limit) throw std::bad_alloc();
}

void SetAllocationLimitForTesting(std::size_t bytes) { g_limit = bytes; }

}  // namespace qm
