// The findex type: the VALUE_TYPE code every indexed value of a findex is
// read as, decided from the types of its indexed columns in column order,
// starting from 0 (none). Text wins over everything, Unicode over ANSI; a
// double widens integers; dates mixed with numbers become ANSI text.
#pragma once

#include <cstdint>

#include "base/value.h"

namespace qm {

inline int32_t NextFindexType(int32_t current, VALUE_TYPE column) {
  constexpr auto kInteger = static_cast<int32_t>(VALUE_TYPE::Integer);
  constexpr auto kAscii = static_cast<int32_t>(VALUE_TYPE::AsciiString);
  constexpr auto kDate = static_cast<int32_t>(VALUE_TYPE::DateTime);
  constexpr auto kUnicode = static_cast<int32_t>(VALUE_TYPE::UnicodeString);
  constexpr auto kDouble = static_cast<int32_t>(VALUE_TYPE::Double);
  const bool text = current == kAscii || current == kUnicode;
  switch (column) {
    case VALUE_TYPE::UnicodeString:
      return kUnicode;
    case VALUE_TYPE::AsciiString:
      return current == kUnicode ? kUnicode : kAscii;
    case VALUE_TYPE::Double:
      return text ? current : current == kDate ? kAscii : kDouble;
    case VALUE_TYPE::Integer:
      return text || current == kDouble ? current : current == kDate ? kAscii : kInteger;
    case VALUE_TYPE::DateTime:
      return text ? current : (current == kInteger || current == kDouble) ? kAscii : kDate;
  }
  return current;
}

}  // namespace qm
