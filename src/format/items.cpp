#include "format/items.h"

#include <algorithm>
#include <bit>
#include <cstdio>
#include <cstring>
#include <new>

#include "base/error_numbers.h"
#include "base/byte_layout.h"
#include "base/checked_allocation.h"
#include "base/exception_family.h"
#include "format/mfile.h"

namespace qm {

namespace {

constexpr bool kLittleEndianHost = std::endian::native == std::endian::little;

// Insert and set report a failed allocation on standard output as well.
void ReportAllocationFailure() {
  std::fputs("Error allocating memory\n", stdout);
  std::fflush(stdout);
}

// --- the stored row encoding: signed 32-bit little-endian integers ---

// Turns ints that were filled with stored bytes into host integers.
void DecodeRowsInPlace(int32_t* ints, std::size_t n) {
  if constexpr (!kLittleEndianHost) {
    auto* raw = reinterpret_cast<uint8_t*>(ints);
    for (std::size_t i = 0; i < n; ++i) {
      uint8_t b[4];
      std::memcpy(b, raw + 4 * i, 4);
      ints[i] = bytes::LoadI32(b);
    }
  }
}

void WriteRows(MFile& file, const int32_t* ints, std::size_t n) {
  if (n == 0) return;
  if constexpr (kLittleEndianHost) {
    file.WriteVoid(ints, 4 * n);
  } else {
    std::vector<uint8_t> encoded(4 * n);
    for (std::size_t i = 0; i < n; ++i) bytes::StoreI32(encoded.data() + 4 * i, ints[i]);
    file.WriteVoid(encoded.data(), encoded.size());
  }
}

// --- the sort: ascending keys, the later row first among equal keys ---

constexpr std::size_t kInsertionRun = 16;

// W is the row width when it is known at compile time, else 0 (use w).
template <std::size_t W>
void SortRowsByKey(int32_t* data, int32_t* scratch, std::size_t n, std::size_t width) {
  const std::size_t w = W != 0 ? W : width;
  const std::size_t row_bytes = 4 * w;

  // Short runs by insertion: a row moves in front of every row whose key is
  // not smaller, so equal keys end in reverse order, as the merges below
  // would leave them.
  int32_t* hold = scratch;
  for (std::size_t start = 0; start < n; start += kInsertionRun) {
    const std::size_t end = std::min(start + kInsertionRun, n);
    for (std::size_t j = start + 1; j < end; ++j) {
      const int32_t key = data[j * w];
      if (data[(j - 1) * w] < key) continue;
      std::size_t i = j - 1;
      while (i > start && data[(i - 1) * w] >= key) --i;
      std::memcpy(hold, data + j * w, row_bytes);
      std::memmove(data + (i + 1) * w, data + i * w, (j - i) * row_bytes);
      std::memcpy(data + i * w, hold, row_bytes);
    }
  }

  int32_t* src = data;
  int32_t* dst = scratch;
  for (std::size_t run = kInsertionRun; run < n; run *= 2) {
    for (std::size_t lo = 0; lo < n; lo += 2 * run) {
      const std::size_t mid = std::min(lo + run, n);
      const std::size_t hi = std::min(lo + 2 * run, n);
      if (mid == hi || src[(mid - 1) * w] < src[mid * w]) {
        std::memcpy(dst + lo * w, src + lo * w, (hi - lo) * row_bytes);
        continue;
      }
      std::size_t l = lo, r = mid, o = lo;
      while (l < mid && r < hi) {
        // Equal keys: the row of the later run goes first.
        if (src[r * w] <= src[l * w]) {
          std::memcpy(dst + o * w, src + r * w, row_bytes);
          ++r;
        } else {
          std::memcpy(dst + o * w, src + l * w, row_bytes);
          ++l;
        }
        ++o;
      }
      if (l < mid) std::memcpy(dst + o * w, src + l * w, (mid - l) * row_bytes);
      if (r < hi) std::memcpy(dst + o * w, src + r * w, (hi - r) * row_bytes);
    }
    std::swap(src, dst);
  }
  if (src != data) std::memcpy(data, src, n * row_bytes);
}

// Copies a row of src_set into a row of dst_set (filled with kFiller first);
// the b option columns of the source go from b_offset on.
void MapRow(const int32_t* src, const CColumnSet& src_set, int32_t* dst,
            const CColumnSet& dst_set, int32_t b_offset) {
  std::fill(dst, dst + dst_set.Width(), CItems::kFiller);
  dst[0] = src[0];
  if (src_set.s != 0 && dst_set.s != 0) dst[dst_set.ScoreColumn()] = src[src_set.ScoreColumn()];
  if (src_set.p != 0 && dst_set.p != 0) {
    dst[dst_set.PositionColumn()] = src[src_set.PositionColumn()];
  }
  const int32_t shared_a = std::min(src_set.a, dst_set.a);
  for (int32_t i = 0; i < shared_a; ++i) dst[dst_set.OptionColumn(i)] = src[src_set.OptionColumn(i)];
  for (int32_t j = 0; j < src_set.b && b_offset + j < dst_set.b; ++j) {
    dst[dst_set.OptionColumn(dst_set.a + b_offset + j)] = src[src_set.OptionColumn(src_set.a + j)];
  }
}

}  // namespace

CItems::CItems(const CColumnSet& set) : set_(set), width_(set.Width()) {
  Reallocate(kDefaultGrowth, false);
}

CItems::CItems(int32_t width) {
  if (width < 1 || width > 0xFFFF) throw CFreeItemException::General("CItems::CItems");
  set_.a = static_cast<uint16_t>(width - 1);
  width_ = width;
  Reallocate(kDefaultGrowth, false);
}

bool CItems::Reallocate(int64_t rows, bool keep) {
  if (rows < 0 || rows > INT32_MAX) return false;
  const auto ints = static_cast<std::size_t>(rows) * static_cast<std::size_t>(width_);
  try {
    CheckAllocationSize(ints * sizeof(int32_t));
    if (keep) {
      data_.resize(ints, 0);
    } else {
      std::vector<int32_t>().swap(data_);
      data_.assign(ints, 0);
    }
  } catch (const std::bad_alloc&) {
    if (!keep) capacity_ = count_ = 0;
    return false;
  }
  capacity_ = static_cast<int32_t>(rows);
  if (count_ > capacity_) count_ = capacity_;
  return true;
}

void CItems::AllocateMemory(int32_t n) {
  if (n <= capacity_) return;
  count_ = 0;
  const int64_t rows = int64_t{growth_} + n;
  if (!Reallocate(rows, false)) {
    throw CFreeItemException::Text("Out of memory. Trying to allocate %i bytes",
                                   "CItems::AllocateMemory", nullptr, rows * RowSize());
  }
}

void CItems::AllocateMemoryForce(int32_t n) {
  count_ = 0;
  const int64_t rows = int64_t{growth_} + std::max(n, 0);
  if (!Reallocate(rows, false)) {
    throw CFreeItemException::Text("Out of memory. Trying to allocate %i bytes",
                                   "CItems::AllocateMemoryForce", nullptr, rows * RowSize());
  }
}

void CItems::AllocateMemoryPreserve(int32_t n) {
  if (capacity_ == 0) {
    AllocateMemory(n);
    return;
  }
  if (n <= capacity_) return;
  const int64_t rows = int64_t{growth_} + n;
  if (!Reallocate(rows, true)) {
    throw CFreeItemException::Text("Out of memory. Trying to reallocate %i bytes",
                                   "CItems::AllocateMemoryPreserve", nullptr, rows * RowSize());
  }
}

void CItems::ReleaseMemory() {
  count_ = 0;
  growth_ = kDefaultGrowth;
  if (!Reallocate(kDefaultGrowth, false)) {
    throw CFreeItemException::Text("Out of memory. Trying to allocate %i bytes",
                                   "CItems::ReleaseMemory", nullptr,
                                   int64_t{kDefaultGrowth} * RowSize());
  }
}

void CItems::Truncate(int32_t count) {
  if (count < 0 || count > count_) throw CFreeItemException::General("CItems::Truncate");
  count_ = count;
}

bool CItems::GrowFor(int32_t index) {
  if (index < capacity_) return true;
  if (capacity_ == 0 && !Reallocate(kDefaultGrowth, false)) return false;
  if (index < capacity_) return true;
  int64_t rows = int64_t{capacity_} + growth_;
  if (rows <= index) rows = int64_t{index} + 1;
  return Reallocate(rows, true);
}

void CItems::RaiseCountTo(int32_t count) {
  if (count <= count_) return;
  // Rows between the old count and the new last row may hold old contents.
  std::fill(data_.begin() + static_cast<std::ptrdiff_t>(count_) * width_,
            data_.begin() + static_cast<std::ptrdiff_t>(count) * width_, 0);
  count_ = count;
}

void CItems::InsertItem(std::span<const int32_t> row) {
  if (row.size() != static_cast<std::size_t>(width_)) {
    throw CFreeItemException::General("CItems::InsertItem");
  }
  if (count_ == capacity_ && !GrowFor(count_)) {
    ReportAllocationFailure();
    throw CFreeItemException::Numbered(kErrOutOfMemory, "CItems::InsertItem", nullptr);
  }
  std::memcpy(Row(count_), row.data(), static_cast<std::size_t>(RowSize()));
  ++count_;
}

void CItems::SetItem(int32_t index, std::span<const int32_t> row) {
  if (index < 0 || row.size() != static_cast<std::size_t>(width_)) {
    throw CFreeItemException::General("CItems::SetItem");
  }
  if (!GrowFor(index)) {
    ReportAllocationFailure();
    throw CFreeItemException::Numbered(kErrOutOfMemory, "CItems::SetItem", nullptr);
  }
  RaiseCountTo(index + 1);
  std::memcpy(Row(index), row.data(), static_cast<std::size_t>(RowSize()));
}

void CItems::SetItemOption(int32_t index, ItemKind kind, int32_t value) {
  const int32_t column = kind == ItemKind::Option ? -1 : KindColumn(set_, kind);
  if (index < 0 || column < 0) throw CFreeItemException::General("CItems::SetItemOption");
  if (!GrowFor(index)) {
    ReportAllocationFailure();
    const int64_t rows = std::max<int64_t>(int64_t{capacity_} + growth_, int64_t{index} + 1);
    throw CFreeItemException::Text("Out of memory. Trying to reallocate %i bytes",
                                   "CItems::SetItemOption", nullptr, rows * RowSize());
  }
  RaiseCountTo(index + 1);
  Row(index)[column] = value;
}

void CItems::CheckIndex(int32_t index, const char* method) const {
  if (index < 0 || index >= count_) throw CFreeItemException::General(method);
}

int32_t CItems::GetItem(int32_t index, int32_t column) const {
  CheckIndex(index, "CItems::GetItem");
  if (column < 0 || column >= width_) throw CFreeItemException::General("CItems::GetItem");
  return Row(index)[column];
}

int32_t CItems::GetItem(int32_t index, ItemKind kind) const {
  CheckIndex(index, "CItems::GetItem");
  const int32_t column = KindColumn(set_, kind);
  if (column < 0) throw CFreeItemException::General("CItems::GetItem");
  return Row(index)[column];
}

int32_t CItems::GetItemOption(int32_t index, int32_t i) const {
  CheckIndex(index, "CItems::GetItemOption");
  if (i < 0 || i >= set_.OptionCount()) throw CFreeItemException::General("CItems::GetItemOption");
  return Row(index)[set_.OptionColumn(i)];
}

int32_t* CItems::RowAddress(int32_t index) {
  return index >= 0 && index < count_ ? Row(index) : nullptr;
}

const int32_t* CItems::RowAddress(int32_t index) const {
  return index >= 0 && index < count_ ? Row(index) : nullptr;
}

int CItems::CompareRow(int32_t index, const int32_t* key_row, std::span<const SortColumn> sort_columns,
                       bool compare_key, bool key_descending) const {
  CheckIndex(index, "CItems::CompareRow");
  const int32_t* row = Row(index);
  for (const SortColumn& c : sort_columns) {
    if (c.column < 0 || c.column >= width_) throw CFreeItemException::General("CItems::CompareRow");
    const int32_t a = row[c.column];
    const int32_t b = key_row[c.column];
    if (a != b) return (a < b) != c.descending ? -1 : 1;
  }
  if (compare_key && row[0] != key_row[0]) return (row[0] < key_row[0]) != key_descending ? -1 : 1;
  return 0;
}

int32_t CItems::FirstDifference(int32_t index, const int32_t* key_row,
                                std::span<const SortColumn> sort_columns) const {
  CheckIndex(index, "CItems::FirstDifference");
  const int32_t* row = Row(index);
  for (std::size_t i = 0; i < sort_columns.size(); ++i) {
    const int32_t column = sort_columns[i].column;
    if (column < 0 || column >= width_) {
      throw CFreeItemException::General("CItems::FirstDifference");
    }
    if (row[column] != key_row[column]) return static_cast<int32_t>(i);
  }
  return -1;
}

void CItems::SortByKey() {
  if (count_ < 2) return;
  const auto n = static_cast<std::size_t>(count_);
  const auto w = static_cast<std::size_t>(width_);
  std::vector<int32_t> scratch;
  try {
    ReserveChecked(scratch, n * w);
    scratch.resize(n * w);
  } catch (const std::bad_alloc&) {
    throw CFreeItemException::Numbered(kErrOutOfMemory, "CItems::SortByKey", nullptr);
  }
  switch (w) {
    case 1: SortRowsByKey<1>(data_.data(), scratch.data(), n, w); break;
    case 2: SortRowsByKey<2>(data_.data(), scratch.data(), n, w); break;
    case 3: SortRowsByKey<3>(data_.data(), scratch.data(), n, w); break;
    case 4: SortRowsByKey<4>(data_.data(), scratch.data(), n, w); break;
    default: SortRowsByKey<0>(data_.data(), scratch.data(), n, w); break;
  }
}

void CItems::Write(MFile& file) const {
  file.WriteInt(count_);
  WriteRows(file, data_.data(), static_cast<std::size_t>(count_) * width_);
}

void CItems::ReadStored(MFile& file, bool replace, const char* method) {
  file.Seek(0);
  const int32_t n = file.ReadInt();
  const int64_t file_size = file.FileSize(false);
  // A damaged count must not make us allocate or read beyond the file.
  if (n < 0 || 4 + int64_t{n} * RowSize() > file_size) {
    throw CFreeItemException::Text("Damaged item array %s: %i rows of %i bytes do not fit %i bytes",
                                   method, nullptr, file.Path(), n, RowSize(), file_size);
  }
  const int32_t keep = replace ? 0 : count_;
  const int64_t needed = int64_t{keep} + n + 1;
  if (replace) count_ = 0;
  if (needed > capacity_ && !Reallocate(needed, !replace)) {
    throw CFreeItemException::Text("Out of memory. Trying to allocate %i bytes", method, nullptr,
                                   needed * RowSize());
  }
  int32_t* first = Row(count_);
  const std::size_t ints = static_cast<std::size_t>(n) * width_;
  if (ints != 0) file.ReadData(first, 4 * ints);
  DecodeRowsInPlace(first, ints);
  count_ += n;
}

void CItems::Read(MFile& file) { ReadStored(file, true, "CItems::read"); }

void CItems::Load(const std::string& path, bool replace) {
  MFile file;
  file.OpenFile(path, MFile::kReadOnly);
  ReadStored(file, replace, "CItems::Load");
  file.Close();
}

uint8_t* CItems::ReserveStoredRows(int32_t rows) {
  if (rows < 0) throw CFreeItemException::General("CItems::AppendStoredRows");
  const int64_t needed = int64_t{count_} + rows;
  if (needed > capacity_ && !Reallocate(needed + growth_, true)) {
    throw CFreeItemException::Text("Out of memory. Trying to reallocate %i bytes",
                                   "CItems::AppendStoredRows", nullptr,
                                   (needed + growth_) * RowSize());
  }
  return reinterpret_cast<uint8_t*>(data_.data() + static_cast<std::size_t>(count_) * width_);
}

int32_t CItems::TakeStoredRows(int32_t rows, std::size_t filled) {
  const auto taken = static_cast<int32_t>(
      std::min<std::size_t>(filled / static_cast<std::size_t>(RowSize()), static_cast<std::size_t>(rows)));
  DecodeRowsInPlace(Row(count_), static_cast<std::size_t>(taken) * width_);
  count_ += taken;
  return taken;
}

void CItems::AppendEncodedRows(std::span<const uint8_t> encoded) {
  const auto row_size = static_cast<std::size_t>(RowSize());
  if (encoded.size() % row_size != 0 || encoded.size() / row_size > INT32_MAX) {
    throw CFreeItemException::General("CItems::AppendEncodedRows");
  }
  AppendStoredRows(static_cast<int32_t>(encoded.size() / row_size), [&](uint8_t* target, std::size_t n) {
    if (n != 0) std::memcpy(target, encoded.data(), n);
    return n;
  });
}

CItems CItems::Widen(const CColumnSet& other) const {
  CColumnSet merged = set_;
  merged.Merge(other);
  CItems result(merged);
  result.growth_ = growth_;
  result.AllocateMemoryForce(count_);
  for (int32_t i = 0; i < count_; ++i) MapRow(Row(i), set_, result.Row(i), merged, 0);
  result.count_ = count_;
  return result;
}

CItems CItems::Merge(const CItems& other) const {
  CColumnSet merged = set_;
  merged.Merge(other.set_);
  CItems result(merged);
  // The result grows in steps of a tenth of the larger input; the capacity
  // is what those steps reach for all rows.
  const int32_t step = std::max<int32_t>(1, std::max(count_, other.count_) / 10);
  const int64_t total = int64_t{count_} + other.count_;
  const int64_t capacity = std::max<int64_t>(1, (total + step - 1) / step) * step;
  result.growth_ = step;
  if (!result.Reallocate(capacity, false)) {
    throw CFreeItemException::Text("Out of memory. Trying to allocate %i bytes", "CItems::Merge",
                                   nullptr, capacity * result.RowSize());
  }
  int32_t i = 0, j = 0, o = 0;
  while (i < count_ || j < other.count_) {
    const bool take_this = j >= other.count_ || (i < count_ && Key(i) <= other.Key(j));
    if (take_this) {
      MapRow(Row(i++), set_, result.Row(o++), merged, 0);
    } else {
      MapRow(other.Row(j++), other.set_, result.Row(o++), merged, set_.b);
    }
  }
  result.count_ = o;
  return result;
}

void CItems::FillGaps() {
  for (int32_t i = count_ - 2; i >= 0; --i) {
    int32_t* row = Row(i);
    int32_t* next = Row(i + 1);
    for (int32_t c = 0; c < width_; ++c) {
      if (row[c] == 0) {
        row[c] = next[c];
        next[c] = 0;
      }
    }
  }
}

}  // namespace qm
