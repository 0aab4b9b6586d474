// ReadKeys: the keys an order build read, with the rule that makes an order
// hold one row per key: of the rows read for one key, the last one read
// counts, and it replaces the key's row from an earlier build.
#pragma once

#include <cstdint>
#include <span>
#include <utility>
#include <vector>

namespace qm {

class ReadKeys {
 public:
  // keys: the key of every row, in the order the rows were read (a row's
  // position there is its read sequence).
  explicit ReadKeys(std::span<const int32_t> keys);

  // One per key, ascending by key: the key and the read sequence of its
  // last row.
  const std::vector<std::pair<int32_t, int32_t>>& Last() const { return last_; }
  std::size_t Count() const { return last_.size(); }
  bool Contains(int32_t key) const;

 private:
  std::vector<std::pair<int32_t, int32_t>> last_;
};

}  // namespace qm
