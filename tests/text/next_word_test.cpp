// Taking words off the front of a text, and the sentence-end rule.
#include <gtest/gtest.h>

#include <string>

#include "platform/text_encoding.h"
#include "text/next_word.h"

namespace qm {
namespace {

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
  EXPECT_EQ(TakeAll(u"END.NEXT "), "END/3 NEXT/3 /1");
  EXPECT_EQ(TakeAll(u"AB? C AB; C AB:\tC AB! C "), "AB/2 C/3 AB/2 C/3 AB/2 C/3 AB/3 C/3 /1");
  EXPECT_EQ(TakeAll(u"END.)\nNEXT END..NEXT "), "END/2 NEXT/3 END/3 NEXT/3 /1");
  // A one-letter word before a full stop is an initial.
  EXPECT_EQ(TakeAll(u"J. SMITH "), "J/3 SMITH/3 /1");
  // The blank must itself be a separator.
  EXPECT_EQ(TakeAll(u"END. NEXT", CSeparatorSet(u".")), "END/3  NEXT/0 /1");
}

TEST(NextWord, WhatIsLeftAtTheEnd) {
  EXPECT_EQ(TakeAll(u""), "/1");
  EXPECT_EQ(TakeAll(u" "), " /0 /1");
  // "wait..." with the appended blank leaves ".. " after the sentence end.
  EXPECT_EQ(TakeAll(u"WAIT... "), "WAIT/2 .. /0 /1");
  // A run that no separator closes: its leading separators are not part of it.
  EXPECT_EQ(TakeAll(u"..ABC"), "ABC/0 /1");
  EXPECT_EQ(TakeAll(std::u16string(250, u'Q')), std::string(197, 'Q') + "/0 /1");
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

TEST(NextWord, SupplementarySeparatorCutsOnlyWhereItStands) {
  // U+1F601 shares its high surrogate with the separator U+1F600.
  EXPECT_EQ(TakeAll(u"A\U0001F601B\U0001F600C ", CSeparatorSet(u" \U0001F600")),
            "A\U0001F601B/3 C/3 /1");
}

}  // namespace
}  // namespace qm
