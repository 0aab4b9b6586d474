#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "shared/core_test_support.h"
#include "shared/cstr.h"
#include "shared/cwstr.h"

namespace qm {
namespace {

using test::ThrownTexts;
using Texts = std::vector<std::string>;

Texts General(const std::string& method) {
  return {"General Error (Module:Value,Method:" + method + ")"};
}

TEST(EngineStringCapacity, AssignAppendAndAddCharGrowToExactly) {
  EXPECT_EQ(CStr().Capacity(), 200u);
  EXPECT_EQ(CWStr().Capacity(), 200u);
  EXPECT_EQ(CWStr(u"ab").Capacity(), 3u);
  CStr s("abc");  // capacity 4
  s.SCat("de");   // 3 + 2 + 1, +1 for the terminator flag
  EXPECT_EQ(s.Capacity(), 7u);
  s.SCat("f", false);  // needs 5 + 1 + 1: fits, no growth
  EXPECT_EQ(s.Str(), "abcdef");
  EXPECT_EQ(s.Capacity(), 7u);
  s.SCat("gh", false);  // needs 6 + 2 + 1 = 9
  EXPECT_EQ(s.Capacity(), 9u);

  CStr t;
  t.SCopy(std::string(300, 'x'));
  EXPECT_EQ(t.Capacity(), 301u);
  t.SCopy("short");  // enough room: no change
  EXPECT_EQ(t.Capacity(), 301u);
  EXPECT_EQ(t.Str(), "short");

  CWStr w(u"ab");  // capacity 3: full as soon as the length + 1 reaches it
  w.AddChar(u'c');
  EXPECT_EQ(w.Capacity(), 13u);  // length 2 + 11
  EXPECT_EQ(w.Str(), u"abc");
}

TEST(EngineStringCapacity, ReserveKeepsTextOnlyWhileFivePlusNFits) {
  CStr s("hello");
  s.Reserve(0);  // capacity 6 >= 0 + 5
  EXPECT_EQ(s.Str(), "hello");
  s.Reserve(1);  // 6 < 6? no, 6 >= 6: kept
  EXPECT_EQ(s.Str(), "hello");
  s.Reserve(2);
  EXPECT_EQ(s.Str(), "");
  EXPECT_EQ(s.Capacity(), 2u);
  CWStr w;
  w.SCopy(u"x");
  w.Reserve(196);  // 200 < 201
  EXPECT_EQ(w.Capacity(), 196u);
  EXPECT_EQ(w.Length(), 0u);
}

TEST(EngineStringAccess, GetCharAndReplaceCharBounds) {
  CStr s("ab");
  EXPECT_EQ(s.GetChar(1), 'b');
  EXPECT_EQ(s.GetChar(2), '\0');
  EXPECT_EQ(ThrownTexts<CValueException>([&] { s.GetChar(3); }), General("CStr::GetChar"));
  s.ReplaceChar(1, 'z');
  EXPECT_EQ(s.Str(), "az");
  EXPECT_EQ(ThrownTexts<CValueException>([&] { s.ReplaceChar(2, 'q'); }),
            General("CStr::ReplaceChar"));
  CWStr w;  // never set: length 0, so only the terminator is readable
  EXPECT_EQ(w.GetChar(0), u'\0');
  EXPECT_EQ(ThrownTexts<CValueException>([&] { w.GetChar(1); }), General("CWStr::GetChar"));
  EXPECT_EQ(ThrownTexts<CValueException>([&] { w.ReplaceChar(0, u'x'); }),
            General("CWStr::ReplaceChar"));
}

TEST(EngineStringAccess, RangeAndPrefixCopies) {
  CStr s;
  s.SCopy("hello", 1, 4);
  EXPECT_EQ(s.Str(), "ell");
  s.SCopy0("hello", 2);
  EXPECT_EQ(s.Str(), "he");
  EXPECT_EQ(ThrownTexts<CValueException>([&] { s.SCopy("hello", 4, 2); }), General("CStr::SCopy"));
  EXPECT_EQ(ThrownTexts<CValueException>([&] { s.SCopy("hello", 0, 6); }), General("CStr::SCopy"));
  CWStr w;
  EXPECT_EQ(ThrownTexts<CValueException>([&] { w.SCopy0(u"ab", 3); }), General("CWStr::SCopy0"));
  EXPECT_EQ(s.Str(), "he");  // a refused copy leaves the text alone
}

TEST(EngineStringTrim, ModesOneTwoAndZero) {
  CStr both(" .a b. "), end("xxaxx");
  CWStr start(u"--a--");
  both.Trim(" .", 0);
  end.Trim("x", 1);
  start.Trim(u"-", 2);
  EXPECT_EQ(both.Str() + "|" + end.Str(), "a b|xxa");
  EXPECT_EQ(start.Str(), u"a--");
}

TEST(CWStrSearch, FindAndFindInList) {
  const CWStr text(u"river fish and more fish");
  EXPECT_EQ(text.Find(u"fish"), 6);
  EXPECT_EQ(text.Find(u"bird"), -1);

  int index = 7;
  EXPECT_EQ(text.FindInList({u"bird", u"and", u"fish"}, index), 11);
  EXPECT_EQ(index, 1);  // the first entry that occurs wins, not the earliest position
  // An empty entry ends the list.
  EXPECT_EQ(text.FindInList({u"bird", u"", u"fish"}, index), -1);
  EXPECT_EQ(index, -1);
  // Only the first 100 entries are tried.
  std::vector<std::u16string> list(100, u"bird");
  list.push_back(u"fish");
  EXPECT_EQ(text.FindInList(list, index), -1);
  list[99] = u"more";
  EXPECT_EQ(text.FindInList(list, index), 15);
  EXPECT_EQ(index, 99);
}

TEST(CWStrSearch, StripEnclosingAndSpecialCharacters) {
  CWStr quoted(u"(abc)");
  quoted.StripEnclosing(u'(', u')');
  EXPECT_EQ(quoted.Str(), u"abc");
  quoted.StripEnclosing(u'(', u')');
  EXPECT_EQ(quoted.Str(), u"abc");
  CWStr half(u"(abc");
  half.StripEnclosing(u'(', u')');
  EXPECT_EQ(half.Str(), u"(abc");

  const CWStr text(u"#a\\*b*=");
  const std::u16string_view set = u"*#=";
  EXPECT_FALSE(text.IsSpecialAt(0, set));  // "#" without a backslash before it
  EXPECT_FALSE(text.IsSpecialAt(1, set));  // not in the set
  EXPECT_TRUE(text.IsSpecialAt(3, set));   // "\*"
  EXPECT_FALSE(text.IsSpecialAt(5, set));  // "b*"
  EXPECT_TRUE(text.IsSpecialAt(6, set));   // "=" counts as it stands
  EXPECT_FALSE(text.IsSpecialAt(7, set));  // beyond the end
  EXPECT_FALSE(text.IsSpecialAt(6, u""));
}

TEST(EngineStringAllocation, FailedConstructionTracesAndRaises) {
  test::ConfiguredHome home;
  const std::string long_text(150, 'x');
  const std::u16string long_wide(150, u'x');
  {
    test::AllocationLimit limit(100);
    EXPECT_EQ(ThrownTexts<CValueException>([] { CStr s; }), General("CStr::CStr"));
    EXPECT_EQ(ThrownTexts<CValueException>([&] { CStr s(long_text); }), General("CStr::CStr"));
    EXPECT_EQ(ThrownTexts<CValueException>([] { CWStr s; }), General("CWStr::CWStr"));
    EXPECT_EQ(ThrownTexts<CValueException>([&] { CWStr s(long_wide); }), General("CWStr::CWStr"));
  }
  const std::string trace = test::TraceOf(home, "ShareLib");
  const char* expected[] = {" Value.CStr - Could not allocate memory 1, aborting\r\n",
                            " Value.CStr - Could not allocate memory 2, aborting\r\n",
                            " Value.CWStr - Could not allocate memory 1, aborting\r\n",
                            " Value.CWStr - Could not allocate memory 2, aborting\r\n"};
  std::size_t from = 0;
  for (const char* line : expected) {
    const auto at = trace.find(line, from);
    ASSERT_NE(at, std::string::npos) << line << " in\n" << trace;
    from = at + 1;
  }
}

TEST(EngineStringAllocation, FailedGrowthNamesTheOperation) {
  CStr s("abc");
  CWStr w(u"abc");
  {
    test::AllocationLimit limit(100);
    EXPECT_EQ(ThrownTexts<CValueException>([&] { s.SCopy(std::string(150, 'y')); }),
              General("CStr::SCopy"));
    EXPECT_EQ(ThrownTexts<CValueException>([&] { s.SCat(std::string(150, 'y')); }),
              General("CStr::SCopy"));
    EXPECT_EQ(ThrownTexts<CValueException>([&] { w.SCat(std::u16string(60, u'y')); }),
              General("CWStr::SCat"));
    EXPECT_EQ(ThrownTexts<CValueException>([&] { w.SCopy0(std::u16string(60, u'y'), 60); }),
              General("CWStr::SCopy0"));
  }
  EXPECT_EQ(s.Str(), "abc");
  EXPECT_EQ(w.Str(), u"abc");
  EXPECT_EQ(ThrownTexts<CValueException>([&] { s.Reserve(SIZE_MAX - 2); }),
            General("CStr::Reserve"));
  EXPECT_EQ(ThrownTexts<CValueException>([&] { w.Reserve(SIZE_MAX / 2); }),
            General("CWStr::Reserve"));
  // A string that has room grows by AddChar only when full.
  CStr full("ab");
  {
    test::AllocationLimit limit(4);
    EXPECT_EQ(ThrownTexts<CValueException>([&] { full.AddChar('c'); }), General("CStr::AddChar"));
  }
}

}  // namespace
}  // namespace qm
