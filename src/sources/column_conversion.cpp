#include "sources/column_conversion.h"

#include <charconv>
#include <cmath>
#include <limits>

#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "base/sql_time.h"

namespace qm {

namespace {

constexpr std::size_t kMaxMixedTextUnits = 10000;

std::string_view TrimBlanks(std::string_view text) {
  if (text.empty() ||
      (text.front() != ' ' && text.front() != '\t' && text.back() != ' ' && text.back() != '\t')) {
    return text;
  }
  const auto first = text.find_first_not_of(" \t");
  if (first == std::string_view::npos) return {};
  const auto last = text.find_last_not_of(" \t");
  return text.substr(first, last - first + 1);
}

[[noreturn]] void CannotConvert(const char* method, const CExceptionBase* inner = nullptr) {
  throw CShareDatabaseException::Text("Could not convert column value into appropriate type",
                                      method, inner);
}

[[noreturn]] void MixedText(const char* method) {
  throw CShareDatabaseException::Text(
      "Unicode text is being mixed with ansi text and column is too large for conversion. "
      "Please change all text columns to ansi or unicode format",
      method, nullptr);
}

// The source value as narrow text, for the parsers; wide text is converted.
std::string_view NarrowOf(const CValue& from, std::string& scratch) {
  if (from.GetType() == VALUE_TYPE::AsciiString) return from.Narrow();
  scratch = Utf16ToUtf8(from.Wide());
  return scratch;
}

void SetNarrow(CValue& out, std::string_view text) { out.SetText(text); }

void SetWide(CValue& out, std::string_view utf8) {
  std::u16string& buffer = out.WideBuffer();
  buffer.clear();
  AppendUtf8AsUtf16(utf8, buffer);
  out.SetType(VALUE_TYPE::UnicodeString);
}

// The value as text, for the two text targets.
std::string TextOf(const CValue& from) {
  switch (from.GetType()) {
    case VALUE_TYPE::Integer:
      return std::to_string(from.GetInteger());
    case VALUE_TYPE::Double:
      return DoubleToText(from.GetDouble());
    case VALUE_TYPE::DateTime:
      return SQLTimeToString(from.GetDateTime(), from.GetDateTime().fraction != 0);
    default:
      return {};
  }
}

bool IsText(VALUE_TYPE t) { return t == VALUE_TYPE::AsciiString || t == VALUE_TYPE::UnicodeString; }

}  // namespace

bool ParseInteger64(std::string_view text, int64_t& out) {
  text = TrimBlanks(text);
  bool negative = false;
  if (!text.empty() && (text.front() == '+' || text.front() == '-')) {
    negative = text.front() == '-';
    text.remove_prefix(1);
  }
  if (text.empty()) return false;
  if (text.size() <= 18) {
    // Eighteen digits cannot overflow: no checks per digit.
    int64_t v = 0;
    for (char c : text) {
      if (c < '0' || c > '9') return false;
      v = v * 10 + (c - '0');
    }
    out = negative ? -v : v;
    return true;
  }
  // Accumulated as a negative number, whose range holds INT64_MIN.
  constexpr int64_t kMin = std::numeric_limits<int64_t>::min();
  int64_t v = 0;
  for (char c : text) {
    if (c < '0' || c > '9') return false;
    const int digit = c - '0';
    if (v < (kMin + digit) / 10) return false;
    v = v * 10 - digit;
  }
  if (!negative) {
    if (v == kMin) return false;
    v = -v;
  }
  out = v;
  return true;
}

bool ParseInteger32(std::string_view text, int32_t& out) {
  if (!text.empty() && text.size() <= 9) {
    // Plain digits, the usual key: nine cannot leave 32 bits.
    uint32_t v = 0;  // unsigned: other bytes may make it wrap before they are seen
    bool digits = true;
    for (const char c : text) {
      digits = digits && c >= '0' && c <= '9';
      v = v * 10 + static_cast<uint32_t>(c - '0');
    }
    if (digits) {
      out = static_cast<int32_t>(v);
      return true;
    }
  }
  int64_t v = 0;
  if (!ParseInteger64(text, v)) return false;
  if (v < std::numeric_limits<int32_t>::min() || v > std::numeric_limits<int32_t>::max()) {
    return false;
  }
  out = static_cast<int32_t>(v);
  return true;
}

bool ParseDouble(std::string_view text, double& out) {
  text = TrimBlanks(text);
  bool negative = false;
  if (!text.empty() && (text.front() == '+' || text.front() == '-')) {
    negative = text.front() == '-';
    text.remove_prefix(1);
  }
  if (text.empty() || text.front() == '+' || text.front() == '-') return false;
  double v = 0;
  const auto [end, ec] =
      std::from_chars(text.data(), text.data() + text.size(), v, std::chars_format::general);
  if (ec != std::errc() || end != text.data() + text.size()) return false;
  out = negative ? -v : v;
  return true;
}

bool DoubleToInteger32(double value, int32_t& out) {
  if (!std::isfinite(value)) return false;
  const double t = std::trunc(value);
  if (t < static_cast<double>(std::numeric_limits<int32_t>::min()) ||
      t > static_cast<double>(std::numeric_limits<int32_t>::max())) {
    return false;
  }
  out = static_cast<int32_t>(t);
  return true;
}

std::string DoubleToText(double value) {
  char buffer[64];
  const auto [end, ec] =
      std::to_chars(buffer, buffer + sizeof buffer, value, std::chars_format::general);
  return ec == std::errc() ? std::string(buffer, end) : std::string();
}

void ConvertColumnValue(const CValue& from, VALUE_TYPE to, CValue& out, const char* method) {
  const VALUE_TYPE type = from.GetType();
  if (type == to && type == VALUE_TYPE::AsciiString) {
    out.SetText(from.Narrow());  // the common case, first
    return;
  }
  std::string scratch;
  switch (to) {
    case VALUE_TYPE::Integer: {
      int32_t v = 0;
      bool ok = false;
      if (type == VALUE_TYPE::Integer) {
        v = from.GetInteger();
        ok = true;
      } else if (type == VALUE_TYPE::Double) {
        ok = DoubleToInteger32(from.GetDouble(), v);
      } else if (IsText(type)) {
        ok = ParseInteger32(NarrowOf(from, scratch), v);
      }
      if (!ok) CannotConvert(method);
      out.SetInteger(v);
      return;
    }
    case VALUE_TYPE::Double: {
      double v = 0;
      bool ok = false;
      if (type == VALUE_TYPE::Double) {
        v = from.GetDouble();
        ok = true;
      } else if (type == VALUE_TYPE::Integer) {
        v = from.GetInteger();
        ok = true;
      } else if (IsText(type)) {
        ok = ParseDouble(NarrowOf(from, scratch), v);
      }
      if (!ok) CannotConvert(method);
      out.SetDouble(v);
      return;
    }
    case VALUE_TYPE::AsciiString:
      if (type == VALUE_TYPE::AsciiString) {
        SetNarrow(out, from.Narrow());
      } else if (type == VALUE_TYPE::UnicodeString) {
        if (from.Wide().size() >= kMaxMixedTextUnits) MixedText(method);
        SetNarrow(out, Utf16ToUtf8(from.Wide()));
      } else if (type == VALUE_TYPE::Integer || type == VALUE_TYPE::Double ||
                 type == VALUE_TYPE::DateTime) {
        SetNarrow(out, TextOf(from));
      } else {
        CannotConvert(method);
      }
      return;
    case VALUE_TYPE::UnicodeString:
      if (type == VALUE_TYPE::UnicodeString) {
        out.SetTextW(from.Wide());
      } else if (type == VALUE_TYPE::AsciiString) {
        if (from.Narrow().size() >= kMaxMixedTextUnits) MixedText(method);
        SetWide(out, from.Narrow());
      } else if (type == VALUE_TYPE::Integer || type == VALUE_TYPE::Double ||
                 type == VALUE_TYPE::DateTime) {
        SetWide(out, TextOf(from));
      } else {
        CannotConvert(method);
      }
      return;
    case VALUE_TYPE::DateTime:
      if (type == VALUE_TYPE::DateTime) {
        out.SetDateTime(from.GetDateTime());
      } else if (IsText(type)) {
        const std::string_view text = NarrowOf(from, scratch);
        if (TrimBlanks(text).empty()) CannotConvert(method);
        try {
          out.SetDateFromText(text, false);
        } catch (const CException& e) {
          CannotConvert(method, &e);
        }
      } else {
        CannotConvert(method);
      }
      return;
  }
  CannotConvert(method);
}

}  // namespace qm
