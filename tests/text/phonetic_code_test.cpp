// Properties of the phonet engine and Double Metaphone beyond the reference
// tables: characters no rule can name, odd rule files, and arbitrary input.
#include <gtest/gtest.h>

#include <random>
#include <string>

#include "platform/text_encoding.h"
#include "text/double_metaphone.h"
#include "text/phonet.h"

namespace qm::test {
namespace {

std::string Code(const text::PhonetRules& rules, const std::u16string& word) {
  std::u16string out;
  std::u16string work;
  rules.Encode(word, out, work);
  return Utf16ToUtf8(out);
}

TEST(Phonet, CharactersBeyondLatin1PassThroughUnchanged) {
  const auto rules = text::PhonetRules::Parse("version 1\nA X\nB Y\n");
  EXPECT_EQ(Code(rules, u"AЖB"), "XЖY");
  EXPECT_EQ(Code(rules, u"ЖУК"), "ЖУК");
  EXPECT_EQ(Code(rules, u"CA"), "X");  // a Latin-1 letter without rules is dropped
}

TEST(Phonet, CommentsKeywordsAndLineEndsAreRead) {
  const auto rules = text::PhonetRules::Parse(
      "# comment\r\n  version 2 # trailing\r\nfollowup no\r\ncollapse_result true\r\n"
      "\tA   B C   # a value with an inner blank\r\nD _\r\nE\r\nF G\\#H\n");
  EXPECT_FALSE(rules.Followup());
  EXPECT_TRUE(rules.CollapseResult());
  EXPECT_TRUE(rules.RemoveAccents());
  EXPECT_EQ(rules.RuleCount(), 4u);
  EXPECT_EQ(Code(rules, u"A"), "B");  // cut to the word's length
  EXPECT_EQ(Code(rules, u"AAA"), "B C");
  EXPECT_EQ(Code(rules, u"DEX"), "");
  EXPECT_EQ(Code(rules, u"FXXX"), "G\\#H");
}

TEST(Phonet, ANulEndsTheWordAndTheRuleLine) {
  const auto rules = text::PhonetRules::Parse(std::string("A B\0C\nC D\n", 10));
  EXPECT_EQ(Code(rules, std::u16string(u"AC\0C", 4)), "BD");
}

// Rules and words from a small alphabet so that patterns often match: every
// marker, groups, broken rules, rewrites and restarts.
TEST(Phonet, ArbitraryRulesAndWordsAlwaysEndWithABoundedCode) {
  std::mt19937 random(3);
  const std::string pattern_chars = "ABCABCAB()-<^$0123456789*";
  for (int file = 0; file < 300; ++file) {
    std::string bytes = file % 2 ? "followup 0\n" : "collapse_result 1\n";
    const int count = 1 + static_cast<int>(random() % 20);
    for (int r = 0; r < count; ++r) {
      std::string pattern(1, "ABC*"[random() % 4]);
      const int length = static_cast<int>(random() % 7);
      for (int i = 0; i < length; ++i) pattern += pattern_chars[random() % pattern_chars.size()];
      std::string replacement;
      const int rlength = static_cast<int>(random() % 5);
      for (int i = 0; i < rlength; ++i) replacement += "ABC*X"[random() % 5];
      bytes += pattern + " " + (replacement.empty() ? "_" : replacement) + "\n";
    }
    const auto rules = text::PhonetRules::Parse(bytes);
    for (int w = 0; w < 30; ++w) {
      std::u16string word;
      const int length = static_cast<int>(random() % 12);
      for (int i = 0; i < length; ++i) word += u"ABCABCЖ*"[random() % 8];
      std::u16string out;
      std::u16string work;
      rules.Encode(word, out, work);
      // Each step consumes a character; only restarts and characters beyond
      // Latin-1 may pass the length cap, once each.
      EXPECT_LE(out.size(), 2 * word.size()) << bytes << Utf16ToUtf8(word);
    }
  }
}

TEST(DoubleMetaphone, ArbitraryInputGivesOnlyCodeLetters) {
  std::mt19937 random(5);
  const std::u16string alphabet = u"ABCDEFGHIJKLMNOPQRSTUVWXYZ ÇÑÉЖ-'";
  std::u16string code;
  for (int n = 0; n < 20000; ++n) {
    std::u16string word;
    const int length = static_cast<int>(random() % 14);
    for (int i = 0; i < length; ++i) word += alphabet[random() % alphabet.size()];
    text::DoubleMetaphonePrimary(word, code);
    EXPECT_EQ(code.find_first_not_of(u"0AFHJKLMNPRSTX"), std::u16string::npos)
        << Utf16ToUtf8(word) << " -> " << Utf16ToUtf8(code);
    EXPECT_LE(code.size(), 2 * word.size() + 1);
  }
}

}  // namespace
}  // namespace qm::test
