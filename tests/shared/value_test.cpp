#include "shared/value.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>
#include <vector>

#include "shared/core_test_support.h"
#include "shared/exception_family.h"
#include "shared/trace.h"

namespace qm {

// Found by argument-dependent lookup, so failures print dates readably.
void PrintTo(const DateTimeValue& d, std::ostream* os) {
  *os << d.year << "-" << d.month << "-" << d.day << " " << d.hour << ":" << d.minute << ":"
      << d.second << "." << d.fraction;
}

namespace {

using test::ThrownTexts;
using Texts = std::vector<std::string>;

DateTimeValue Date(int y, int mo, int d, int h = 0, int mi = 0, int s = 0, uint32_t f = 0) {
  return {static_cast<int16_t>(y), static_cast<uint16_t>(mo), static_cast<uint16_t>(d),
          static_cast<uint16_t>(h), static_cast<uint16_t>(mi), static_cast<uint16_t>(s), f};
}

DateTimeValue Parse(const std::string& text, bool upper_bound = false) {
  CValue v;
  v.SetDateFromText(text, upper_bound);
  EXPECT_EQ(v.GetType(), VALUE_TYPE::DateTime);
  return v.GetDateTime();
}

TEST(ValueText, ReserveAndSetGrowWithTenUnitsOfSlack) {
  CValue v;
  v.ReserveNarrow(5);
  EXPECT_EQ(v.GetType(), VALUE_TYPE::AsciiString);
  EXPECT_EQ(v.NarrowCapacity(), 15u);
  v.SetText("short");  // fits: no growth
  EXPECT_EQ(v.NarrowCapacity(), 15u);
  v.SetText(std::string(100, 'x'));
  EXPECT_EQ(v.NarrowCapacity(), 110u);
  v.SetTextW(u"abc");
  EXPECT_EQ(v.GetType(), VALUE_TYPE::UnicodeString);
  EXPECT_EQ(v.WideCapacity(), 13u);
  // The buffers outlive a change of type.
  v.SetInteger(4);
  v.SetText("again");
  EXPECT_EQ(v.NarrowCapacity(), 110u);
  EXPECT_EQ(v.Narrow(), "again");
}

TEST(ValueText, AllocationFailuresNamePreStr) {
  CValue v;
  test::AllocationLimit limit(100);
  EXPECT_EQ(ThrownTexts<CValueException>([&] { v.ReserveNarrow(200); }),
            Texts{"General Error (Module:Value,Method:PreStr)"});
  EXPECT_EQ(ThrownTexts<CValueException>([&] { v.SetText(std::string(200, 'x')); }),
            Texts{"General Error (Module:Value,Method:PreStr)"});
  EXPECT_EQ(ThrownTexts<CValueException>([&] { v.ReserveWide(50); }),
            Texts{"General Error (Module:Value,Method:PreStrW)"});
  EXPECT_EQ(ThrownTexts<CValueException>([&] { v.ReserveNarrow(SIZE_MAX - 3); }),
            Texts{"General Error (Module:Value,Method:PreStr)"});
}

TEST(ValueDate, MonthDayYearWithMarker) {
  EXPECT_EQ(Parse("12/31/99 11:00:00 PM"), Date(1999, 12, 31, 23, 0, 0));
  EXPECT_EQ(Parse("1/2/50"), Date(2050, 1, 2));
  EXPECT_EQ(Parse("1/2/51"), Date(1951, 1, 2));
  EXPECT_EQ(Parse("1/2/2051"), Date(2051, 1, 2));
  EXPECT_EQ(Parse("1/1/2000 12 AM"), Date(2000, 1, 1, 0, 0, 0));
  EXPECT_EQ(Parse("1/1/2000 12:30AM"), Date(2000, 1, 1, 0, 30, 0));
  EXPECT_EQ(Parse("1/1/2000 12 PM"), Date(2000, 1, 1, 12, 0, 0));
  EXPECT_EQ(Parse("1/1/2000 1:05 pm"), Date(2000, 1, 1, 13, 5, 0));
  EXPECT_EQ(Parse("1/1/2000 13:05 PM"), Date(2000, 1, 1, 13, 5, 0));  // already past noon
}

TEST(ValueDate, YearMonthDayWithTime) {
  EXPECT_EQ(Parse("2004-3-9 14:5:7"), Date(2004, 3, 9, 14, 5, 7));
  EXPECT_EQ(Parse("2004-03-09 14 05"), Date(2004, 3, 9, 14, 5, 0));
  EXPECT_EQ(Parse("2004-3-9 14:5:7.25"), Date(2004, 3, 9, 14, 5, 7, 250000000));
}

TEST(ValueDate, UpperBoundPresetsMissingTimeFields) {
  EXPECT_EQ(Parse("12/31/1999", true), Date(1999, 12, 31, 25, 61, 61));
  EXPECT_EQ(Parse("2004-3-9 14", true), Date(2004, 3, 9, 14, 61, 61));
  EXPECT_EQ(Parse("12/31/1999 PM", true), Date(1999, 12, 31, 25, 61, 61));
  // A missing date field ends parsing with what was read.
  EXPECT_EQ(Parse("12/31", true), Date(0, 12, 31, 25, 61, 61));
  EXPECT_EQ(Parse(""), Date(0, 0, 0));

  CValue bound;
  bound.SetDateFromText("3/9/2004", true);
  CValue last;
  last.SetDateTime(Date(2004, 3, 9, 23, 59, 59, 999999999));
  EXPECT_EQ(bound.Compare(last), 1);
  EXPECT_EQ(last.Compare(bound), -1);
}

TEST(ValueDate, InvalidFieldsRaiseInsteadOfStoringGarbage) {
  for (const char* text : {"13/1/2000", "0/1/2000", "1/32/2000", "1/1/2000 24:00", "1/1/2000 10:60",
                           "1/1/2000 10:00:60", "2004-0-9", "2004-13-1", "x/1/2000", "1/1/20x0",
                           "2004-3-9 1:2:3 more", "1/1/2000 10:00 XM", "1/1/2000 -1",
                           "1/1/99999999999999"}) {
    CValue v;
    v.SetInteger(7);
    EXPECT_EQ(ThrownTexts<CValueException>([&] { v.SetDateFromText(text, false); }),
              Texts{"Invalid date or time: " + std::string(text) +
                    " (Module:Value,Method:CValue::SetDateFromText)"})
        << text;
    EXPECT_EQ(v.GetType(), VALUE_TYPE::Integer) << text;  // nothing half-stored
  }
}

TEST(ValueDate, ExtendToEndAndKeys) {
  CValue v;
  v.SetDateTime(Date(2004, 3, 9, 14, 5, 7));
  v.ExtendToEnd(1);
  EXPECT_EQ(v.GetDateTime(), Date(2004, 3, 9, 23, 59, 59));
  v.SetDateTime(Date(2004, 3, 9, 14, 5, 7));
  v.ExtendToEnd(2);
  EXPECT_EQ(v.GetDateTime(), Date(2004, 3, 9, 14, 59, 59));
  v.SetDateTime(Date(2004, 3, 9, 14, 5, 7));
  v.ExtendToEnd(3);
  EXPECT_EQ(v.GetDateTime(), Date(2004, 3, 9, 14, 5, 59));
  EXPECT_EQ(v.DateKey(), (2004u * 256 + 3) * 256 + 9);
  EXPECT_EQ(v.TimeKey(), (14u * 256 + 5) * 256 + 59);
}

TEST(ValueCompare, EachTypeOrdersItsOwnWay) {
  CValue a, b;
  a.SetText("\xC3\xA9");  // bytes compare unsigned: 0xC3 > 'z'
  b.SetText("z");
  EXPECT_EQ(a.Compare(b), 1);
  a.SetText("ab");
  b.SetText("abc");
  EXPECT_EQ(a.Compare(b), -1);
  EXPECT_EQ(b.Compare(b), 0);
  // Wide text compares by code unit: a surrogate (D800) sorts below U+FF00.
  a.SetTextW(u"\uFF00");
  b.SetTextW(u"\U00010000");
  EXPECT_EQ(a.Compare(b), 1);
  a.SetInteger(-5);
  b.SetInteger(3);
  EXPECT_EQ(a.Compare(b), -1);
  a.SetDateTime(Date(2004, 3, 9, 1, 2, 3, 5));
  b.SetDateTime(Date(2004, 3, 9, 1, 2, 3, 4));
  EXPECT_EQ(a.Compare(b), 1);
  b.SetDateTime(Date(-1, 12, 31));
  EXPECT_EQ(b.Compare(a), -1);
  a.SetType(static_cast<VALUE_TYPE>(5));
  EXPECT_EQ(a.Compare(b), kNotComparable);
}

TEST(ValueCompare, NotANumberCannotBeOrdered) {
  CValue a, b;
  a.SetDouble(std::numeric_limits<double>::quiet_NaN());
  b.SetDouble(1.0);
  EXPECT_EQ(a.Compare(b), 10);
  EXPECT_EQ(b.Compare(a), 10);
  a.SetDouble(0.5);
  EXPECT_EQ(a.Compare(b), -1);
  a.SetDouble(1.0);
  EXPECT_EQ(a.Compare(b), 0);
}

TEST(ValueCompare, LevelThreeTracesTextComparisons) {
  test::ConfiguredHome home;
  CValue a, b;
  a.SetText("abc");
  b.SetText("abd");
  const bool saved = TraceLevel3;
  TraceLevel3 = false;
  a.Compare(b);
  EXPECT_EQ(test::TraceOf(home, "GILIB"), "");
  TraceLevel3 = true;
  a.Compare(b);
  TraceLevel3 = saved;
  for (const char* module : {"GILIB", "PILIB", "FILIB"}) {
    EXPECT_NE(test::TraceOf(home, module)
                  .find(" (ShareLib)CValue.Compare - Comparing VALUE_TYPE::AsciiString string abc "
                        "with abd\r\n"),
              std::string::npos)
        << module;
  }
}

TEST(ValueMatch, FilterSemanticsPerType) {
  CValue a, b;
  a.SetText("river fish");
  b.SetText("fish");
  EXPECT_EQ(a.Match(b) * 10 + b.Match(a), 10);  // substring of this, not the other way
  a.SetTextW(u"river");
  b.SetTextW(u"ive");
  EXPECT_EQ(a.Match(b), 1);
  a.SetInteger(3);
  b.SetInteger(4);
  EXPECT_EQ(a.Match(b) * 10 + b.Match(a), 1);  // this >= other
  a.SetDateTime(Date(2004, 3, 9));
  b.SetDateTime(Date(2004, 3, 9));
  EXPECT_EQ(a.Match(b), 1);
  a.SetDouble(2.0);
  b.SetDouble(1.0);
  EXPECT_EQ(a.Match(b), 10);
}

TEST(ColumnValues, NinetyNineColumnsAndNoMore) {
  CColumnValues row;
  EXPECT_FALSE(row.IsAllocated());
  for (int i = 0; i < 99; ++i) row.AddColumn(VALUE_TYPE::Integer, 0);
  EXPECT_TRUE(row.IsAllocated());
  EXPECT_EQ(row.Count(), 99u);
  EXPECT_EQ(ThrownTexts<CValueException>([&] { row.AddColumn(VALUE_TYPE::Integer, 0); }),
            Texts{"Too many table columns (Module:Value,Method:CColumnValues::AddColumn)"});
  EXPECT_EQ(row.Count(), 99u);
  row.Release();
  EXPECT_FALSE(row.IsAllocated());
  EXPECT_EQ(row.Count(), 0u);
}

TEST(ColumnValues, TextColumnsReserveAtMost2000) {
  CColumnValues row;
  row.AddColumn(VALUE_TYPE::AsciiString, 5000);
  row.AddColumn(VALUE_TYPE::UnicodeString, 20);
  row.AddColumn(VALUE_TYPE::DateTime, 5000);
  EXPECT_EQ(row[0].NarrowCapacity(), 2010u);
  EXPECT_EQ(row[1].WideCapacity(), 30u);
  EXPECT_EQ(row[1].GetType(), VALUE_TYPE::UnicodeString);
  EXPECT_EQ(row[2].GetType(), VALUE_TYPE::DateTime);
  EXPECT_EQ(row[2].NarrowCapacity(), 0u);
  EXPECT_EQ(ThrownTexts<CValueException>([&] { row[3]; }),
            Texts{"General Error (Module:Value,Method:CColumnValues::GetColumn)"});
}

TEST(ColumnValues, FailedAllocationIsReported) {
  CColumnValues row;
  {
    test::AllocationLimit limit(64);
    EXPECT_EQ(ThrownTexts<CValueException>([&] { row.AddColumn(VALUE_TYPE::Integer, 0); }),
              Texts{"Eror allocating memory (Module:Value,Method:CColumnValues::AllocateColumns)"});
  }
  EXPECT_FALSE(row.IsAllocated());
  row.AddColumn(VALUE_TYPE::Integer, 0);
  EXPECT_EQ(row.Count(), 1u);
}

}  // namespace
}  // namespace qm
