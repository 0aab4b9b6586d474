// The separator option text and the set built from it.
#include <gtest/gtest.h>

#include <set>
#include <string>

#include "text/separators.h"

namespace qm {
namespace {

std::set<char16_t> AsSet(const std::u16string& text) { return {text.begin(), text.end()}; }

TEST(SeparatorOption, DefaultsEscapesAndPlaceholders) {
  std::set<char16_t> defaults{u';', u',', u'.', u'(', u')', u'"', u'?', u'!', u':', u'-', u'{', u'}', u'[',
                              u']', u'/', u'&', u'*', u'+', u'\\', u'<', u'>', u'=', u'|', u'\'', u'`', u'_'};
  for (char16_t c = 1; c <= 32; ++c) defaults.insert(c);
  EXPECT_EQ(AsSet(BuildSeparators(u"", true)), defaults);
  EXPECT_EQ(BuildSeparators(u"", true).size(), defaults.size());
  EXPECT_EQ(BuildSeparators(u"", false), u"");

  EXPECT_EQ(BuildSeparators(u"%045<TAB>", false), u"-\t");
  // A zero keeps the per cent sign; the digits after it are plain characters.
  EXPECT_EQ(BuildSeparators(u"%000", false), u"%000");
  EXPECT_EQ(BuildSeparators(u"%45", false), u"%45");   // fewer than three characters follow
  EXPECT_EQ(BuildSeparators(u"x%7ab", false), u"x\a");  // leading digits only
  EXPECT_EQ(BuildSeparators(u"%171%187", false), u"\u00AB\u00BB");

  EXPECT_EQ(BuildSeparators(u"<SPACE><TAB><LINE_FEED><NEW_LINE><space>", false), u" \t\r\n<space>");
  const std::u16string all = BuildSeparators(u"<ALL ASCII LESS THAN 33>#<ALL ASCII LESS THAN 33>", false);
  EXPECT_EQ(all.size(), 33u);
  EXPECT_EQ(AsSet(all).size(), 33u);
  EXPECT_EQ(all.front(), u'#');
}

TEST(SeparatorSet, MembershipAcrossTheWholeRange) {
  // A supplementary character (U+1F600) as a pair, a lone surrogate, the last BMP unit.
  const CSeparatorSet set(u"a\u00AB\uFFFF\U0001F600" + std::u16string(1, char16_t(0xDC05)));
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
  // The high half of a pair is no separator by itself, even at the end of a text.
  EXPECT_FALSE(set.IsSeparatorAt(smiles.substr(0, 1), 0, length));
}

}  // namespace
}  // namespace qm
