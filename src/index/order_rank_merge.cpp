#include "index/order_rank_merge.h"

#include <algorithm>
#include <cstring>

#include "format/order_column_file.h"
#include "index/order_read_keys.h"
#include "format/sort_stream.h"
#include "base/exception_family.h"
#include "format/items.h"

namespace qm {

namespace {

// A value to compare, as an entry of a one-column layout whose key is 0, so
// the layout's comparison orders by value alone.
class Probe {
 public:
  static constexpr std::size_t kRowBytes = 4;

  void Set(const uint8_t* value, std::size_t n) {
    bytes_.resize(kRowBytes + n);
    std::memset(bytes_.data(), 0, kRowBytes);
    if (n > 0) std::memcpy(bytes_.data() + kRowBytes, value, n);
  }
  const uint8_t* Entry() const { return bytes_.data(); }
  const uint8_t* Value() const { return bytes_.data() + kRowBytes; }
  std::size_t ValueSize() const { return bytes_.size() - kRowBytes; }

 private:
  std::vector<uint8_t> bytes_;
};

}  // namespace

int64_t OrderRankMerge::Run(MFile& sorted, OrderColumnReader* old, OrderColumnWriter& out) const {
  const SortEntryLayout probes(1, layout.Type());
  const std::size_t row_bytes = 4 * static_cast<std::size_t>(layout.RowWidth());
  auto compare = [&](const Probe& a, const Probe& b) {
    return probes.Compare(a.Entry(), b.Entry());
  };

  // The new side: entries of the rows that count.
  SortFileReader reader(layout);
  reader.Start(sorted);
  Probe new_value;
  int32_t new_key = 0;
  int32_t new_row = 0;
  auto next_new = [&] {
    std::size_t size = 0;
    while (const uint8_t* entry = reader.Next(size)) {
      const auto sequence = static_cast<std::size_t>(SortEntryLayout::RowItem(entry, 1));
      if (sequence >= row_of_sequence.size()) throw CPiOrderSortException::General("MergeColumn");
      new_row = row_of_sequence[sequence];
      if (new_row < 0) continue;
      new_key = SortEntryLayout::RowItem(entry, 0);
      new_value.Set(entry + row_bytes, size - row_bytes);
      return true;
    }
    return false;
  };

  // The old side: the column file's (value, key) pairs whose rows stay.
  Probe old_value;
  std::vector<uint8_t> old_bytes;
  std::vector<int32_t> old_keys;
  std::size_t old_at = 0;
  int32_t old_key = 0;
  auto next_old = [&] {
    if (old == nullptr) return false;
    for (;;) {
      while (old_at < old_keys.size()) {
        const int32_t key = old_keys[old_at++];
        if (read.Contains(key)) continue;
        old_key = key;
        return true;
      }
      if (!old->Next(old_bytes, old_keys)) return false;
      old_value.Set(old_bytes.data(), old_bytes.size());
      old_at = 0;
    }
  };

  Probe group_value;
  std::vector<int32_t> group_keys;
  int32_t rank = -1;
  int64_t written = 0;
  auto flush = [&] {
    if (group_keys.empty()) return;
    out.Write({group_value.Value(), group_value.ValueSize()}, group_keys);
    ++written;
    group_keys.clear();
  };
  auto add = [&](const Probe& value, int32_t key, int32_t row) {
    if (group_keys.empty() || compare(group_value, value) != 0) {
      flush();
      group_value.Set(value.Value(), value.ValueSize());
      ++rank;
    }
    group_keys.push_back(key);
    rows.Row(row)[row_column] = rank;
  };
  // The row of a key of the old column file.
  auto old_row = [&](int32_t key) {
    const auto at = std::lower_bound(keys.begin(), keys.end(), key);
    if (at == keys.end() || *at != key) throw CPiOrderSortException::General("MergeColumn");
    return static_cast<int32_t>(at - keys.begin());
  };

  bool has_new = next_new();
  bool has_old = next_old();
  while (has_new || has_old) {
    bool take_old = has_old;
    if (has_new && has_old) {
      // The two sides share no key: the old side's keys that were read again
      // were dropped above.
      const int c = compare(old_value, new_value);
      take_old = c < 0 || (c == 0 && old_key < new_key);
    }
    if (take_old) {
      add(old_value, old_key, old_row(old_key));
      has_old = next_old();
    } else {
      add(new_value, new_key, new_row);
      has_new = next_new();
    }
  }
  flush();
  return written;
}

}  // namespace qm
