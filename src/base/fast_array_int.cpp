#include "base/fast_array_int.h"

#include <cstdio>
#include <new>

#include "base/error_numbers.h"
#include "base/checked_allocation.h"
#include "base/exception_family.h"

namespace qm {

namespace {

[[noreturn]] void AllocationFailed(const char* method) {
  // Text kept as written: callers match on it. Do not correct.
  std::fputs("Error allocationg memory\n", stdout);
  std::fflush(stdout);
  throw CCollectionException::Numbered(kErrOutOfMemory, method, nullptr);
}

}  // namespace

FastArrayInt::FastArrayInt(int32_t capacity) {
  if (!Allocate(capacity, false)) AllocationFailed("FastArrayInt::FastArrayInt");
}

bool FastArrayInt::Allocate(int64_t capacity, bool keep) {
  if (capacity < 0 || capacity > INT32_MAX) return false;
  try {
    CheckAllocationSize(static_cast<std::size_t>(capacity) * sizeof(int32_t));
    if (keep) {
      values_.resize(static_cast<std::size_t>(capacity));
    } else {
      std::vector<int32_t>().swap(values_);
      values_.resize(static_cast<std::size_t>(capacity));
    }
  } catch (const std::bad_alloc&) {
    return false;
  }
  capacity_ = static_cast<int32_t>(capacity);
  allocated_ = true;
  return true;
}

void FastArrayInt::Reset(int32_t capacity) {
  count_ = 0;
  allocated_ = false;
  capacity_ = 0;
  if (!Allocate(capacity, false)) AllocationFailed("FastArrayInt::Reset");
}

void FastArrayInt::Insert(int32_t value) {
  if (count_ >= capacity_ && !Allocate(int64_t{capacity_} + growth_, true)) {
    AllocationFailed("FastArrayInt::Insert");
  }
  values_[static_cast<std::size_t>(count_++)] = value;
}

}  // namespace qm
