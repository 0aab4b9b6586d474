// Preparing and splitting a value as the builder does: case, markup, words,
// positions and the language hook.
#include <gtest/gtest.h>

#include <random>
#include <set>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "text/blank_trim.h"
#include "text/word_splitter.h"

namespace qm {
namespace {

// "position:CUT" for every word considered, with "=FORM" where the form differs.
template <class Text>
std::string Words(CWordSplitter& splitter, const Text& text, std::int32_t position = 0) {
  std::string out;
  splitter.Split(text, position, [&](const SplitWord& w) {
    out += (out.empty() ? "" : " ") + std::to_string(w.position) + ":" + Utf16ToUtf8(w.cut) +
           (w.form == w.cut ? "" : "=" + Utf16ToUtf8(w.form));
  });
  return out;
}

TEST(WordSplitter, MarkupSentenceGapsCaseAndSeparators) {
  CWordSplitter plain(CSeparatorSet(DefaultSeparators()), false);
  CWordSplitter html(CSeparatorSet(DefaultSeparators()), true);
  // « is C2 AB and – is E2 80 93; ª (C2 AA) and — (E2 80 94) share bytes with them.
  CWordSplitter own(CSeparatorSet(BuildSeparators(u"\u00AB\u2013", true)), false);
  struct Case {
    CWordSplitter& splitter;
    std::string text, expected;
  };
  const Case cases[] = {
      // Tags go without leaving a blank; upper-casing comes first, so scripts go
      // in any case; an unclosed tag takes the rest.
      {html, "one<b>two", "1:ONETWO"},
      {html, "one <b> two", "1:ONE 2:TWO"},
      {html, "a<script>var x;</Script>b c <img src=lost", "1:AB 2:C"},
      {plain, "one<b>two", "1:ONE 2:B 3:TWO"},
      // Sentence ends leave a position gap.
      {plain, "one two. three", "1:ONE 2:TWO 4:THREE"},
      {plain, "j. smith", "1:J 2:SMITH"},
      {plain, "wait... then", "1:WAIT 3:THEN"},
      {plain, " .;- ", ""},
      // ß and ﬁ have no one-character upper case and stay; Deseret (outside the BMP) has one.
      {plain, "straße élan \xEF\xAC\x81n \xF0\x90\x90\xA8x",
       "1:STRAßE 2:ÉLAN 3:\xEF\xAC\x81N 4:\xF0\x90\x90\x80X"},
      {own, "x\xC2\xAAy\xC2\xABz a\xE2\x80\x94" "b\xE2\x80\x93" "c", "1:X\xC2\xAAY 2:Z 3:A\xE2\x80\x94" "B 4:C"},
      {own, "a\xFF" "b", "1:A\xEF\xBF\xBD" "B"},  // invalid bytes become U+FFFD, part of the word
  };
  for (const Case& c : cases) EXPECT_EQ(Words(c.splitter, c.text), c.expected) << c.text;
  EXPECT_EQ(Words(plain, std::u16string(u"stra\u00DFe \U00010428x")), "1:STRAßE 2:\xF0\x90\x90\x80X");

  // The ".." left after "wait..." at the end is never a word but still ends the text.
  std::int32_t position = 0;
  EXPECT_EQ(Words(plain, std::string("wait..."), position), "1:WAIT");
  plain.Split(std::string("wait..."), position, [](const SplitWord&) {});
  EXPECT_EQ(position, 3);
  // The position is the caller's and runs on from where it stands.
  position = 10;
  plain.Split(std::u16string(u"alpha beta."), position, [](const SplitWord&) {});
  EXPECT_EQ(position, 14);  // BETA at 12, the sentence end, then the blank remainder
}

// Stop words and normalisation as a language object does them.
class TestFilter : public CWordFilter {
 public:
  std::vector<std::u16string> asked;
  bool IsStopWord(std::u16string_view word) override {
    asked.emplace_back(word);
    return word == u"THE" || word == u"IT";
  }
  void Normalise(std::u16string_view word, std::u16string& out) override {
    out.assign(word == u"XX" ? u"" : word);
    if (out.size() > 3 && out.back() == u'S') out.pop_back();
  }
};

TEST(WordSplitter, UpperCaseAtEveryOffsetAndAroundTheLetterRanges) {
  // The characters just outside 'a'..'z' and 'A'..'Z' stay; non-ASCII
  // characters at every offset of an ASCII run are mapped one by one.
  CWordSplitter splitter(CSeparatorSet(u" "), false);
  const std::u16string edges = u"@AZ[`az{~\x7F0m";
  const std::u16string others[] = {u"\u00E9", u"\u00DF", u"\U0001044F", u"\u0101"};
  for (const std::u16string& other : others) {
    for (std::size_t at = 0; at <= edges.size(); ++at) {
      const std::u16string word = edges.substr(0, at) + other + edges.substr(at);
      std::u16string cut;
      std::int32_t position = 0;
      splitter.Split(std::u16string_view(word), position,
                     [&](const SplitWord& w) { cut = std::u16string(w.cut); });
      EXPECT_EQ(cut, ToUpper(std::u16string_view(word))) << Utf16ToUtf8(word);
    }
  }
}

TEST(WordSplitter, DroppedWordsKeepTheirSentenceGap) {
  TestFilter filter;
  CWordSplitter splitter(CSeparatorSet(DefaultSeparators()), false, &filter);
  EXPECT_EQ(Words(splitter, std::string("the rivers xx run. it. flows")),
            "0:THE= 1:RIVERS=RIVER 1:XX= 2:RUN 3:IT= 5:FLOWS=FLOW");
  EXPECT_EQ(filter.asked[1], u"RIVERS");  // the stop test sees the word as cut
}

// Random input never crashes or stalls, positions never go back, and the words
// are the upper-cased runs of non-separators (cut to 198 units, trimmed).
TEST(WordSplitter, RandomInputGivesTheRunsBetweenSeparators) {
  std::mt19937 rng(20240611);
  const std::u16string alphabet = u"ab \t.;:?!-<>\u00DF\u00E9\u00AB\u2013\U0001F600" +
                                  std::u16string{char16_t(0xD800), char16_t(0xDC00)};  // lone halves too
  for (int round = 0; round < 400; ++round) {
    std::u16string option;
    for (int k = 0, n = rng() % 6; k < n; ++k) option += alphabet[rng() % alphabet.size()];
    const CSeparatorSet set(BuildSeparators(option, rng() % 2 == 0));
    std::u16string value;
    for (int k = 0, n = rng() % 3 == 0 ? 500 : 40; k < n; ++k) {
      value += rng() % 7 == 0 ? char16_t(u'A' + rng() % 3) : alphabet[rng() % alphabet.size()];
    }
    if (round % 10 == 0) value += std::u16string(300, u'z') + u" " + std::u16string(300, u'y');

    CWordSplitter splitter(set, rng() % 2 == 0);
    std::int32_t position = 0;
    std::int32_t previous = 0;
    std::vector<std::u16string> got;
    splitter.Split(value, position, [&](const SplitWord& w) {
      ASSERT_FALSE(w.cut.empty());
      ASSERT_LE(w.cut.size(), kMaxWordLength);
      ASSERT_GE(w.position, previous);
      previous = w.position;
      got.emplace_back(w.cut);
    });
    ASSERT_GE(position, previous);

    // An independent cut, for sets that hold the appended blank and no markup removal.
    if (!set.Contains(u' ')) continue;
    CWordSplitter no_html(set, false);
    got.clear();
    no_html.Split(value, position, [&](const SplitWord& w) { got.emplace_back(w.cut); });
    std::vector<std::u16string> expected;
    std::u16string run;
    const std::u16string upper = ToUpper(std::u16string_view(value)) + u" ";
    std::size_t len = 0;
    for (std::size_t i = 0; i < upper.size(); i += len) {
      if (!set.IsSeparatorAt(upper, i, len)) {
        run.append(upper, i, len);
        continue;
      }
      const std::u16string_view word = TrimBlanks(std::u16string_view(run).substr(0, Utf16CutLength(run, 198)));
      if (!word.empty()) expected.emplace_back(word);
      run.clear();
    }
    ASSERT_EQ(got, expected) << "round " << round;
  }
}

}  // namespace
}  // namespace qm
