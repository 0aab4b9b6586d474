// CItemsRow: one item row (key, then the columns its column set names) of
// signed 32-bit integers. The row exists only after AllocateRow.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "format/column_set.h"

namespace qm {

// What a row column means: the key, the score, the position, or (for reads)
// the first option column.
enum class ItemKind : int32_t { Key = 0, Score = 1, Position = 2, Option = 3 };

// The column of a kind in rows of a set, or -1 when the set has none.
inline int32_t KindColumn(const CColumnSet& set, ItemKind kind) {
  switch (kind) {
    case ItemKind::Key:
      return 0;
    case ItemKind::Score:
      return set.s != 0 ? set.ScoreColumn() : -1;
    case ItemKind::Position:
      return set.p != 0 ? set.PositionColumn() : -1;
    case ItemKind::Option:
      return set.OptionCount() > 0 ? set.OptionColumn(0) : -1;
  }
  return -1;
}

class CItemsRow {
 public:
  CItemsRow() = default;
  explicit CItemsRow(const CColumnSet& set) { SetColumns(set); }

  // Takes a new column set; an allocated row is dropped.
  void SetColumns(const CColumnSet& set);
  const CColumnSet& Columns() const { return set_; }
  int32_t Width() const { return width_; }
  int32_t Size() const { return 4 * width_; }

  // Allocates the row (zeroed) once; error 11 when it cannot.
  void AllocateRow();
  bool IsAllocated() const { return allocated_; }

  // Key, score (requires s), position (requires p) or the first option
  // column; a missing column or an unallocated row raises a general error.
  int32_t Get(ItemKind kind) const;
  // Key, score or position; any other kind raises.
  void Set(ItemKind kind, int32_t value);
  // Option column i (0-based, below a + b); requires an allocated row.
  void SetOption(int32_t i, int32_t value);
  int32_t GetOption(int32_t i) const;

  // The row's integers (empty before AllocateRow).
  std::span<int32_t> Data() { return row_; }
  std::span<const int32_t> Data() const { return row_; }

 private:
  CColumnSet set_;
  int32_t width_ = 1;
  std::vector<int32_t> row_;
  bool allocated_ = false;
};

}  // namespace qm
