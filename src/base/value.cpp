#include "base/value.h"

#include <cmath>
#include <cstdint>
#include <limits>

#include "platform/text_encoding.h"
#include "base/checked_allocation.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr std::size_t kStringSlack = 10;
constexpr std::size_t kMaxColumnText = 2000;

template <class T>
int Order(const T& a, const T& b) {
  return a < b ? -1 : (b < a ? 1 : 0);
}

// Reads date/time fields out of a text; every field must be a decimal number.
class DateFieldReader {
 public:
  explicit DateFieldReader(std::string_view text) : text_(text) {}

  // Skips separators of set, then reads digits up to the next character of set
  // (or of stop). Returns false when nothing is left.
  bool Next(std::string_view set, std::string& field) {
    while (pos_ < text_.size() && set.find(text_[pos_]) != std::string_view::npos) ++pos_;
    if (pos_ >= text_.size()) return false;
    const auto end = text_.find_first_of(set, pos_);
    field = std::string(text_.substr(pos_, end == std::string_view::npos ? end : end - pos_));
    pos_ = end == std::string_view::npos ? text_.size() : end;
    return true;
  }
  std::string_view Rest() const { return text_.substr(pos_); }

 private:
  std::string_view text_;
  std::size_t pos_ = 0;
};

[[noreturn]] void BadDate(std::string_view text) {
  throw CValueException::Text("Invalid date or time: %S", "CValue::SetDateFromText", nullptr,
                              text);
}

long ParseField(std::string_view field, std::string_view text, long min, long max) {
  if (field.empty() || field.size() > 9) BadDate(text);
  long value = 0;
  for (char c : field) {
    if (c < '0' || c > '9') BadDate(text);
    value = value * 10 + (c - '0');
  }
  if (value < min || value > max) BadDate(text);
  return value;
}

// Splits "11PM" into "11" and the marker; returns 0 none, 1 AM, 2 PM.
int TakeMeridiem(std::string& field) {
  if (field.size() < 2) return 0;
  const std::string tail = AsciiUpper(field.substr(field.size() - 2));
  if (tail != "AM" && tail != "PM") return 0;
  field.erase(field.size() - 2);
  while (!field.empty() && field.back() == ' ') field.pop_back();
  return tail == "AM" ? 1 : 2;
}

}  // namespace

namespace {

// Makes room for n units plus the slack; false when that cannot be allocated.
template <class String>
bool ReserveWithSlack(String& text, std::size_t& capacity, std::size_t n) {
  if (n > SIZE_MAX - kStringSlack) return false;
  if (capacity >= n + kStringSlack) return true;
  try {
    ReserveChecked(text, n + kStringSlack);
  } catch (const std::bad_alloc&) {
    return false;
  }
  capacity = n + kStringSlack;
  return true;
}

}  // namespace

void CValue::ReserveNarrow(std::size_t n) {
  if (!ReserveWithSlack(narrow_, narrow_capacity_, n)) throw CValueException::General("PreStr");
  type_ = VALUE_TYPE::AsciiString;
}

void CValue::ReserveWide(std::size_t n) {
  if (!ReserveWithSlack(wide_, wide_capacity_, n)) throw CValueException::General("PreStrW");
  type_ = VALUE_TYPE::UnicodeString;
}

void CValue::SetText(std::string_view text) {
  if (narrow_capacity_ < text.size() + 1) ReserveNarrow(text.size());
  narrow_.assign(text);
  type_ = VALUE_TYPE::AsciiString;
}

void CValue::SetTextW(std::u16string_view text) {
  if (wide_capacity_ < text.size() + 1) ReserveWide(text.size());
  wide_.assign(text);
  type_ = VALUE_TYPE::UnicodeString;
}

void CValue::SetInteger(int32_t v) {
  integer_ = v;
  type_ = VALUE_TYPE::Integer;
}

void CValue::SetDouble(double v) {
  double_ = v;
  type_ = VALUE_TYPE::Double;
}

void CValue::SetDateTime(const DateTimeValue& v) {
  date_ = v;
  type_ = VALUE_TYPE::DateTime;
}

void CValue::SetDateFromText(std::string_view text, bool upper_bound) {
  DateTimeValue d;
  if (upper_bound) {
    d.hour = 25;
    d.minute = 61;
    d.second = 61;
  }
  DateFieldReader reader(text);
  std::string field;
  const bool iso = text.find('-') != std::string_view::npos;
  bool complete_date = false;

  if (iso) {
    if (reader.Next("- ", field)) {
      d.year = static_cast<int16_t>(ParseField(field, text, 0, 32767));
      if (reader.Next("- ", field)) {
        d.month = static_cast<uint16_t>(ParseField(field, text, 1, 12));
        if (reader.Next("- ", field)) {
          d.day = static_cast<uint16_t>(ParseField(field, text, 1, 31));
          complete_date = true;
        }
      }
    }
  } else {
    if (reader.Next("/ ", field)) {
      d.month = static_cast<uint16_t>(ParseField(field, text, 1, 12));
      if (reader.Next("/ ", field)) {
        d.day = static_cast<uint16_t>(ParseField(field, text, 1, 31));
        if (reader.Next("/ ", field)) {
          long year = ParseField(field, text, 0, 32767);
          if (field.size() <= 2) year += year <= 50 ? 2000 : 1900;
          d.year = static_cast<int16_t>(year);
          complete_date = true;
        }
      }
    }
  }

  if (complete_date) {
    // Time fields; an AM/PM marker may follow any of them, joined or after a blank.
    int meridiem = 0;
    uint16_t* const fields[] = {&d.hour, &d.minute, &d.second};
    const long limits[] = {23, 59, 59};
    for (int i = 0; i < 3 && meridiem == 0; ++i) {
      if (!reader.Next(": ", field)) break;
      meridiem = TakeMeridiem(field);
      if (field.empty() && meridiem != 0) break;  // the marker stood alone
      if (i == 2) {
        // Seconds may carry a fraction: ".123" is 123,000,000 nanoseconds.
        const auto dot = field.find('.');
        if (dot != std::string::npos) {
          std::string digits = field.substr(dot + 1);
          field.erase(dot);
          if (digits.empty() || digits.size() > 9) BadDate(text);
          digits.append(9 - digits.size(), '0');
          d.fraction = static_cast<uint32_t>(ParseField(digits, text, 0, 999999999));
        }
      }
      *fields[i] = static_cast<uint16_t>(ParseField(field, text, 0, limits[i]));
    }
    // A marker may also stand alone after the last time field: "11:00:00 PM".
    if (meridiem == 0 && reader.Next(": ", field)) {
      meridiem = TakeMeridiem(field);
      if (meridiem == 0 || !field.empty()) BadDate(text);
    }
    if (meridiem != 0 && d.hour <= 23) {
      if (meridiem == 2 && d.hour < 12) d.hour = static_cast<uint16_t>(d.hour + 12);
      if (meridiem == 1 && d.hour == 12) d.hour = 0;
    }
  }
  date_ = d;
  type_ = VALUE_TYPE::DateTime;
}

void CValue::ExtendToEnd(int precision) {
  date_.second = 59;
  if (precision != 3) date_.minute = 59;
  if (precision != 2 && precision != 3) date_.hour = 23;
}

uint32_t CValue::DateKey() const {
  // Computed signed and taken modulo 2^32, so a year before 0 keeps its key.
  const int64_t key = (int64_t{date_.year} * 256 + date_.month) * 256 + date_.day;
  return static_cast<uint32_t>(key);
}

uint32_t CValue::TimeKey() const {
  return (static_cast<uint32_t>(date_.hour) * 256u + date_.minute) * 256u + date_.second;
}

int CValue::Compare(const CValue& other) const {
  switch (type_) {
    case VALUE_TYPE::AsciiString: {
      Trace(TraceLevel3.load(), "GILIB,PILIB,FILIB.(ShareLib)CValue.Compare",
            "Comparing VALUE_TYPE::AsciiString string %s with %s", narrow_, other.narrow_);
      const int c = std::string_view(narrow_).compare(other.narrow_);  // unsigned bytes
      return c < 0 ? -1 : (c > 0 ? 1 : 0);
    }
    case VALUE_TYPE::UnicodeString: {
      const int c = std::u16string_view(wide_).compare(other.wide_);
      return c < 0 ? -1 : (c > 0 ? 1 : 0);
    }
    case VALUE_TYPE::Integer:
      return Order(integer_, other.integer_);
    case VALUE_TYPE::Double:
      if (std::isnan(double_) || std::isnan(other.double_)) return kNotComparable;
      return Order(double_, other.double_);
    case VALUE_TYPE::DateTime:
      return CompareDates(date_, other.date_);
  }
  return kNotComparable;
}

int CValue::Match(const CValue& other) const {
  switch (type_) {
    case VALUE_TYPE::AsciiString:
      return narrow_.find(other.narrow_) != std::string::npos ? 1 : 0;
    case VALUE_TYPE::UnicodeString:
      return wide_.find(other.wide_) != std::u16string::npos ? 1 : 0;
    case VALUE_TYPE::Integer:
      return integer_ >= other.integer_ ? 1 : 0;
    case VALUE_TYPE::DateTime:
      return Compare(other) != -1 ? 1 : 0;
    default:
      return kNotComparable;
  }
}

void CColumnValues::AllocateColumns() {
  try {
    ReserveChecked(values_, kMaxColumns + 1);
    values_.resize(kMaxColumns + 1);
  } catch (const std::bad_alloc&) {
    values_.clear();
    // Text kept as written: callers match on it. Do not correct.
    throw CValueException::Text("Eror allocating memory", "CColumnValues::AllocateColumns",
                                nullptr);
  }
}

CValue& CColumnValues::Column(std::size_t i) {
  if (i >= count_) throw CValueException::General("CColumnValues::GetColumn");
  return values_[i];
}

const CValue& CColumnValues::Column(std::size_t i) const {
  if (i >= count_) throw CValueException::General("CColumnValues::GetColumn");
  return values_[i];
}

void CColumnValues::AddColumn(VALUE_TYPE type, std::size_t size) {
  if (values_.empty()) AllocateColumns();
  if (count_ + 1 >= kMaxColumns + 1) {
    throw CValueException::Text("Too many table columns", "CColumnValues::AddColumn", nullptr);
  }
  CValue& v = values_[count_++];
  v.SetType(type);
  if (type == VALUE_TYPE::AsciiString) v.ReserveNarrow(std::min(size, kMaxColumnText));
  if (type == VALUE_TYPE::UnicodeString) v.ReserveWide(std::min(size, kMaxColumnText));
}

void CColumnValues::Release() {
  values_.clear();
  count_ = 0;
}

}  // namespace qm
