// CValue: text buffers, dates from text, comparisons and matches per type, and
// the column row CColumnValues.
#include "base/value.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "base/exception_family.h"

namespace qm {

// Found by argument-dependent lookup, so failures print dates readably.
void PrintTo(const DateTimeValue& d, std::ostream* os) {
  *os << d.year << "-" << d.month << "-" << d.day << " " << d.hour << ":" << d.minute << ":"
      << d.second << "." << d.fraction;
}

namespace {

using test::RaisedChain;
using test::Value;
using Texts = std::vector<std::string>;

DateTimeValue Date(int y, int mo, int d, int h = 0, int mi = 0, int s = 0, uint32_t f = 0) {
  return {static_cast<int16_t>(y), static_cast<uint16_t>(mo), static_cast<uint16_t>(d),
          static_cast<uint16_t>(h), static_cast<uint16_t>(mi), static_cast<uint16_t>(s), f};
}

TEST(ValueText, BuffersOutliveATypeChangeAndFailedAllocationsNamePreStr) {
  CValue v;
  v.SetText(std::string(100, 'x'));
  v.SetTextW(u"abc");
  EXPECT_EQ(v.GetType(), VALUE_TYPE::UnicodeString);
  v.SetInteger(4);
  v.SetText("again");
  EXPECT_EQ(v.NarrowCapacity(), 110u);  // ten units of slack, kept from the first text
  EXPECT_EQ(v.Narrow(), "again");

  CValue small;
  test::AllocationLimit limit(100);
  const Texts pre_str{"General Error (Module:Value,Method:PreStr)"};
  EXPECT_EQ(RaisedChain<CValueException>([&] { small.ReserveNarrow(200); }), pre_str);
  EXPECT_EQ(RaisedChain<CValueException>([&] { small.ReserveNarrow(SIZE_MAX - 3); }), pre_str);
  EXPECT_EQ(RaisedChain<CValueException>([&] { small.ReserveWide(50); }),
            Texts{"General Error (Module:Value,Method:PreStrW)"});
}

TEST(ValueDate, TextFormsWithMarkersTimesAndUpperBoundPresets) {
  struct Case {
    const char* text;
    bool upper;
    DateTimeValue expected;
  };
  const Case cases[] = {
      {"12/31/99 11:00:00 PM", false, Date(1999, 12, 31, 23)},
      {"1/2/50", false, Date(2050, 1, 2)},
      {"1/2/51", false, Date(1951, 1, 2)},
      {"1/1/2000 12 AM", false, Date(2000, 1, 1, 0)},
      {"1/1/2000 12 PM", false, Date(2000, 1, 1, 12)},
      {"1/1/2000 1:05 pm", false, Date(2000, 1, 1, 13, 5)},
      {"1/1/2000 13:05 PM", false, Date(2000, 1, 1, 13, 5)},  // already past noon
      {"2004-3-9 14:5:7", false, Date(2004, 3, 9, 14, 5, 7)},
      {"2004-3-9 14:5:7.25", false, Date(2004, 3, 9, 14, 5, 7, 250000000)},
      {"12/31/1999", true, Date(1999, 12, 31, 25, 61, 61)},
      // A missing date field ends parsing with what was read.
      {"12/31", true, Date(0, 12, 31, 25, 61, 61)},
      {"", false, Date(0, 0, 0)},
  };
  for (const Case& c : cases) {
    CValue v;
    v.SetDateFromText(c.text, c.upper);
    EXPECT_EQ(v.GetType(), VALUE_TYPE::DateTime) << c.text;
    EXPECT_EQ(v.GetDateTime(), c.expected) << c.text;
  }
  CValue bound;
  bound.SetDateFromText("3/9/2004", true);
  const CValue last = Value(Date(2004, 3, 9, 23, 59, 59, 999999999));
  EXPECT_EQ(bound.Compare(last), 1);
  EXPECT_EQ(last.Compare(bound), -1);
}

TEST(ValueDate, InvalidFieldsRaiseInsteadOfStoringGarbage) {
  for (const char* text : {"13/1/2000", "1/32/2000", "1/1/2000 24:00", "2004-13-1", "1/1/20x0",
                           "2004-3-9 1:2:3 more", "1/1/2000 10:00 XM", "1/1/99999999999999"}) {
    CValue v = Value(7);
    EXPECT_EQ(RaisedChain<CValueException>([&] { v.SetDateFromText(text, false); }),
              Texts{"Invalid date or time: " + std::string(text) +
                    " (Module:Value,Method:CValue::SetDateFromText)"});
    EXPECT_EQ(v.GetType(), VALUE_TYPE::Integer) << text;  // nothing half-stored
  }
}

TEST(ValueCompare, EachTypeOrdersItsOwnWay) {
  const double nan = std::numeric_limits<double>::quiet_NaN();
  CValue odd = Value(1);
  odd.SetType(static_cast<VALUE_TYPE>(5));
  struct Case {
    CValue a, b;
    int32_t expected;
  };
  const Case cases[] = {
      {Value("\xC3\xA9"), Value("z"), 1},  // bytes compare unsigned: 0xC3 > 'z'
      {Value("ab"), Value("abc"), -1},
      // Wide text compares by code unit: a surrogate (D800) sorts below U+FF00.
      {Value(u"\uFF00"), Value(u"\U00010000"), 1},
      {Value(-5), Value(3), -1},
      {Value(Date(2004, 3, 9, 1, 2, 3, 5)), Value(Date(2004, 3, 9, 1, 2, 3, 4)), 1},
      {Value(Date(-1, 12, 31)), Value(Date(2004, 3, 9)), -1},
      {odd, Value(Date(-1, 12, 31)), kNotComparable},
      {Value(nan), Value(1.0), 10},  // not a number cannot be ordered
      {Value(0.5), Value(1.0), -1},
  };
  for (std::size_t i = 0; i < std::size(cases); ++i) EXPECT_EQ(cases[i].a.Compare(cases[i].b), cases[i].expected) << i;
}

TEST(ValueMatch, FilterSemanticsPerType) {
  // Text: a substring of this, not the other way; numbers: this >= other.
  EXPECT_EQ(Value("river fish").Match(Value("fish")), 1);
  EXPECT_EQ(Value("fish").Match(Value("river fish")), 0);
  EXPECT_EQ(Value(4).Match(Value(3)), 1);
  EXPECT_EQ(Value(Date(2004, 3, 9)).Match(Value(Date(2004, 3, 9))), 1);
  EXPECT_EQ(Value(2.0).Match(Value(1.0)), 10);
}

TEST(ColumnValues, NinetyNineColumnsTextReservesAndFailures) {
  CColumnValues row;
  EXPECT_FALSE(row.IsAllocated());
  {
    test::AllocationLimit limit(64);
    EXPECT_EQ(RaisedChain<CValueException>([&] { row.AddColumn(VALUE_TYPE::Integer, 0); }),
              Texts{"Eror allocating memory (Module:Value,Method:CColumnValues::AllocateColumns)"});
  }
  EXPECT_FALSE(row.IsAllocated());
  row.AddColumn(VALUE_TYPE::AsciiString, 5000);  // text columns reserve at most 2,000
  row.AddColumn(VALUE_TYPE::UnicodeString, 20);
  row.AddColumn(VALUE_TYPE::DateTime, 5000);
  EXPECT_EQ(row[0].NarrowCapacity(), 2010u);
  EXPECT_EQ(row[1].WideCapacity(), 30u);
  EXPECT_EQ(RaisedChain<CValueException>([&] { row[3]; }),
            Texts{"General Error (Module:Value,Method:CColumnValues::GetColumn)"});
  for (int i = 3; i < 99; ++i) row.AddColumn(VALUE_TYPE::Integer, 0);
  EXPECT_TRUE(row.IsAllocated());
  EXPECT_EQ(RaisedChain<CValueException>([&] { row.AddColumn(VALUE_TYPE::Integer, 0); }),
            Texts{"Too many table columns (Module:Value,Method:CColumnValues::AddColumn)"});
  EXPECT_EQ(row.Count(), 99u);
}

}  // namespace
}  // namespace qm
