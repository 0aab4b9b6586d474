// Cutting text into words: the separator option and set, taking words off the
// front of a text with the sentence-end rule, search terms cut at their
// wildcards, block removal and blank trims.
#include <gtest/gtest.h>

#include <set>
#include <string>

#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "support/file_test_util.h"
#include "text/blank_trim.h"
#include "text/next_word.h"
#include "text/separators.h"
#include "text/split.h"

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
  EXPECT_EQ(BuildSeparators(u"x%7ab", false), u"x\a");  // leading digits only

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
  for (char32_t c : {U'A', U'\U0001F601', char32_t(0xD83D)}) {
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

// Every word with its code, "WORD/code", up to and including code 1.
std::string TakeAll(std::u16string_view text, const CSeparatorSet& set = CSeparatorSet(DefaultSeparators())) {
  std::string out;
  CWordBuffer word;
  for (int guard = 0; guard < 1000; ++guard) {
    const NextWordCode code = NextWord(text, word, set);
    out += (out.empty() ? "" : " ") + Utf16ToUtf8(word.View()) + "/" + std::to_string(static_cast<int>(code));
    if (code == NextWordCode::kNoMoreWords) return out;
  }
  return out + " STALLED";
}

TEST(NextWord, SentenceEndNeedsAMarkThenSeparatorsUpToABlank) {
  EXPECT_EQ(TakeAll(u"END. NEXT "), "END/2 NEXT/3 /1");
  EXPECT_EQ(TakeAll(u"AB? C AB; C AB:\tC AB! C "), "AB/2 C/3 AB/2 C/3 AB/2 C/3 AB/3 C/3 /1");
  // The blank must itself be a separator.
  EXPECT_EQ(TakeAll(u"END. NEXT", CSeparatorSet(u".")), "END/3  NEXT/0 /1");
}

TEST(NextWord, LongRunGivesItsFirst198UnitsAndDropsTheRest) {
  EXPECT_EQ(TakeAll(std::u16string(198, u'A') + u"BBBB. NEXT "), std::string(198, 'A') + "/2 NEXT/3 /1");
  // A cut never splits a surrogate pair.
  std::u16string pairs = u"X";
  for (int i = 0; i < 120; ++i) pairs += u"\U00010400";
  std::u16string_view rest = pairs += u" ";
  CWordBuffer word;
  NextWord(rest, word, CSeparatorSet(u" "));
  EXPECT_EQ(word.Length(), 197u);
  EXPECT_TRUE(rest.empty());
}

// "start kind/count | piece kind/count:text ... | flags"
std::string Describe(std::u16string_view term) {
  CSplit s;
  s.SplitW(term);
  std::string out = std::to_string(static_cast<int>(s.StartKind())) + "/" + std::to_string(s.StartCount()) + " |";
  for (const auto& p : s.Pieces()) {
    out += " " + std::to_string(static_cast<int>(p.kind)) + "/" + std::to_string(p.count) + ":" + Utf16ToUtf8(p.text);
  }
  out += " |";
  if (s.TrailingAsterisk()) out += " *";
  if (s.TrailingQuestionMarks()) out += " ?" + std::to_string(s.TrailingQuestionMarkCount());
  if (s.IsPlainWord()) out += " plain";
  return out;
}

TEST(SplitW, PiecesKindsAndFlags) {
  EXPECT_EQ(Describe(u"RIVER"), "3/0 | 3/0:RIVER | plain");
  EXPECT_EQ(Describe(u"*RI??ER*S"), "1/0 | 1/0:RI 2/2:ER 1/0:S |");
  // A run that holds an asterisk matches any length.
  EXPECT_EQ(Describe(u"A?*?B"), "3/0 | 3/0:A 1/2:B |");
  // A prefix pattern is not an exact word.
  EXPECT_EQ(Describe(u"RIVER*"), "3/0 | 3/0:RIVER | *");
  // A single trailing question mark is kept: RIVE? is not the word RIVE.
  EXPECT_EQ(Describe(u"RIVE?"), "3/0 | 3/0:RIVE | ?1");
  EXPECT_EQ(Describe(u"RIV???"), "3/0 | 3/0:RIV | ?3");
}

TEST(SplitW, EscapedWildcardsAreLiteral) {
  EXPECT_EQ(Describe(u"A\\*B\\?C\\#D\\E"), "3/0 | 3/0:A*B?C#DE | plain");
  // A stray backslash still makes a piece: an empty one after the asterisk.
  EXPECT_EQ(Describe(u"A*\\"), "3/0 | 3/0:A 1/0: |");
}

TEST(SplitW, MoreThanElevenPiecesIsAnError) {
  CSplit s;
  s.SplitW(u"A*B*C*D*E*F*G*H*I*J*K");
  EXPECT_EQ(s.Pieces().size(), 11u);
  EXPECT_EQ(test::RaisedText<CStringFuncUException>([&] { s.SplitW(u"A*B*C*D*E*F*G*H*I*J*K*L"); }),
            "Too many words (Module:StringFuncU,Method:CSplit::SplitW)");
  EXPECT_TRUE(s.Pieces().empty());
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
  EXPECT_EQ(test::RaisedText<CStringFuncUException>([&] { TrimRightW(too_long); }),
            "String too long (Module:StringFuncU,Method:TrimRightW)");
  EXPECT_EQ(too_long.size(), 2000u);
}

}  // namespace
}  // namespace qm
