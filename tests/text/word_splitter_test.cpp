// Preparing and splitting a value as the builder does: case, markup, words,
// positions and the language hook.
#include <gtest/gtest.h>

#include <random>
#include <set>
#include <string>
#include <vector>

#include "platform/text_encoding.h"
#include "text/word_splitter.h"

namespace qm {
namespace {

struct Seen {
  std::int32_t position;
  std::string cut;
  std::string form;
  bool operator==(const Seen&) const = default;
};

std::ostream& operator<<(std::ostream& os, const Seen& s) {
  return os << "{" << s.position << ", \"" << s.cut << "\", \"" << s.form << "\"}";
}

template <class Text>
std::vector<Seen> SplitAll(CWordSplitter& splitter, const Text& text, std::int32_t position = 0) {
  std::vector<Seen> out;
  splitter.Split(text, position, [&](const SplitWord& w) {
    out.push_back({w.position, Utf16ToUtf8(w.cut), Utf16ToUtf8(w.form)});
  });
  return out;
}

CWordSplitter DefaultSplitter(bool remove_html = false, CWordFilter* filter = nullptr) {
  return CWordSplitter(CSeparatorSet(DefaultSeparators()), remove_html, filter);
}

std::vector<std::string> Forms(const std::vector<Seen>& seen) {
  std::vector<std::string> out;
  for (const auto& s : seen) out.push_back(s.form);
  return out;
}

TEST(WordSplitter, TagsAreRemovedWithoutLeavingABlank) {
  CWordSplitter html = DefaultSplitter(true);
  EXPECT_EQ(Forms(SplitAll(html, std::string("one<b>two"))), (std::vector<std::string>{"ONETWO"}));
  EXPECT_EQ(Forms(SplitAll(html, std::string("one <b> two"))), (std::vector<std::string>{"ONE", "TWO"}));
  // Scripts go in any case, since the text is upper-cased first.
  EXPECT_EQ(Forms(SplitAll(html, std::string("a<script type=x>var secret;</Script>b c"))),
            (std::vector<std::string>{"AB", "C"}));
  // An unclosed tag takes the rest of the value.
  EXPECT_EQ(Forms(SplitAll(html, std::string("kept <img src=lost"))), (std::vector<std::string>{"KEPT"}));

  CWordSplitter plain = DefaultSplitter(false);
  EXPECT_EQ(Forms(SplitAll(plain, std::string("one<b>two"))), (std::vector<std::string>{"ONE", "B", "TWO"}));
}

TEST(WordSplitter, SentenceEndsLeaveAPositionGap) {
  CWordSplitter splitter = DefaultSplitter();
  EXPECT_EQ(SplitAll(splitter, std::string("one two. three")),
            (std::vector<Seen>{{1, "ONE", "ONE"}, {2, "TWO", "TWO"}, {4, "THREE", "THREE"}}));
  EXPECT_EQ(SplitAll(splitter, std::string("end.next")),
            (std::vector<Seen>{{1, "END", "END"}, {2, "NEXT", "NEXT"}}));
  // A one-letter word before a full stop is an initial, not a sentence end.
  EXPECT_EQ(SplitAll(splitter, std::string("j. smith")),
            (std::vector<Seen>{{1, "J", "J"}, {2, "SMITH", "SMITH"}}));
  // The separators left after "wait..." are never a word, but still end the text.
  std::int32_t position = 0;
  std::vector<std::string> cuts;
  splitter.Split(std::string("wait... then"), position,
                 [&](const SplitWord& w) { cuts.push_back(Utf16ToUtf8(w.cut)); });
  EXPECT_EQ(cuts, (std::vector<std::string>{"WAIT", "THEN"}));
  EXPECT_EQ(position, 3);
}

TEST(WordSplitter, PositionCarriesAcrossValues) {
  CWordSplitter splitter = DefaultSplitter();
  // A value of separators only gives no word at all.
  EXPECT_TRUE(SplitAll(splitter, std::string("")).empty());
  EXPECT_TRUE(SplitAll(splitter, std::string(" .;- ")).empty());
  std::int32_t position = 10;
  std::int32_t last = 0;
  splitter.Split(std::u16string(u"alpha beta."), position, [&](const SplitWord& w) { last = w.position; });
  EXPECT_EQ(last, 12);
  EXPECT_EQ(position, 14);  // sentence end after BETA, then the blank remainder
}

// Stop words and normalisation as a language object would do them.
class TestFilter : public CWordFilter {
 public:
  std::set<std::u16string> stop{u"THE", u"IT"};
  std::vector<std::u16string> asked;
  bool IsStopWord(std::u16string_view word) override {
    asked.emplace_back(word);
    return stop.count(std::u16string(word)) > 0;
  }
  void Normalise(std::u16string_view word, std::u16string& out) override {
    out.assign(word);
    if (out == u"XX") out.clear();                // normalises to nothing
    if (out.size() > 3 && out.back() == u'S') out.pop_back();  // a toy stemmer
  }
};

TEST(WordSplitter, StopWordsAndEmptyFormsKeepTheirSentenceGap) {
  TestFilter filter;
  CWordSplitter splitter = DefaultSplitter(false, &filter);
  EXPECT_EQ(SplitAll(splitter, std::string("the rivers xx run. it. flows")),
            (std::vector<Seen>{{0, "THE", ""},
                               {1, "RIVERS", "RIVER"},
                               {1, "XX", ""},
                               {2, "RUN", "RUN"},
                               {3, "IT", ""},
                               {5, "FLOWS", "FLOW"}}));
  // The stop test sees the word as cut, before normalisation.
  EXPECT_EQ(filter.asked[1], u"RIVERS");
}

TEST(WordSplitter, UpperCasingIsSimplePerCharacter) {
  CWordSplitter splitter = DefaultSplitter();
  // ß has no one-character upper case and stays; ﬁ likewise.
  EXPECT_EQ(Forms(SplitAll(splitter, std::string("straße élan \xEF\xAC\x81n \xF0\x90\x90\xA8x"))),
            (std::vector<std::string>{"STRAßE", "ÉLAN", "\xEF\xAC\x81N", "\xF0\x90\x90\x80X"}));
  EXPECT_EQ(Forms(SplitAll(splitter, std::u16string(u"stra\u00DFe \U00010428x"))),
            (std::vector<std::string>{"STRAßE", "\xF0\x90\x90\x80X"}));
}

TEST(WordSplitter, NonAsciiSeparatorsCutOnlyWhereTheyStand) {
  // « is C2 AB and – is E2 80 93; ª (C2 AA) and — (E2 80 94) share bytes with them.
  CWordSplitter splitter(CSeparatorSet(BuildSeparators(u"\u00AB\u2013", true)), false);
  EXPECT_EQ(Forms(SplitAll(splitter, std::string("x\xC2\xAAy\xC2\xABz a\xE2\x80\x94" "b\xE2\x80\x93" "c"))),
            (std::vector<std::string>{"X\xC2\xAAY", "Z", "A\xE2\x80\x94" "B", "C"}));
  // Invalid bytes become U+FFFD and are part of a word.
  EXPECT_EQ(Forms(SplitAll(splitter, std::string("a\xFF" "b c"))),
            (std::vector<std::string>{"A\xEF\xBF\xBD" "B", "C"}));
}

// Random input never crashes or stalls, and the words are the upper-cased runs
// of non-separators (cut to 198 units).
TEST(WordSplitter, RandomInputGivesTheRunsBetweenSeparators) {
  std::mt19937 rng(20240611);
  // Lone surrogate halves in the mix too.
  const std::u16string alphabet = u"ab \t.;:?!-<>\u00DF\u00E9\u00AB\u2013\U0001F600" +
                                  std::u16string{char16_t(0xD800), char16_t(0xDC00)};
  for (int round = 0; round < 400; ++round) {
    std::u16string separators;
    for (int k = 0, n = rng() % 6; k < n; ++k) separators += alphabet[rng() % alphabet.size()];
    const CSeparatorSet set(BuildSeparators(separators, rng() % 2 == 0));
    CWordSplitter splitter(set, rng() % 2 == 0);

    std::u16string value;
    const int length = rng() % 3 == 0 ? 500 : 40;
    for (int k = 0; k < length; ++k) {
      value += rng() % 7 == 0 ? char16_t(u'A' + rng() % 3) : alphabet[rng() % alphabet.size()];
    }
    // A few runs long enough to be cut.
    if (round % 10 == 0) value += std::u16string(300, u'z') + u" " + std::u16string(300, u'y');

    std::int32_t position = 0;
    std::int32_t previous = 0;
    int words = 0;
    splitter.Split(value, position, [&](const SplitWord& w) {
      ++words;
      ASSERT_FALSE(w.cut.empty());
      ASSERT_LE(w.cut.size(), kMaxWordLength);
      ASSERT_GE(w.position, previous);
      previous = w.position;
      if (w.code != NextWordCode::kLastWord) {
        std::size_t len = 0;
        for (std::size_t i = 0; i < w.cut.size(); i += len) {
          ASSERT_FALSE(set.IsSeparatorAt(w.cut, i, len)) << "round " << round;
        }
      }
    });
    ASSERT_GE(position, previous);

    // The words against an independent cut by code point, for sets that hold
    // the blank (so the appended one closes the last run) and no markup removal.
    if (!set.Contains(u' ')) continue;
    std::vector<std::u16string> expected;
    std::u16string run;
    const std::u16string upper = ToUpper(std::u16string_view(value)) + u" ";
    std::size_t len = 0;
    for (std::size_t i = 0; i < upper.size(); i += len) {
      if (set.IsSeparatorAt(upper, i, len)) {
        if (!run.empty()) expected.push_back(run.substr(0, Utf16CutLength(run, kMaxWordLength)));
        run.clear();
      } else {
        run.append(upper, i, len);
      }
    }
    std::vector<std::u16string> got;
    CWordSplitter no_html(set, false);
    std::int32_t ignored = 0;
    no_html.Split(value, ignored, [&](const SplitWord& w) { got.emplace_back(w.cut); });
    // Blanks that are not separators stay inside runs but are trimmed off words.
    for (auto& e : expected) {
      std::size_t b = 0, t = e.size();
      while (b < t && CSeparatorSet::IsBlank(e[b])) ++b;
      while (t > b && CSeparatorSet::IsBlank(e[t - 1])) --t;
      e = e.substr(b, t - b);
    }
    std::erase_if(expected, [](const std::u16string& e) { return e.empty(); });
    ASSERT_EQ(got, expected) << "round " << round;
  }
}

TEST(WordSplitter, RandomBytesAsUtf8NeverStall) {
  std::mt19937 rng(7);
  CWordSplitter splitter = DefaultSplitter(true);
  for (int round = 0; round < 300; ++round) {
    std::string bytes(rng() % 600, '\0');
    for (auto& b : bytes) b = static_cast<char>(rng());
    std::int32_t position = 0;
    std::size_t total = 0;
    splitter.Split(bytes, position, [&](const SplitWord& w) { total += w.cut.size(); });
    ASSERT_LE(total, bytes.size() * 2);
    ASSERT_LE(position, static_cast<std::int32_t>(bytes.size()) + 2);
  }
}

}  // namespace
}  // namespace qm
