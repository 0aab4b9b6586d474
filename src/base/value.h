// CValue: one typed column value; CColumnValues: one table row of them.
#pragma once

#include <compare>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

enum class VALUE_TYPE : int32_t {
  Integer = 1,
  AsciiString = 2,
  DateTime = 3,
  UnicodeString = 4,
  Double = 6,
};

// A data source's date and time; fraction is the source's fraction of a second.
struct DateTimeValue {
  int16_t year = 0;
  uint16_t month = 0;
  uint16_t day = 0;
  uint16_t hour = 0;
  uint16_t minute = 0;
  uint16_t second = 0;
  uint32_t fraction = 0;

  bool operator==(const DateTimeValue&) const = default;
  // Field by field, from the year down to the fraction.
  auto operator<=>(const DateTimeValue&) const = default;
};

// -1, 0 or 1, as a date/time comes before, with or after another.
inline int CompareDates(const DateTimeValue& a, const DateTimeValue& b) {
  const auto order = a <=> b;
  return order < 0 ? -1 : (order > 0 ? 1 : 0);
}

// Compare's result when two values cannot be ordered.
inline constexpr int kNotComparable = 10;

class CValue {
 public:
  CValue() = default;
  explicit CValue(VALUE_TYPE type) : type_(type) {}

  VALUE_TYPE GetType() const { return type_; }
  void SetType(VALUE_TYPE type) { type_ = type; }

  // Reserve room for n units of text; the type becomes AsciiString / UnicodeString.
  void ReserveNarrow(std::size_t n);
  void ReserveWide(std::size_t n);

  void SetText(std::string_view text);
  void SetTextW(std::u16string_view text);
  void SetInteger(int32_t v);
  void SetDouble(double v);
  void SetDateTime(const DateTimeValue& v);

  // Parses "Y-M-D h:m:s[.f]" or "M/D/Y h:m:s [AM|PM]". With upper_bound, a
  // missing time is 25:61:61, so a bare date sorts after every time of its day.
  // A field that is not a number or out of range raises a "Value" error.
  void SetDateFromText(std::string_view text, bool upper_bound);
  // Makes a date an inclusive upper bound at the given precision.
  void ExtendToEnd(int precision);

  uint32_t DateKey() const;
  uint32_t TimeKey() const;

  // -1, 0, 1, or kNotComparable.
  int Compare(const CValue& other) const;
  // Filter match: substring for text, >= for numbers and dates; 1/0, or 10.
  int Match(const CValue& other) const;

  std::string_view Narrow() const { return narrow_; }
  std::u16string_view Wide() const { return wide_; }
  std::string& NarrowBuffer() { return narrow_; }
  std::u16string& WideBuffer() { return wide_; }
  int32_t GetInteger() const { return integer_; }
  double GetDouble() const { return double_; }
  const DateTimeValue& GetDateTime() const { return date_; }
  std::size_t NarrowCapacity() const { return narrow_capacity_; }
  std::size_t WideCapacity() const { return wide_capacity_; }

 private:
  std::string narrow_;
  std::u16string wide_;
  std::size_t narrow_capacity_ = 0;
  std::size_t wide_capacity_ = 0;
  int32_t integer_ = 0;
  double double_ = 0.0;
  DateTimeValue date_;
  VALUE_TYPE type_ = VALUE_TYPE::Integer;
};

// A row of at most 99 values.
class CColumnValues {
 public:
  static constexpr std::size_t kMaxColumns = 99;

  // Adds a column of the given type; text columns reserve min(size, 2000) units.
  // The 100th column raises "Too many table columns".
  void AddColumn(VALUE_TYPE type, std::size_t size);
  std::size_t Count() const { return count_; }
  bool IsAllocated() const { return !values_.empty(); }
  // A column that was added; any other index raises a "Value" general error.
  CValue& Column(std::size_t i);
  const CValue& Column(std::size_t i) const;
  CValue& operator[](std::size_t i) { return Column(i); }
  const CValue& operator[](std::size_t i) const { return Column(i); }
  void Release();

 private:
  void AllocateColumns();

  std::vector<CValue> values_;
  std::size_t count_ = 0;
};

}  // namespace qm
