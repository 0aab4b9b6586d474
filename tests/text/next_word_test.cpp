// Taking words off the front of a text, and the sentence-end rule.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "text/next_word.h"

namespace qm {
namespace {

struct Taken {
  std::u16string word;
  NextWordCode code;
  bool operator==(const Taken&) const = default;
};

std::ostream& operator<<(std::ostream& os, const Taken& t) {
  std::string narrow;
  for (char16_t c : t.word) narrow += c < 0x80 ? static_cast<char>(c) : '?';
  return os << "{\"" << narrow << "\", " << static_cast<int>(t.code) << "}";
}

std::vector<Taken> TakeAll(std::u16string_view text, const CSeparatorSet& set) {
  std::vector<Taken> out;
  CWordBuffer word;
  for (int guard = 0; guard < 10000; ++guard) {
    const NextWordCode code = NextWord(text, word, set);
    out.push_back({std::u16string(word.View()), code});
    if (code == NextWordCode::kNoMoreWords) return out;
  }
  ADD_FAILURE() << "NextWord did not reach the end";
  return out;
}

const CSeparatorSet& Defaults() {
  static const CSeparatorSet set(DefaultSeparators());
  return set;
}

constexpr auto kWord = NextWordCode::kWord;
constexpr auto kEnd = NextWordCode::kSentenceEnd;
constexpr auto kLast = NextWordCode::kLastWord;
constexpr auto kNone = NextWordCode::kNoMoreWords;

TEST(NextWord, SentenceEndNeedsABlankAfterTheMark) {
  EXPECT_EQ(TakeAll(u"END. NEXT ", Defaults()),
            (std::vector<Taken>{{u"END", kEnd}, {u"NEXT", kWord}, {u"", kNone}}));
  EXPECT_EQ(TakeAll(u"END.NEXT ", Defaults()),
            (std::vector<Taken>{{u"END", kWord}, {u"NEXT", kWord}, {u"", kNone}}));
  // Every sentence-end mark counts; "!" does not.
  for (char16_t mark : std::u16string(u".?;:")) {
    EXPECT_EQ(TakeAll(u"AB" + std::u16string(1, mark) + u"\tC ", Defaults())[0].code, kEnd);
  }
  EXPECT_EQ(TakeAll(u"AB! C ", Defaults())[0].code, kWord);
}

TEST(NextWord, SentenceEndScansThroughSeparatorsForABlank) {
  // A bracket after the full stop, then a line feed: still a sentence end.
  EXPECT_EQ(TakeAll(u"END.)\nNEXT ", Defaults())[0], (Taken{u"END", kEnd}));
  // Separators followed directly by a word: no blank came first.
  EXPECT_EQ(TakeAll(u"END..NEXT ", Defaults())[0], (Taken{u"END", kWord}));
  // The blank must itself be a separator of the set.
  const CSeparatorSet dots_only(u".");
  EXPECT_EQ(TakeAll(u"END. NEXT", dots_only)[0], (Taken{u"END", kWord}));
}

TEST(NextWord, OneLetterBeforeAFullStopNeverEndsASentence) {
  EXPECT_EQ(TakeAll(u"J. SMITH ", Defaults())[0], (Taken{u"J", kWord}));
  // A single character outside the BMP is one letter too.
  EXPECT_EQ(TakeAll(u"\U00010400. X ", Defaults())[0], (Taken{u"\U00010400", kWord}));
  EXPECT_EQ(TakeAll(u"\U00010400\U00010401. X ", Defaults())[0].code, kEnd);
}

TEST(NextWord, SeparatorsOnlyGiveOneBlankLastWordThenNothing) {
  EXPECT_EQ(TakeAll(u" ", Defaults()), (std::vector<Taken>{{u" ", kLast}, {u"", kNone}}));
  EXPECT_EQ(TakeAll(u"", Defaults()), (std::vector<Taken>{{u"", kNone}}));
  // "wait..." plus the appended blank leaves ".. " behind the sentence end.
  EXPECT_EQ(TakeAll(u"WAIT... ", Defaults()),
            (std::vector<Taken>{{u"WAIT", kEnd}, {u".. ", kLast}, {u"", kNone}}));
}

TEST(NextWord, RunWithoutClosingSeparatorIsTheLastWord) {
  // Leading separators are not part of it; it is cut to 197 units.
  EXPECT_EQ(TakeAll(u"..ABC", Defaults()), (std::vector<Taken>{{u"ABC", kLast}, {u"", kNone}}));
  const std::u16string long_run(250, u'Q');
  const auto taken = TakeAll(long_run, Defaults());
  ASSERT_EQ(taken.size(), 2u);
  EXPECT_EQ(taken[0], (Taken{long_run.substr(0, 197), kLast}));
}

TEST(NextWord, LongRunGivesItsFirst198UnitsAndDropsTheRest) {
  std::u16string text(198, u'A');
  text += u"BBBB. NEXT ";
  EXPECT_EQ(TakeAll(text, Defaults()),
            (std::vector<Taken>{{std::u16string(198, u'A'), kEnd}, {u"NEXT", kWord}, {u"", kNone}}));
  // A cut never splits a surrogate pair.
  std::u16string pairs;
  for (int i = 0; i < 120; ++i) pairs += u"\U00010400";
  const auto taken = TakeAll(u"X" + pairs + u" ", Defaults());
  ASSERT_EQ(taken.size(), 2u);
  EXPECT_EQ(taken[0].word.size(), 197u);
  EXPECT_EQ(taken[0].word.back(), char16_t(0xDC00));
}

TEST(NextWord, SupplementarySeparatorCutsOnlyWhereItStands) {
  const CSeparatorSet set(u" \U0001F600");
  // U+1F601 shares its high surrogate with the separator U+1F600.
  EXPECT_EQ(TakeAll(u"A\U0001F601B\U0001F600C ", set),
            (std::vector<Taken>{{u"A\U0001F601B", kWord}, {u"C", kWord}, {u"", kNone}}));
}

}  // namespace
}  // namespace qm
