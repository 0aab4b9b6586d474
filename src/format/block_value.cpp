#include "format/block_value.h"

#include <cmath>

#include "base/byte_layout.h"
#include "base/trace.h"

namespace qm {

namespace {

template <class T>
int Order(const T& a, const T& b) {
  return a < b ? -1 : (b < a ? 1 : 0);
}

// Code-unit order of the UTF-16LE units in the block against other.
int CompareWide(const uint8_t* units, std::size_t n, std::u16string_view other) {
  const std::size_t common = n < other.size() ? n : other.size();
  for (std::size_t i = 0; i < common; ++i) {
    const char16_t c = static_cast<char16_t>(bytes::LoadU16(units + 2 * i));
    if (c != other[i]) return c < other[i] ? -1 : 1;
  }
  return Order(n, other.size());
}

}  // namespace

int BlockValue::Compare(const CValue& other) const {
  switch (type) {
    case VALUE_TYPE::AsciiString: {
      if (TraceLevel3.load(std::memory_order_relaxed)) {
        Trace(true, "GILIB,PILIB,FILIB.(ShareLib)CValue.Compare",
              "Comparing VALUE_TYPE::AsciiString string %s with %s", narrow, other.Narrow());
      }
      const int c = narrow.compare(other.Narrow());  // unsigned bytes
      return c < 0 ? -1 : (c > 0 ? 1 : 0);
    }
    case VALUE_TYPE::UnicodeString:
      return CompareWide(wide, wide_length, other.Wide());
    case VALUE_TYPE::Integer:
      return Order(integer, other.GetInteger());
    case VALUE_TYPE::Double:
      if (std::isnan(real) || std::isnan(other.GetDouble())) return kNotComparable;
      return Order(real, other.GetDouble());
    case VALUE_TYPE::DateTime:
      return CompareDates(date, other.GetDateTime());
  }
  return kNotComparable;
}

int BlockValue::Match(const CValue& other) const {
  switch (type) {
    case VALUE_TYPE::AsciiString:
      return narrow.find(other.Narrow()) != std::string_view::npos ? 1 : 0;
    case VALUE_TYPE::UnicodeString:
      return WideText().find(other.Wide()) != std::u16string::npos ? 1 : 0;
    case VALUE_TYPE::Integer:
      return integer >= other.GetInteger() ? 1 : 0;
    case VALUE_TYPE::DateTime:
      return CompareDates(date, other.GetDateTime()) != -1 ? 1 : 0;
    default:
      return kNotComparable;
  }
}

std::u16string BlockValue::WideText() const {
  std::u16string text(wide_length, u'\0');
  for (std::size_t i = 0; i < wide_length; ++i) {
    text[i] = static_cast<char16_t>(bytes::LoadU16(wide + 2 * i));
  }
  return text;
}

void BlockValue::CopyTo(CValue& value) const {
  switch (type) {
    case VALUE_TYPE::AsciiString:
      value.SetText(narrow);
      return;
    case VALUE_TYPE::UnicodeString: {
      if (value.WideCapacity() < wide_length + 1) value.ReserveWide(wide_length);
      std::u16string& text = value.WideBuffer();
      text.resize(wide_length);
      for (std::size_t i = 0; i < wide_length; ++i) {
        text[i] = static_cast<char16_t>(bytes::LoadU16(wide + 2 * i));
      }
      value.SetType(VALUE_TYPE::UnicodeString);
      return;
    }
    case VALUE_TYPE::Integer:
      value.SetInteger(integer);
      return;
    case VALUE_TYPE::Double:
      value.SetDouble(real);
      return;
    case VALUE_TYPE::DateTime:
      value.SetDateTime(date);
      return;
  }
  value.SetType(type);
}

}  // namespace qm
