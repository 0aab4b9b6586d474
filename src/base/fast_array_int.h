// FastArrayInt: a growable array of signed 32-bit integers that grows in
// steps of 50 (the sort keeps one beside its item arrays).
#pragma once

#include <cstdint>
#include <span>
#include <vector>

namespace qm {

class FastArrayInt {
 public:
  static constexpr int32_t kGrowth = 50;

  explicit FastArrayInt(int32_t capacity = kGrowth);

  // Frees the values and makes room for capacity of them; count 0.
  void Reset(int32_t capacity);
  // Count 0; the room stays.
  void Clear() { count_ = 0; }

  // Appends; a full array grows by the growth step keeping its values.
  // Raises numbered error 11 (module "Collection") when it cannot.
  void Insert(int32_t value);

  int32_t Count() const { return count_; }
  int32_t Capacity() const { return capacity_; }
  bool IsAllocated() const { return allocated_; }
  // REQUIRES: 0 <= i < Count().
  int32_t operator[](int32_t i) const { return values_[static_cast<std::size_t>(i)]; }
  int32_t& operator[](int32_t i) { return values_[static_cast<std::size_t>(i)]; }
  std::span<const int32_t> Values() const {
    return {values_.data(), static_cast<std::size_t>(count_)};
  }

 private:
  bool Allocate(int64_t capacity, bool keep);

  int32_t growth_ = kGrowth;
  int32_t capacity_ = 0;
  bool allocated_ = false;
  std::vector<int32_t> values_;  // capacity_ integers
  int32_t count_ = 0;
};

}  // namespace qm
