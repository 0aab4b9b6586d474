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

TEST(RemoveBlocks, RemovesEveryStretchBothEndsIncluded) {
  EXPECT_EQ(Removed(u"a<b>c<i>d</i>e", u"<", u">"), u"acde");
  EXPECT_EQ(Removed(u"<x><y>", u"<", u">"), u"");
  EXPECT_EQ(Removed(u"no tags", u"<", u">"), u"no tags");
  // The close is looked for after the open only.
  EXPECT_EQ(Removed(u"a>b<c>d", u"<", u">"), u"a>bd");
  EXPECT_EQ(Removed(u"A<SCRIPT x>1<2</SCRIPT>B<SCRIPT>C</SCRIPT>", u"<SCRIPT", u"</SCRIPT>"), u"AB");
}

TEST(RemoveBlocks, OpenWithoutCloseRemovesTheRest) {
  EXPECT_EQ(Removed(u"keep<lost forever", u"<", u">"), u"keep");
  EXPECT_EQ(Removed(u"a<b>c<", u"<", u">"), u"ac");
  EXPECT_EQ(Removed(u"text", u"", u">"), u"text");
  std::string narrow = "\xC3\xA9t\xC3\xA9<p>\xC3\xA0";
  RemoveBlocks(narrow, "<", ">");
  EXPECT_EQ(narrow, "\xC3\xA9t\xC3\xA9\xC3\xA0");
}

TEST(BlankTrim, RemovesTheFourBlanksOnly) {
  std::u16string text = u" \t\r\n\vword\v \n";
  TrimLeftW(text);
  EXPECT_EQ(text, u"\vword\v \n");
  TrimRightW(text);
  EXPECT_EQ(text, u"\vword\v");
  EXPECT_EQ(TrimBlanks(u"\t x y \r"), u"x y");
  EXPECT_EQ(TrimBlanks(u" \t "), u"");
}

TEST(BlankTrim, MoreThan1999CharactersIsAnError) {
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
  EXPECT_THROW(TrimLeftW(too_long), CStringFuncUException);
}

}  // namespace
}  // namespace qm
