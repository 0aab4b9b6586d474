#include "index/order_read_keys.h"

#include <algorithm>

namespace qm {

namespace {

// Key and sequence as one number that sorts by signed key, then sequence.
uint64_t Packed(int32_t key, int32_t sequence) {
  return (uint64_t{static_cast<uint32_t>(key) ^ 0x80000000u} << 32) |
         static_cast<uint32_t>(sequence);
}

int32_t KeyOf(uint64_t packed) {
  return static_cast<int32_t>(static_cast<uint32_t>(packed >> 32) ^ 0x80000000u);
}

}  // namespace

ReadKeys::ReadKeys(std::span<const int32_t> keys) {
  std::vector<uint64_t> packed(keys.size());
  for (std::size_t i = 0; i < keys.size(); ++i)
    packed[i] = Packed(keys[i], static_cast<int32_t>(i));
  std::sort(packed.begin(), packed.end());
  for (std::size_t i = 0; i < packed.size(); ++i) {
    const int32_t key = KeyOf(packed[i]);
    if (i + 1 < packed.size() && KeyOf(packed[i + 1]) == key) continue;
    last_.emplace_back(key, static_cast<int32_t>(static_cast<uint32_t>(packed[i])));
  }
}

bool ReadKeys::Contains(int32_t key) const {
  const auto it = std::lower_bound(last_.begin(), last_.end(), key,
                                   [](const auto& entry, int32_t k) { return entry.first < k; });
  return it != last_.end() && it->first == key;
}

}  // namespace qm
