// The parts of a lookup that a built findex does not reach on its own:
// similarity at and past its bound, the scan's stop past a prefix, and the
// merge of runs without positions (one row per key, scores added) or with a
// count row that does not fit.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "base/exception_family.h"
#include "format/column_set.h"
#include "format/items.h"
#include "search/edit_distance.h"
#include "search/item_runs.h"
#include "platform/text_encoding.h"
#include "search/word_pattern.h"

namespace qm {
namespace {

TEST(EditDistanceTest, ExactUpToTheBoundAndBeyondItOneAnswer) {
  struct Case {
    std::u32string a;
    std::u32string b;
    int32_t bound;
    int32_t distance;
  };
  const std::vector<Case> cases = {
      {U"", U"", 0, 0},
      {U"", U"abc", 3, 3},
      {U"", U"abc", 2, kDistanceBeyondBound},
      {U"fish", U"fish", 0, 0},
      {U"fish", U"fisk", 0, kDistanceBeyondBound},
      {U"fish", U"fisk", 1, 1},
      {U"ab", U"ba", 1, kDistanceBeyondBound},  // a swap is two edits
      {U"ab", U"ba", 2, 2},
      {U"kitten", U"sitting", 3, 3},
      {U"kitten", U"sitting", 2, kDistanceBeyondBound},
      {U"abcdefgh", U"xbcdefgy", 5, 2},
      {U"été", U"ete", 2, 2},  // characters, not bytes
      {U"a", U"b", -1, kDistanceBeyondBound},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(BoundedEditDistance(c.a, c.b, c.bound), c.distance)
        << c.a.size() << "/" << c.b.size() << " bound " << c.bound;
    EXPECT_EQ(BoundedEditDistance(c.b, c.a, c.bound), c.distance) << "symmetric";
  }
}

TEST(WordPatternTest, AScanStopsOnlyPastTheLiteralPrefix) {
  struct Case {
    std::u16string pattern;
    std::u16string word;
    CWordPattern::Outcome outcome;
  };
  const std::vector<Case> cases = {
      {u"AB*", u"AA", CWordPattern::kNoMatch},      // before the prefix
      {u"AB*", u"AB", CWordPattern::kMatch},
      {u"AB*", u"ABZZZ", CWordPattern::kMatch},
      {u"AB*", u"AC", CWordPattern::kPastPrefix},
      {u"AB?D", u"ABXE", CWordPattern::kNoMatch},   // prefix holds, the rest fails
      {u"*", u"", CWordPattern::kMatch},
      {u"A\\\\B", u"A\\B", CWordPattern::kMatch},   // an escaped backslash
      {u"X*Y*Z", u"XAYBYCZ", CWordPattern::kMatch},
      {u"X*Y*Z", u"XAYBYCZQ", CWordPattern::kNoMatch},
  };
  for (const Case& c : cases) {
    const CWordPattern pattern(c.pattern);
    EXPECT_EQ(pattern.Match(c.word), c.outcome);
    EXPECT_EQ(pattern.MatchUtf8(Utf16ToUtf8(c.word)), c.outcome);
  }
}

// Runs of rows (key, [score], [position]) as the lookup leaves them.
CItems Runs(const CColumnSet& set, const std::vector<std::vector<std::vector<int32_t>>>& runs) {
  CItems items(set);
  for (const auto& run : runs) {
    std::vector<int32_t> count(static_cast<std::size_t>(set.Width()), 0);
    count[0] = static_cast<int32_t>(run.size()) + 1;
    items.InsertItem(count);
    for (const auto& row : run) items.InsertItem(row);
  }
  return items;
}

std::vector<std::vector<int32_t>> Rows(const CItems& items) {
  std::vector<std::vector<int32_t>> rows;
  for (int32_t i = 0; i < items.Count(); ++i) {
    rows.emplace_back(items.Row(i), items.Row(i) + items.Width());
  }
  return rows;
}

TEST(MergeRunsTest, EqualKeysBecomeOneRowWithoutPositionsAndStayOrderedWithThem) {
  CColumnSet scores;
  scores.s = 1;
  CItems merged = Runs(scores, {{{2, 5}, {7, 1}}, {{1, 3}, {2, 4}}, {{2, 1}, {9, 9}}});
  MergeRuns(merged);
  EXPECT_EQ(Rows(merged), (std::vector<std::vector<int32_t>>{
                              {5, 0}, {1, 3}, {2, 10}, {7, 1}, {9, 9}}));

  CColumnSet both;
  both.s = 1;
  both.p = 1;
  CItems positioned = Runs(both, {{{4, 1, 9}, {6, 1, 1}}, {{4, 2, 3}}, {{4, 3, 5}, {5, 1, 1}}});
  MergeRuns(positioned);
  EXPECT_EQ(Rows(positioned), (std::vector<std::vector<int32_t>>{
                                  {6, 0, 0}, {4, 2, 3}, {4, 3, 5}, {4, 1, 9}, {5, 1, 1}, {6, 1, 1}}));

  CItems single = Runs(scores, {{{3, 1}, {1, 1}}});
  MergeRuns(single);
  EXPECT_EQ(single.Count(), 3) << "one run is left as it is";

  CItems damaged = Runs(scores, {{{1, 1}}, {{2, 1}}});
  damaged.Row(2)[0] = 40;  // the second count row claims rows that are not there
  EXPECT_THROW(MergeRuns(damaged), CGiFIndexException);
}

}  // namespace
}  // namespace qm
