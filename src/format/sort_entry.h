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

#include "base/byte_layout.h"
#include "base/value.h"

namespace qm {

class MFile;

// The comparisons of encoded entries, one per value type, so a sort loop can
// be compiled for its type instead of switching on it per comparison.
namespace entry_compare {

template <class T>
inline int Order(T a, T b) {
  return a < b ? -1 : (a > b ? 1 : 0);
}

inline int Keys(const uint8_t* a, const uint8_t* b) {
  return Order(bytes::LoadI32(a), bytes::LoadI32(b));
}

// Eight bytes as one number in which the first byte weighs most.
inline uint64_t BigEndian64(const uint8_t* p) {
  uint64_t v = 0;
  for (int i = 0; i < 8; ++i) v = (v << 8) | p[i];
  return v;
}

// Each comparison also gives a prefix of an entry: a number that never
// orders two entries against their comparison (a <= b gives Prefix(a) <=
// Prefix(b)), so a sort can compare prefixes and look at the entries only
// when they are equal. WholeValue(prefix) tells that entries sharing that
// prefix have equal values, so their keys decide without the entries.

struct Narrow {
  std::size_t row_bytes;
  // The first seven bytes, zero-padded, then the length up to 8: a shorter
  // text that the padding matches comes first, as in the comparison, and an
  // equal prefix under 8 in its last byte holds the whole text.
  uint64_t Prefix(const uint8_t* e) const {
    const std::size_t n = bytes::LoadU16(e + row_bytes) & 0x7FFF;
    const uint8_t* p = e + row_bytes + 2;
    if (n >= 8) return (BigEndian64(p) & ~uint64_t{0xFF}) | 8;
    uint64_t v = 0;
    for (std::size_t i = 0; i < 7; ++i) v = (v << 8) | (i < n ? p[i] : 0);
    return (v << 8) | n;
  }
  // Whether entries with this same prefix have equal values.
  static bool WholeValue(uint64_t prefix) { return (prefix & 0xFF) < 8; }
  int operator()(const uint8_t* a, const uint8_t* b) const {
    const std::size_t na = bytes::LoadU16(a + row_bytes) & 0x7FFF;
    const std::size_t nb = bytes::LoadU16(b + row_bytes) & 0x7FFF;
    const uint8_t* pa = a + row_bytes + 2;
    const uint8_t* pb = b + row_bytes + 2;
    std::size_t n = na < nb ? na : nb;
    // Unsigned bytes in order: eight at a time, then one at a time.
    for (; n >= 8; n -= 8, pa += 8, pb += 8) {
      const uint64_t x = BigEndian64(pa);
      const uint64_t y = BigEndian64(pb);
      if (x != y) return x < y ? -1 : 1;
    }
    for (; n > 0; --n, ++pa, ++pb) {
      if (*pa != *pb) return *pa < *pb ? -1 : 1;
    }
    if (na != nb) return na < nb ? -1 : 1;
    return Keys(a, b);
  }
};

struct Wide {
  std::size_t row_bytes;
  // The first three units, zero-padded, then the length up to 4 (as for
  // narrow text).
  uint64_t Prefix(const uint8_t* e) const {
    const std::size_t n = bytes::LoadU16(e + row_bytes) & 0x7FFF;
    const uint8_t* p = e + row_bytes + 2;
    uint64_t v = 0;
    for (std::size_t i = 0; i < 3; ++i) v = (v << 16) | (i < n ? bytes::LoadU16(p + 2 * i) : 0);
    return (v << 16) | (n < 4 ? n : 4);
  }
  static bool WholeValue(uint64_t prefix) { return (prefix & 0xFFFF) < 4; }
  int operator()(const uint8_t* a, const uint8_t* b) const {
    const std::size_t na = bytes::LoadU16(a + row_bytes) & 0x7FFF;
    const std::size_t nb = bytes::LoadU16(b + row_bytes) & 0x7FFF;
    const uint8_t* pa = a + row_bytes + 2;
    const uint8_t* pb = b + row_bytes + 2;
    const std::size_t n = na < nb ? na : nb;
    for (std::size_t i = 0; i < n; ++i) {
      const uint16_t ua = bytes::LoadU16(pa + 2 * i);
      const uint16_t ub = bytes::LoadU16(pb + 2 * i);
      if (ua != ub) return ua < ub ? -1 : 1;
    }
    if (na != nb) return na < nb ? -1 : 1;
    return Keys(a, b);
  }
};

struct Integer {
  std::size_t row_bytes;
  // Value and key whole, each moved into unsigned order.
  uint64_t Prefix(const uint8_t* e) const {
    const uint32_t value = bytes::LoadU32(e + row_bytes) ^ 0x80000000u;
    const uint32_t key = bytes::LoadU32(e) ^ 0x80000000u;
    return (uint64_t{value} << 32) | key;
  }
  static bool WholeValue(uint64_t) { return true; }
  int operator()(const uint8_t* a, const uint8_t* b) const {
    const int c = Order(bytes::LoadI32(a + row_bytes), bytes::LoadI32(b + row_bytes));
    return c != 0 ? c : Keys(a, b);
  }
};

// NaN has no place among numbers; a sort needs a total order, so it goes
// after every number.
struct Double {
  std::size_t row_bytes;
  uint64_t Prefix(const uint8_t*) const { return 0; }
  static bool WholeValue(uint64_t) { return false; }
  int operator()(const uint8_t* a, const uint8_t* b) const {
    const double x = bytes::LoadDouble(a + row_bytes);
    const double y = bytes::LoadDouble(b + row_bytes);
    int c;
    if (x != x || y != y) {
      c = Order(x != x, y != y);
    } else {
      c = Order(x, y);
    }
    return c != 0 ? c : Keys(a, b);
  }
};

// Field by field: year (signed), month ... second, fraction.
struct Date {
  std::size_t row_bytes;
  uint64_t Prefix(const uint8_t*) const { return 0; }
  static bool WholeValue(uint64_t) { return false; }
  int operator()(const uint8_t* a, const uint8_t* b) const {
    const uint8_t* va = a + row_bytes;
    const uint8_t* vb = b + row_bytes;
    int c = Order(bytes::LoadI16(va), bytes::LoadI16(vb));
    for (std::size_t at = 2; c == 0 && at < 12; at += 2) {
      c = Order(bytes::LoadU16(va + at), bytes::LoadU16(vb + at));
    }
    if (c == 0) c = Order(bytes::LoadU32(va + 12), bytes::LoadU32(vb + 12));
    return c != 0 ? c : Keys(a, b);
  }
};

}  // namespace entry_compare

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

  // Calls f with the comparison of this layout's entries (an object of
  // entry_compare: <0, 0, >0 by value, then by key) and returns its result.
  template <class F>
  decltype(auto) WithComparison(F&& f) const {
    switch (type_) {
      case VALUE_TYPE::AsciiString: return f(entry_compare::Narrow{row_bytes_});
      case VALUE_TYPE::UnicodeString: return f(entry_compare::Wide{row_bytes_});
      case VALUE_TYPE::Double: return f(entry_compare::Double{row_bytes_});
      case VALUE_TYPE::DateTime: return f(entry_compare::Date{row_bytes_});
      case VALUE_TYPE::Integer: break;
    }
    return f(entry_compare::Integer{row_bytes_});
  }
  int Compare(const uint8_t* a, const uint8_t* b) const {
    return WithComparison([&](auto compare) { return compare(a, b); });
  }

  // Reads the next entry of file into buffer from offset at, making buffer
  // larger when it must (never smaller, so a buffer reused for many entries
  // stops growing). Returns the entry's size, or 0 at the end of the file.
  // A file that ends inside an entry raises the MFile error; so does a
  // negative text length.
  std::size_t Read(MFile& file, std::vector<uint8_t>& buffer, std::size_t at) const;

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
  std::size_t TextLength(const uint8_t* p) const { return bytes::LoadU16(p + row_bytes_) & 0x7FFF; }

  int32_t row_width_;
  VALUE_TYPE type_;
  std::size_t row_bytes_;
  std::size_t fixed_size_;
  std::size_t text_unit_;  // 1 or 2 for text, 0 otherwise
};

}  // namespace qm
