// The column file of a type 2 order (NAME_COLUMN.col): one entry per
// distinct value of the column, in value order. An entry is the value in the
// MFile value encoding of the column's type (text: 16-bit length in units,
// then UTF-8 bytes or UTF-16LE units; integer 4 bytes; double 8; date/time
// 16), then the number of keys that have it (32-bit), then those keys
// (32-bit each, ascending). All integers little-endian. The rank of a value
// is its entry's position in the file, from 0.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "base/value.h"

namespace qm {

class MFile;

class OrderColumnReader {
 public:
  // Reads file from its start. REQUIRES: file outlives this reader.
  OrderColumnReader(MFile& file, VALUE_TYPE type);

  // The next entry: its value's encoded bytes and its keys. False at the
  // end of the file. A file that ends inside an entry, a negative length or
  // count, or keys that do not ascend raise "Order column file is damaged: %s".
  bool Next(std::vector<uint8_t>& value, std::vector<int32_t>& keys);

 private:
  [[noreturn]] void Damaged() const;

  MFile& file_;
  VALUE_TYPE type_;
  int64_t remaining_;
  std::vector<uint8_t> buffer_;
};

class OrderColumnWriter {
 public:
  // Writes to file from its current position. REQUIRES: file outlives this.
  explicit OrderColumnWriter(MFile& file) : file_(file) {}

  // value: the encoded bytes of a value; keys ascending.
  void Write(std::span<const uint8_t> value, std::span<const int32_t> keys);
  int64_t Entries() const { return entries_; }

 private:
  MFile& file_;
  std::vector<uint8_t> buffer_;
  int64_t entries_ = 0;
};

}  // namespace qm
