// The merge step of a type 2 order build, for one column: the column's new
// entries, sorted by value and key, merged with the column file of the order
// being updated into the new column file (each distinct value once, with its
// keys ascending), and the rank of every key's value put into its row.
#pragma once

#include <cstdint>
#include <vector>

#include "format/sort_entry.h"

namespace qm {

class CItems;
class MFile;
class OrderColumnReader;
class OrderColumnWriter;
class ReadKeys;

struct OrderRankMerge {
  // Entries of the sorted file: row (key, read sequence), then the value.
  const SortEntryLayout& layout;
  // The keys this build read: the old column file's keys among them are
  // dropped (their rows were replaced).
  const ReadKeys& read;
  // Every key of the new order, ascending; rows holds one row per key in
  // that order, and the ranks go to its column row_column.
  const std::vector<int32_t>& keys;
  // Per read sequence, the row of its key, or -1 when a later row read for
  // the same key counts instead.
  const std::vector<int32_t>& row_of_sequence;
  CItems& rows;
  int32_t row_column;

  // old may be null (no earlier build). Returns the distinct values written.
  int64_t Run(MFile& sorted, OrderColumnReader* old, OrderColumnWriter& out) const;
};

}  // namespace qm
