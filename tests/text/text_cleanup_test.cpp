// Block removal and blank trims.
#include <gtest/gtest.h>

#include <string>

#include "shared/exception_family.h"
#include "text/blank_trim.h"
#include "text/remove_blocks.h"

namespace qm {
namespace {

std::u16string Removed(std::u16string text, std::u16string_view open, std::u16string_view close) {
  RemoveBlocks(text, open, close);
  return text;
}

TEST(RemoveBlocks, EveryStretchGoesAndAnUnclosedOneTakesTheRest) {
  EXPECT_EQ(Removed(u"a<b>c<i>d</i>e", u"<", u">"), u"acde");
  EXPECT_EQ(Removed(u"a>b<c>d", u"<", u">"), u"a>bd");
  EXPECT_EQ(Removed(u"A<SCRIPT x>1<2</SCRIPT>B<SCRIPT>C</SCRIPT>", u"<SCRIPT", u"</SCRIPT>"), u"AB");
  EXPECT_EQ(Removed(u"keep<lost forever", u"<", u">"), u"keep");
  EXPECT_EQ(Removed(u"text", u"", u">"), u"text");
  std::string narrow = "\xC3\xA9t\xC3\xA9<p>\xC3\xA0<";
  RemoveBlocks(narrow, "<", ">");
  EXPECT_EQ(narrow, "\xC3\xA9t\xC3\xA9\xC3\xA0");
}

TEST(BlankTrim, FourBlanksOnlyAndAtMost1999Characters) {
  std::u16string text = u" \t\r\n\vword\v \n";
  TrimLeftW(text);
  TrimRightW(text);
  EXPECT_EQ(text, u"\vword\v");

  std::u16string ok(1999, u' ');
  TrimLeftW(ok);
  EXPECT_TRUE(ok.empty());
  std::u16string too_long = u"x" + std::u16string(1999, u' ');
  try {
    TrimRightW(too_long);
    FAIL() << "no error";
  } catch (const CStringFuncUException& e) {
    EXPECT_EQ(e.GetCurrentEntry().text, u"String too long (Module:StringFuncU,Method:TrimRightW)");
  }
  EXPECT_EQ(too_long.size(), 2000u);
}

}  // namespace
}  // namespace qm
