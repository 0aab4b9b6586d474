// Reservations that report every "cannot allocate" the same way: as
// std::bad_alloc, also for a size beyond what the container can ever hold, so
// the engine's strings and values turn it into their own "Value" errors.
// Tests lower the limit to walk those paths without exhausting memory.
#pragma once

#include <cstddef>
#include <new>

namespace qm {

// Throws std::bad_alloc when a request of this many bytes is above the limit.
void CheckAllocationSize(std::size_t bytes);

// Reserves room for count elements of the container, or throws std::bad_alloc.
template <class Container>
void ReserveChecked(Container& container, std::size_t count) {
  if (count > container.max_size()) throw std::bad_alloc();
  CheckAllocationSize(count * sizeof(typename Container::value_type));
  container.reserve(count);
}

// Tests only: requests above this many bytes fail as if memory were exhausted;
// 0 lifts the limit again.
void SetAllocationLimitForTesting(std::size_t bytes);

}  // namespace qm
