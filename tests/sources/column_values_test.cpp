// Conversions of cached column values, and column text made fit for the engine.
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>
#include <string>

#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "base/sql_time.h"
#include "sources/column_conversion.h"
#include "sources/column_text.h"

namespace qm {
namespace {

constexpr const char* kMethod = "GetColumnValueFromCache";
const std::string kCannotConvert =
    "Could not convert column value into appropriate type "
    "(Module:ShareDatabase,Method:GetColumnValueFromCache)\r\n";

// A value set by one of CValue's setters.
template <class T>
CValue Make(void (CValue::*set)(T), T x) {
  CValue v;
  (v.*set)(x);
  return v;
}
CValue Narrow(std::string_view s) { return Make(&CValue::SetText, s); }
CValue Wide(std::u16string_view s) { return Make(&CValue::SetTextW, s); }
CValue Int(int32_t i) { return Make(&CValue::SetInteger, i); }
CValue Dbl(double d) { return Make(&CValue::SetDouble, d); }
CValue Date(DateTimeValue d) { return Make<const DateTimeValue&>(&CValue::SetDateTime, d); }

CValue Convert(const CValue& from, VALUE_TYPE to) {
  CValue out;
  ConvertColumnValue(from, to, out, kMethod);
  EXPECT_EQ(out.GetType(), to);
  return out;
}

// The full text of the error a conversion raises, or "" when it succeeds.
std::string ErrorOf(const CValue& from, VALUE_TYPE to) {
  try {
    CValue out;
    ConvertColumnValue(from, to, out, kMethod);
  } catch (CShareDatabaseException& e) {
    return e.GetFullTextUtf8(100);
  }
  return "";
}

TEST(ColumnConversion, ToIntegerTakesOnlyWholeNumbersWithin32Bits) {
  EXPECT_EQ(Convert(Narrow(" -42 "), VALUE_TYPE::Integer).GetInteger(), -42);
  EXPECT_EQ(Convert(Narrow("\t+2147483647"), VALUE_TYPE::Integer).GetInteger(), 2147483647);
  EXPECT_EQ(Convert(Narrow("-2147483648"), VALUE_TYPE::Integer).GetInteger(), INT32_MIN);
  EXPECT_EQ(Convert(Wide(u" 17 "), VALUE_TYPE::Integer).GetInteger(), 17);
  EXPECT_EQ(Convert(Int(-5), VALUE_TYPE::Integer).GetInteger(), -5);
  for (const char* bad : {"2147483648", "-2147483649", "12a", "1.5", "0x10", "  ", "-", "+-1", "1 2"}) {
    EXPECT_EQ(ErrorOf(Narrow(bad), VALUE_TYPE::Integer), kCannotConvert) << bad;
  }
  EXPECT_EQ(ErrorOf(Wide(u"\u0661\u0662"), VALUE_TYPE::Integer), kCannotConvert);
  // Doubles truncate toward zero and must land in range.
  EXPECT_EQ(Convert(Dbl(-3.9), VALUE_TYPE::Integer).GetInteger(), -3);
  EXPECT_EQ(Convert(Dbl(2147483647.9), VALUE_TYPE::Integer).GetInteger(), INT32_MAX);
  EXPECT_EQ(Convert(Dbl(-2147483648.9), VALUE_TYPE::Integer).GetInteger(), INT32_MIN);
  for (double bad :
       {2147483648.0, -2147483649.0, 1e10, std::nan(""), std::numeric_limits<double>::infinity()}) {
    EXPECT_EQ(ErrorOf(Dbl(bad), VALUE_TYPE::Integer), kCannotConvert) << bad;
  }
  EXPECT_EQ(ErrorOf(Date({2024, 2, 29}), VALUE_TYPE::Integer), kCannotConvert);
}

TEST(ColumnConversion, ToDoubleParsesWholeTextAndKeepsIntegersExact) {
  EXPECT_EQ(Convert(Narrow("1e10"), VALUE_TYPE::Double).GetDouble(), 1e10);
  EXPECT_EQ(Convert(Narrow(" -0.5 "), VALUE_TYPE::Double).GetDouble(), -0.5);
  EXPECT_EQ(Convert(Wide(u"1234.56"), VALUE_TYPE::Double).GetDouble(), 1234.56);
  EXPECT_EQ(Convert(Int(INT32_MAX), VALUE_TYPE::Double).GetDouble(), 2147483647.0);
  for (const char* bad : {"1,5", " ", "1e999", "1.5x"}) {
    EXPECT_EQ(ErrorOf(Narrow(bad), VALUE_TYPE::Double), kCannotConvert) << bad;
  }
  EXPECT_EQ(ErrorOf(Date({2024, 2, 29}), VALUE_TYPE::Double), kCannotConvert);
}

TEST(ColumnConversion, ToTextInBothWidths) {
  EXPECT_EQ(Convert(Int(-12), VALUE_TYPE::AsciiString).Narrow(), "-12");
  EXPECT_EQ(Convert(Dbl(0.1), VALUE_TYPE::AsciiString).Narrow(), "0.1");
  EXPECT_EQ(Convert(Dbl(1e10), VALUE_TYPE::AsciiString).Narrow(), "1e+10");
  EXPECT_EQ(Convert(Dbl(0.1 + 0.2), VALUE_TYPE::AsciiString).Narrow(), "0.30000000000000004");
  EXPECT_EQ(Convert(Date({2024, 2, 29, 13, 45, 59, 123456000}), VALUE_TYPE::AsciiString).Narrow(),
            "2024-2-29 13:45:59.123456");
  EXPECT_EQ(Convert(Date({1999, 12, 31, 0, 0, 0, 5000000}), VALUE_TYPE::UnicodeString).Wide(),
            u"1999-12-31 0:0:0.005");
  EXPECT_EQ(Convert(Narrow("Ärger Москва"), VALUE_TYPE::UnicodeString).Wide(), u"Ärger Москва");
  EXPECT_EQ(Convert(Wide(u"Ärger Москва 𝄞"), VALUE_TYPE::AsciiString).Narrow(), "Ärger Москва 𝄞");

  // A double's text reads back as the same double.
  std::mt19937_64 random(7);
  for (int i = 0; i < 2000; ++i) {
    const double d =
        std::ldexp(static_cast<double>(random() >> 11), static_cast<int>(random() % 200) - 120);
    double back = 0;
    ASSERT_TRUE(ParseDouble(DoubleToText(d), back)) << DoubleToText(d);
    EXPECT_EQ(back, d);
  }
  // Date text reads back as the same date.
  CValue back;
  back.SetDateFromText(SQLTimeToString(DateTimeValue{2024, 2, 29, 13, 45, 59, 5000000}, true),
                       false);
  EXPECT_EQ(back.GetDateTime(), (DateTimeValue{2024, 2, 29, 13, 45, 59, 5000000}));
}

TEST(ColumnConversion, ToDateTimeParsesTextOnly) {
  EXPECT_EQ(Convert(Narrow("2024-02-29 13:45:59"), VALUE_TYPE::DateTime).GetDateTime(),
            (DateTimeValue{2024, 2, 29, 13, 45, 59, 0}));
  EXPECT_EQ(Convert(Wide(u"12/31/99 11:00:00 PM"), VALUE_TYPE::DateTime).GetDateTime(),
            (DateTimeValue{1999, 12, 31, 23, 0, 0, 0}));
  // The parser's own complaint stays in the chain below the conversion error.
  const std::string bad = ErrorOf(Narrow("2024-13-01"), VALUE_TYPE::DateTime);
  EXPECT_EQ(bad.rfind(kCannotConvert, 0), 0u) << bad;
  EXPECT_NE(bad.find("2024-13-01"), std::string::npos) << bad;
  EXPECT_EQ(ErrorOf(Narrow("  "), VALUE_TYPE::DateTime), kCannotConvert);
  EXPECT_EQ(ErrorOf(Int(20240229), VALUE_TYPE::DateTime), kCannotConvert);
  EXPECT_EQ(ErrorOf(Dbl(1.0), VALUE_TYPE::DateTime), kCannotConvert);
}

TEST(ColumnConversion, HugeTextBetweenWidthsAndUnknownTypesAreRefused) {
  const std::string mixed =
      "Unicode text is being mixed with ansi text and column is too large for conversion. "
      "Please change all text columns to ansi or unicode format "
      "(Module:ShareDatabase,Method:GetColumnValueFromCache)\r\n";
  EXPECT_EQ(ErrorOf(Narrow(std::string(10000, 'x')), VALUE_TYPE::UnicodeString), mixed);
  EXPECT_EQ(ErrorOf(Wide(std::u16string(10000, u'x')), VALUE_TYPE::AsciiString), mixed);
  EXPECT_EQ(Convert(Narrow(std::string(9999, 'x')), VALUE_TYPE::UnicodeString).Wide().size(),
            9999u);
  EXPECT_EQ(ErrorOf(Int(1), static_cast<VALUE_TYPE>(5)), kCannotConvert);
}

TEST(ColumnText, CutsAtCharactersNeverInsideOne) {
  std::string out;
  std::string long_text = "a";
  for (int i = 0; i < 5000; ++i) long_text += "é";
  AssignColumnText(long_text, kMaxColumnCharacters, out);
  EXPECT_EQ(out.size(), 1u + 1999u * 2u);
  EXPECT_EQ(Utf8ToUtf16(out).size(), 2000u);

  std::string astral;
  for (int i = 0; i < 2001; ++i) astral += "😀";
  AssignColumnText(astral, kMaxColumnCharacters, out);
  EXPECT_EQ(out.size(), 2000u * 4u);

  std::u16string wide_out;
  std::u16string wide = std::u16string(1999, u'ж') + u"😀" + u"tail";
  AssignColumnText(wide, kMaxColumnCharacters, wide_out);
  EXPECT_EQ(wide_out, std::u16string(1999, u'ж') + u"😀");
  AssignColumnText(std::u16string(1999, u'ж') + u"\xD83D", kMaxColumnCharacters, wide_out);
  EXPECT_EQ(wide_out.back(), u'\xFFFD');
}

TEST(ColumnText, InvalidUtf8BecomesReplacementCharacters) {
  std::string out;
  AssignColumnText("ok \xC3 \xFF\xFE end \xE2\x82", 100, out);
  EXPECT_EQ(out, "ok \xEF\xBF\xBD \xEF\xBF\xBD\xEF\xBF\xBD end \xEF\xBF\xBD");
  // The replacement character itself is valid text and kept as it is.
  AssignColumnText("\xEF\xBF\xBD", 100, out);
  EXPECT_EQ(out, "\xEF\xBF\xBD");
}

}  // namespace
}  // namespace qm
