// The separator option text and the set built from it.
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>

#include "text/separators.h"

namespace qm {
namespace {

std::set<char16_t> AsSet(const std::u16string& text) { return {text.begin(), text.end()}; }

std::set<char16_t> Codes1To32() {
  std::set<char16_t> s;
  for (char16_t c = 1; c <= 32; ++c) s.insert(c);
  return s;
}

TEST(SeparatorOption, EmptyOptionWithDefaultsIsExactlyTheDefaultList) {
  const std::u16string built = BuildSeparators(u"", true);
  EXPECT_EQ(built, DefaultSeparators());
  std::set<char16_t> expected = Codes1To32();
  for (char16_t c : std::u16string(u";,.()\"?!:-{}[]/&*+\\<>=|'`_")) expected.insert(c);
  EXPECT_EQ(AsSet(built), expected);
  EXPECT_EQ(BuildSeparators(u"", false), u"");
}

TEST(SeparatorOption, EscapesReadThreeDecimalDigits) {
  EXPECT_EQ(AsSet(BuildSeparators(u"%045<TAB>", false)), (std::set<char16_t>{u'-', u'\t'}));
  // A zero keeps the per cent sign; the digits that follow are plain characters.
  EXPECT_EQ(AsSet(BuildSeparators(u"%000", false)), (std::set<char16_t>{u'%', u'0'}));
  // Fewer than three characters after "%": no escape.
  EXPECT_EQ(BuildSeparators(u"%45", false), u"%45");
  // Leading digits only: "7ab" reads as 7, which replaces all four characters.
  EXPECT_EQ(BuildSeparators(u"x%7ab", false), u"x\a");
  EXPECT_EQ(BuildSeparators(u"%ab1", false), u"%ab1");
  EXPECT_EQ(BuildSeparators(u"%171%187", false), u"\u00AB\u00BB");
}

TEST(SeparatorOption, PlaceholdersAndTheirCodes) {
  EXPECT_EQ(BuildSeparators(u"<SPACE><TAB><LINE_FEED><NEW_LINE>", false), u" \t\r\n");
  EXPECT_EQ(BuildSeparators(u"a<SPACE>b<SPACE>", false), u"a b ");
  // Lower case is not a placeholder.
  EXPECT_EQ(BuildSeparators(u"<space>", false), u"<space>");
}

TEST(SeparatorOption, AllAsciiBelow33AddsTheCodesOnce) {
  const std::u16string built = BuildSeparators(u"<ALL ASCII LESS THAN 33>#<ALL ASCII LESS THAN 33>", false);
  EXPECT_EQ(built.find(u"<ALL"), std::u16string::npos);
  EXPECT_EQ(std::count(built.begin(), built.end(), u' '), 1);
  std::set<char16_t> expected = Codes1To32();
  expected.insert(u'#');
  EXPECT_EQ(AsSet(built), expected);
  EXPECT_EQ(built.size(), 33u);
}

TEST(SeparatorSet, MembershipAcrossTheWholeRange) {
  // A supplementary character (U+1F600) as a pair, a lone surrogate, a last BMP unit.
  const std::u16string text = u"a\u00AB\uFFFF\U0001F600" + std::u16string(1, char16_t(0xDC05));
  const CSeparatorSet set(text);
  for (char32_t c : {U'a', U'\u00AB', U'\uFFFF', U'\U0001F600', char32_t(0xDC05)}) {
    EXPECT_TRUE(set.Contains(c)) << static_cast<unsigned>(c);
  }
  for (char32_t c : {U'b', U'A', U'\u00AA', U'\U0001F601', char32_t(0xD83D), U'\U0010FFFF'}) {
    EXPECT_FALSE(set.Contains(c)) << static_cast<unsigned>(c);
  }

  std::size_t length = 0;
  const std::u16string smiles = u"\U0001F600\U0001F601";
  EXPECT_TRUE(set.IsSeparatorAt(smiles, 0, length));
  EXPECT_EQ(length, 2u);
  EXPECT_FALSE(set.IsSeparatorAt(smiles, 2, length));
  EXPECT_EQ(length, 2u);
  // The high half of a pair is not a separator by itself, even when it ends the text.
  EXPECT_FALSE(set.IsSeparatorAt(smiles.substr(0, 1), 0, length));
  EXPECT_EQ(length, 1u);
}

}  // namespace
}  // namespace qm
