// Sort entries: an item row of little-endian 32-bit integers (the key first)
// followed by one value of the entry file's type, in the MFile encoding (text:
// 16-bit length in units, then UTF-8 bytes or UTF-16LE units; integer 4 bytes;
// double 8; date/time 16). The raw, run and sorted files of the word sort and
// the order sort are sequences of them, with no type tag.
//
// Entries are compared in their encoded form, without decoding or allocating:
// by value as CValue::Compare orders them (text by byte or code unit, numbers
// numerically, dates field by field), then by key.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

#include "shared/value.h"

namespace qm {

class MFile;

class SortEntryLayout {
 public:
  // REQUIRES: row_width >= 1; type a VALUE_TYPE of the engine.
  SortEntryLayout(int32_t row_width, VALUE_TYPE type);

  int32_t RowWidth() const { return row_width_; }
  VALUE_TYPE Type() const { return type_; }
  bool IsText() const { return text_unit_ != 0; }
  // Bytes of an entry before any text units: the row, then the value or,
  // for text, its length.
  std::size_t FixedSize() const { return fixed_size_; }
  // The whole size of the entry at p.
  std::size_t SizeOf(const uint8_t* p) const {
    return text_unit_ == 0 ? fixed_size_ : fixed_size_ + TextLength(p) * text_unit_;
  }
  // The largest text length the length field holds.
  static constexpr std::size_t kMaxTextLength = 32767;

  // <0, 0, >0: by value, then by key.
  int Compare(const uint8_t* a, const uint8_t* b) const;

  // Appends the next entry of file to out; false at the end of the file
  // (nothing appended). A file that ends inside an entry raises the MFile
  // error; so does a negative text length.
  bool Read(MFile& file, std::vector<uint8_t>& out) const;

  // --- encoding: one entry is the row, then exactly one value ---
  static void AppendRow(std::vector<uint8_t>& out, std::span<const int32_t> row);
  // Narrow entries take UTF-8, wide ones UTF-16LE; the other form is
  // converted. Text longer than kMaxTextLength units raises an MFile error.
  void AppendText(std::vector<uint8_t>& out, std::u16string_view text) const;
  void AppendText(std::vector<uint8_t>& out, std::string_view utf8) const;
  static void AppendInteger(std::vector<uint8_t>& out, int32_t value);
  static void AppendDouble(std::vector<uint8_t>& out, double value);
  static void AppendDate(std::vector<uint8_t>& out, const DateTimeValue& value);

  // --- decoding, for readers of sorted files and tests ---
  static int32_t RowItem(const uint8_t* p, int32_t i);
  // The value of the entry at p into value (its type set to the layout's).
  void DecodeValue(const uint8_t* p, CValue& value) const;

 private:
  std::size_t TextLength(const uint8_t* p) const;
  int CompareValues(const uint8_t* a, const uint8_t* b) const;

  int32_t row_width_;
  VALUE_TYPE type_;
  std::size_t row_bytes_;
  std::size_t fixed_size_;
  std::size_t text_unit_;  // 1 or 2 for text, 0 otherwise
};

}  // namespace qm
