// CRowKey: what the sorted inserts and the row searches of a block order by,
// and what the word sort pairs: a value and, optionally, its item row.
#pragma once

#include "format/items_row.h"
#include "base/value.h"

namespace qm {

struct CRowKey {
  CValue Value;
  CItemsRow Row;  // no item row while it is not allocated

  // By value; with by_item and equal values, by the first item of the rows
  // (smaller first), a key without an item row comparing as equal. -1, 0, 1,
  // or kNotComparable when the values cannot be ordered.
  static int Compare(const CRowKey& left, const CRowKey& right, bool by_item) {
    const int c = left.Value.Compare(right.Value);
    if (c != 0 || !by_item || !left.Row.IsAllocated() || !right.Row.IsAllocated()) return c;
    const int32_t a = left.Row.Data()[0];
    const int32_t b = right.Row.Data()[0];
    return a < b ? -1 : (a > b ? 1 : 0);
  }
};

}  // namespace qm
