// BlockValue: a value as it stands inside a block, read without copying, so the
// row searches can compare row after row without touching the heap.
//
// Valid only while the block it was read from is neither changed nor released.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "base/value.h"

namespace qm {

struct BlockValue {
  VALUE_TYPE type = VALUE_TYPE::Integer;
  std::string_view narrow;            // AsciiString: the bytes in the block
  const uint8_t* wide = nullptr;      // UnicodeString: wide_length UTF-16LE units
  std::size_t wide_length = 0;
  int32_t integer = 0;
  double real = 0.0;
  DateTimeValue date;

  // As CValue::Compare with this value in the place of the left operand:
  // -1, 0, 1, or kNotComparable.
  int Compare(const CValue& other) const;
  // As CValue::Match: 1 when other is a substring (text) or not greater
  // (integers, dates), else 0; kNotComparable for the other types.
  int Match(const CValue& other) const;
  // Copies into value, reusing its buffers; the value takes this type.
  void CopyTo(CValue& value) const;
  std::u16string WideText() const;
};

}  // namespace qm
