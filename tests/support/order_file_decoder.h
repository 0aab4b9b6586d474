// Test-side reading of order files, written from their byte layout alone:
// the header fields at the start of block 0 of NAME.sri, the rows of
// NAME.srt and the entries of NAME_COLUMN.col. Little-endian throughout. A
// read past the end, or a length or count beyond the bytes left, throws
// DecodeError: nothing after it would mean anything.
#pragma once

#include <gtest/gtest.h>

#include <bit>
#include <cstdint>
#include <cstdio>
#include <stdexcept>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "support/test_support.h"

namespace qm::test {

class DecodeError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class LeReader {
 public:
  // The bytes of the file at path, read from at.
  explicit LeReader(const std::string& path, std::size_t at = 0)
      : bytes_(ReadFile(path)), path_(path), at_(at) {}

  uint64_t Unsigned(std::size_t n) {
    Require(n);
    uint64_t v = 0;
    for (std::size_t i = n; i-- > 0;) v = (v << 8) | static_cast<unsigned char>(bytes_[at_ + i]);
    at_ += n;
    return v;
  }
  int32_t I32() { return static_cast<int32_t>(static_cast<uint32_t>(Unsigned(4))); }
  // A count of items of item_size bytes that must all follow.
  int32_t Count(std::size_t item_size) {
    const int32_t n = I32();
    if (n < 0) throw DecodeError(path_ + ": negative count " + std::to_string(n));
    Require(item_size * static_cast<std::size_t>(n));
    return n;
  }
  std::string Narrow() {
    const std::size_t n = Unsigned(2);
    Require(n);
    at_ += n;
    return bytes_.substr(at_ - n, n);
  }
  // As UTF-8.
  std::string Wide() {
    const std::size_t n = Unsigned(2);
    std::u16string s;
    for (std::size_t i = 0; i < n; ++i) s.push_back(static_cast<char16_t>(Unsigned(2)));
    return Utf16ToUtf8(s);
  }
  bool AtEnd() const { return at_ >= bytes_.size(); }
  std::size_t Size() const { return bytes_.size(); }

 private:
  void Require(std::size_t n) const {
    if (n > bytes_.size() - at_) {
      throw DecodeError(path_ + ": " + std::to_string(n) + " bytes past the end at " +
                        std::to_string(at_) + " of " + std::to_string(bytes_.size()));
    }
  }

  std::string bytes_;
  std::string path_;
  std::size_t at_;
};

struct HeaderColumn {
  std::string name;
  int32_t type = 0;   // value type code
  int32_t first = 0;  // row column of its first slot
  int32_t slots = 0;
};

// The fields the tests compare; the others are read past.
struct OrderHeader {
  int32_t version = 0;
  int32_t type = 0;
  std::string name;
  std::vector<HeaderColumn> columns;
  int32_t count = 0;
  int32_t sort_max = 0;
};

// Block 0: used count (4 bytes), 2 bytes 0, then the fields.
inline OrderHeader DecodeOrderHeader(const std::string& path) {
  LeReader r(path, 6);
  EXPECT_EQ(r.Size(), 4096u) << path;
  OrderHeader h;
  h.version = r.I32();
  EXPECT_EQ(r.Narrow(), "6.14") << path;
  h.type = r.I32();
  h.name = r.Narrow();
  r.Narrow();  // table
  r.I32();     // SQL used as table
  r.Narrow();  // SQL
  for (int32_t i = 0, n = r.Count(0); i < n; ++i) {
    HeaderColumn c;
    c.name = r.Narrow();
    c.type = r.I32();
    c.first = r.I32();
    c.slots = r.I32();
    h.columns.push_back(c);
  }
  r.Narrow();  // key column
  h.count = r.I32();
  h.sort_max = r.I32();
  return h;
}

// The count, then count rows of width integers; the file holds nothing else.
inline std::vector<std::vector<int32_t>> DecodeOrderRows(const std::string& path, int width) {
  LeReader r(path);
  const int32_t count = r.Count(4 * static_cast<std::size_t>(width));
  if (r.Size() != 4u + 4u * static_cast<std::size_t>(width) * count) {
    throw DecodeError(path + ": " + std::to_string(r.Size()) + " bytes do not hold " +
                      std::to_string(count) + " rows of " + std::to_string(width));
  }
  std::vector<std::vector<int32_t>> rows(static_cast<std::size_t>(count));
  for (auto& row : rows) {
    for (int i = 0; i < width; ++i) row.push_back(r.I32());
  }
  return rows;
}

struct ColumnEntry {
  std::string value;  // text as UTF-8, numbers in decimal, dates "Y-M-D h:m:s"
  std::vector<int32_t> keys;
  bool operator==(const ColumnEntry&) const = default;
};

inline std::ostream& operator<<(std::ostream& out, const ColumnEntry& e) {
  out << "{" << e.value << ":";
  for (int32_t k : e.keys) out << " " << k;
  return out << "}";
}

// Entries: the value in the encoding of type, the key count, the keys.
inline std::vector<ColumnEntry> DecodeColumnFile(const std::string& path, int32_t type) {
  LeReader r(path);
  std::vector<ColumnEntry> entries;
  while (!r.AtEnd()) {
    ColumnEntry e;
    switch (type) {
      case 2: e.value = r.Narrow(); break;
      case 4: e.value = r.Wide(); break;
      case 1: e.value = std::to_string(r.I32()); break;
      case 6: {
        char text[64];
        std::snprintf(text, sizeof text, "%g", std::bit_cast<double>(r.Unsigned(8)));
        e.value = text;
        break;
      }
      case 3: {
        e.value = std::to_string(static_cast<int16_t>(r.Unsigned(2)));
        for (const char* sep : {"-", "-", " ", ":", ":"}) e.value += sep + std::to_string(r.Unsigned(2));
        r.Unsigned(4);  // fraction
        break;
      }
      default: throw DecodeError(path + ": no value type " + std::to_string(type));
    }
    for (int32_t i = 0, n = r.Count(4); i < n; ++i) e.keys.push_back(r.I32());
    entries.push_back(std::move(e));
  }
  return entries;
}

}  // namespace qm::test
