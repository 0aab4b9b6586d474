// CItems: a growable array of item rows (signed 32-bit integers, all of one
// width), stored contiguously row after row: the posting lists of index
// building and the key lists of searches.
//
// Capacities count rows. The first allocation is 2,000 rows; an insert into a
// full array grows it by the growth step keeping the rows; the explicit
// allocators always allocate growth + n rows.
//
// Stored form (posting files, sort runs, order rows): the count as a 32-bit
// little-endian integer, then count rows of 4 x width bytes each.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "format/column_set.h"
#include "format/items_row.h"

namespace qm {

class MFile;

// One sort key of CompareRow: a row column and whether it sorts descending.
struct SortColumn {
  int32_t column = 0;
  bool descending = false;
};

class CItems {
 public:
  static constexpr int32_t kDefaultGrowth = 2000;
  // What a merged or widened row holds in a column its source lacks.
  static constexpr int32_t kFiller = 2147483647;

  // 2,000 rows of the set's width; when they cannot be had, capacity 0 and
  // the first use allocates.
  explicit CItems(const CColumnSet& set = CColumnSet{});
  // Rows of a bare width: the key and width - 1 option columns.
  explicit CItems(int32_t width);

  const CColumnSet& Columns() const { return set_; }
  int32_t Width() const { return width_; }
  int32_t RowSize() const { return 4 * width_; }
  int32_t Count() const { return count_; }
  int32_t Capacity() const { return capacity_; }
  int32_t Growth() const { return growth_; }
  void SetGrowth(int32_t rows) { growth_ = rows > 0 ? rows : 1; }

  // --- allocation ---
  // n above the capacity: the contents go and growth + n rows are allocated.
  void AllocateMemory(int32_t n);
  // Always drops the contents and allocates growth + n rows.
  void AllocateMemoryForce(int32_t n);
  // n above the capacity: growth + n rows, keeping the rows.
  void AllocateMemoryPreserve(int32_t n);
  // Drops the contents; growth and capacity back to 2,000.
  void ReleaseMemory();
  // Count 0; the memory stays.
  void Clear() { count_ = 0; }
  // Drops the rows from count on (count not above Count()).
  void Truncate(int32_t count);

  // --- rows ---
  // Appends a row of Width() integers.
  void InsertItem(std::span<const int32_t> row);
  void InsertItem(const CItemsRow& row) { InsertItem(row.Data()); }
  // Copies the row to index, growing to at least index + 1 rows (rows
  // between the old count and index are zero); the count rises to index + 1.
  void SetItem(int32_t index, std::span<const int32_t> row);
  // Sets the key, score or position of the row at index, growing and raising
  // the count as SetItem does.
  void SetItemOption(int32_t index, ItemKind kind, int32_t value);

  int32_t GetItem(int32_t index, int32_t column) const;
  int32_t GetItem(int32_t index, ItemKind kind) const;
  // Option column i (0-based) of the row at index.
  int32_t GetItemOption(int32_t index, int32_t i) const;
  // The row, or nullptr when index is not below the count.
  int32_t* RowAddress(int32_t index);
  const int32_t* RowAddress(int32_t index) const;
  // Unchecked access for loops that already know their bounds.
  // REQUIRES: 0 <= index < Count().
  int32_t* Row(int32_t index) { return data_.data() + static_cast<std::size_t>(index) * width_; }
  const int32_t* Row(int32_t index) const {
    return data_.data() + static_cast<std::size_t>(index) * width_;
  }
  int32_t Key(int32_t index) const { return Row(index)[0]; }

  // --- comparisons ---
  // The row at index against key_row by the sort columns in order (signed,
  // reversed for a descending column); when all agree and compare_key is set,
  // column 0 decides under key_descending. -1, 0 or 1.
  int CompareRow(int32_t index, const int32_t* key_row, std::span<const SortColumn> sort_columns,
                 bool compare_key, bool key_descending) const;
  // The number of the first sort column whose values differ, or -1.
  int32_t FirstDifference(int32_t index, const int32_t* key_row,
                          std::span<const SortColumn> sort_columns) const;

  // Ascending by key, signed. Rows with equal keys end in the reverse of
  // their order before the sort: a bottom-up merge that takes the later
  // run's row first on equal keys.
  void SortByKey();

  // --- stored form ---
  void Write(MFile& file) const;
  // Reads the stored form from the start of the file, replacing the contents.
  void Read(MFile& file);
  // Reads the stored form of a file: replace, or append to the rows.
  void Load(const std::string& path, bool replace);
  // Appends whole rows given in the stored row encoding.
  void AppendEncodedRows(std::span<const uint8_t> encoded);
  // Appends up to rows stored rows read straight into the array (one read of
  // a posting range, no copy): read(bytes, n) fills up to n bytes and returns
  // how many it filled; the whole rows among them are kept. Returns their number.
  template <class Read>
  int32_t AppendStoredRows(int32_t rows, Read&& read) {
    uint8_t* target = ReserveStoredRows(rows);
    return TakeStoredRows(rows, read(target, static_cast<std::size_t>(rows) * RowSize()));
  }

  // --- derived arrays ---
  // A copy whose rows take this set merged with other (missing columns hold
  // kFiller).
  CItems Widen(const CColumnSet& other) const;
  // The rows of both over the merged set, in ascending key order (this
  // array's row first on equal keys). REQUIRES: both sorted by key.
  CItems Merge(const CItems& other) const;
  // From the second-last row back to the first: a zero column takes the value
  // of the same column in the next row, which becomes zero.
  void FillGaps();

 private:
  // Reallocates to rows (zeroing new rows), keeping the first keep rows.
  // False when the memory cannot be had.
  bool Reallocate(int64_t rows, bool keep);
  // Makes room for index + 1 rows under the insert growth rule.
  bool GrowFor(int32_t index);
  void RaiseCountTo(int32_t count);
  void ReadStored(MFile& file, bool replace, const char* method);
  // Room for rows more rows; their bytes. TakeStoredRows decodes the whole
  // rows among the bytes filled and counts them.
  uint8_t* ReserveStoredRows(int32_t rows);
  int32_t TakeStoredRows(int32_t rows, std::size_t filled);
  void CheckIndex(int32_t index, const char* method) const;

  CColumnSet set_;
  int32_t width_ = 1;
  std::vector<int32_t> data_;  // capacity_ x width_ integers
  int32_t growth_ = kDefaultGrowth;
  int32_t capacity_ = 0;
  int32_t count_ = 0;
};

}  // namespace qm
