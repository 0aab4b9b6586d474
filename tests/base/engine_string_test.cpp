// CStr and CWStr: exact growth, bounds, copies, trims, searches, and failed
// allocations that trace and raise naming the operation.
#include <gtest/gtest.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "base/cstr.h"
#include "base/cwstr.h"
#include "base/exception_family.h"

namespace qm {
namespace {

using test::RaisedChain;
using Texts = std::vector<std::string>;

Texts General(const std::string& method) { return {"General Error (Module:Value,Method:" + method + ")"}; }

TEST(EngineString, AppendsAndCopiesGrow) {
  CStr s("abc");
  s.SCat("de");
  s.SCat("f", false);
  s.SCat("gh", false);
  EXPECT_EQ(s.Str(), "abcdefgh");
  s.SCopy(std::string(300, 'x'));
  s.SCopy("short");
  EXPECT_EQ(s.Str(), "short");
  CWStr w(u"ab");  // full as soon as the length + 1 reaches the capacity
  w.AddChar(u'c');
  EXPECT_EQ(w.Str(), u"abc");
}

TEST(EngineString, BoundsAndRangeCopies) {
  CStr s("ab");
  EXPECT_EQ(s.GetChar(1), 'b');
  EXPECT_EQ(s.GetChar(2), '\0');
  s.ReplaceChar(1, 'z');
  EXPECT_EQ(s.Str(), "az");
  CWStr w;  // never set: length 0, so only the terminator is readable
  EXPECT_EQ(w.GetChar(0), u'\0');
  CStr copy;
  copy.SCopy("hello", 1, 4);
  EXPECT_EQ(copy.Str(), "ell");
  copy.SCopy0("hello", 2);
  EXPECT_EQ(copy.Str(), "he");
  const std::pair<const char*, std::function<void()>> refused[] = {
      {"CStr::GetChar", [&] { s.GetChar(3); }},
      {"CStr::ReplaceChar", [&] { s.ReplaceChar(2, 'q'); }},
      {"CStr::SCopy", [&] { copy.SCopy("hello", 4, 2); }},
      {"CWStr::SCopy0", [&] { w.SCopy0(u"ab", 3); }},
  };
  for (const auto& [method, call] : refused) EXPECT_EQ(RaisedChain<CValueException>(call), General(method));
  EXPECT_EQ(copy.Str(), "he");  // a refused copy leaves the text alone
  EXPECT_EQ(s.Str(), "az");
}

TEST(EngineString, FailedAllocationsTraceAndRaiseNamingTheOperation) {
  test::ConfiguredHome home;
  CStr s("abc"), full("ab");
  CWStr w(u"abc");
  {
    test::AllocationLimit limit(100);
    const std::pair<const char*, std::function<void()>> failing[] = {
        {"CStr::CStr", [] { CStr t(std::string(150, 'x')); }},
        {"CStr::SCopy", [&] { s.SCopy(std::string(150, 'y')); }},
        {"CWStr::SCat", [&] { w.SCat(std::u16string(60, u'y')); }},
        {"CWStr::SCopy0", [&] { w.SCopy0(std::u16string(60, u'y'), 60); }},
    };
    for (const auto& [method, call] : failing) EXPECT_EQ(RaisedChain<CValueException>(call), General(method));
  }
  EXPECT_EQ(s.Str(), "abc");
  EXPECT_EQ(w.Str(), u"abc");
  EXPECT_EQ(RaisedChain<CValueException>([&] { s.Reserve(SIZE_MAX - 2); }), General("CStr::Reserve"));
  EXPECT_EQ(RaisedChain<CValueException>([&] { w.Reserve(SIZE_MAX / 2); }), General("CWStr::Reserve"));
  {
    test::AllocationLimit limit(4);  // a string that has room grows by AddChar only when full
    EXPECT_EQ(RaisedChain<CValueException>([&] { full.AddChar('c'); }), General("CStr::AddChar"));
  }
  EXPECT_TRUE(test::Has(test::TraceOf(home, "ShareLib"),
                        " Value.CStr - Could not allocate memory 2, aborting\r\n"));
}

}  // namespace
}  // namespace qm
