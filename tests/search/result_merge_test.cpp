// The merges of result arrays by operator, their scores and output limits,
// the reduction to one row per key, appended commands and the paging window,
// on arrays written out by hand.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "base/exception_family.h"
#include "config/global_defs.h"
#include "search/gi_tree_rowset.h"
#include "search/item_merge.h"
#include "support/raised_error.h"

namespace qm {
namespace {

using Rows = std::vector<std::vector<int32_t>>;

CColumnSet Set(int s, int p) {
  CColumnSet set;
  set.s = static_cast<uint16_t>(s);
  set.p = static_cast<uint16_t>(p);
  return set;
}

// A result array: the count row, then rows.
CItems Result(const CColumnSet& set, const Rows& rows) {
  CItems items(set);
  items.InsertItem(std::vector<int32_t>(static_cast<std::size_t>(set.Width()), 0));
  for (const auto& row : rows) items.InsertItem(row);
  StampCount(items);
  return items;
}

Rows RowsOf(const CItems& items) {
  EXPECT_GE(items.Count(), 1);
  EXPECT_EQ(items.Count() > 0 ? items.Row(0)[0] : -1, items.Count()) << "count row";
  Rows rows;
  for (int32_t i = 1; i < items.Count(); ++i) {
    rows.emplace_back(items.Row(i), items.Row(i) + items.Width());
  }
  return rows;
}

class ResultMergeTest : public ::testing::Test {
 protected:
  CGlobalDefs defs_;
  CGiTreeRowset rowset_{defs_};
};

// Rows are key, score, position throughout.
struct MergeCase {
  const char* name;
  int32_t code;
  int32_t flags;
  int32_t distance;
  int32_t word_count;
  Rows left;
  Rows right;
  Rows expected;
};

TEST_F(ResultMergeTest, OperatorsKeepTheRowsAndScoresOfTheirRules) {
  const Rows a = {{1, 10, 1}, {3, 20, 4}, {5, 30, 9}};
  const Rows b = {{3, 5, 5}, {4, 6, 1}, {5, 7, 2}};
  const std::vector<MergeCase> cases = {
      {"AND adds scores", 1, 0, 0, 1, a, b, {{3, 25, 4}, {5, 37, 9}}},
      {"AND with an empty side", 1, 0, 0, 1, a, {}, {}},
      {"OR unions by key", 2, 0, 0, 1, a, b, {{1, 10, 1}, {3, 25, 4}, {4, 6, 1}, {5, 37, 9}}},
      {"OR with an empty side copies the other", 2, 0, 0, 1, {}, b, b},
      {"FILTER keeps left scores", 4, 0, 0, 1, a, b, {{3, 20, 4}, {5, 30, 9}}},
      {"AND NOT keeps the left tail", 8, 0, 0, 1, a, {{3, 1, 1}}, {{1, 10, 1}, {5, 30, 9}}},
      {"FILTER NOT", 9, 0, 0, 1, a, b, {{1, 10, 1}}},
      {"unknown code", 3, 0, 0, 1, a, b, {}},
      // Adjacency: the left position must be the right one less one.
      {"adjacent pair, bonus 200/2",
       6,
       0,
       0,
       2,
       {{7, 1, 3}, {8, 1, 3}},
       {{7, 2, 4}, {8, 2, 6}},
       {{7, 103, 3}}},
      {"adjacency walks positions",
       6,
       0,
       0,
       1,
       {{7, 0, 1}, {7, 0, 5}, {7, 0, 9}},
       {{7, 0, 3}, {7, 0, 6}},
       {{7, 200, 5}}},
      // NEAR/3 with a one-word left side: distance 4.
      {"NEAR right word 5 after", 11, 0, 4, 2, {{1, 0, 10}}, {{1, 0, 15}}, {{1, 21, 10}}},
      {"NEAR right word 6 after", 11, 0, 4, 2, {{1, 0, 10}}, {{1, 0, 16}}, {}},
      {"NEAR right word before keeps the right row",
       11,
       0,
       4,
       1,
       {{1, 0, 10}},
       {{1, 0, 8}},
       {{1, 44, 8}}},
      {"NEAR next word scores as adjacency",
       11,
       0,
       4,
       2,
       {{1, 4, 10}},
       {{1, 6, 11}},
       {{1, 110, 10}}},
      {"NEAR finds a later left occurrence",
       11,
       0,
       3,
       1,
       {{1, 0, 1}, {1, 0, 20}},
       {{1, 0, 22}},
       {{1, 48, 20}}},
      {"NEAR finds a later right occurrence",
       11,
       0,
       3,
       1,
       {{1, 0, 30}},
       {{1, 0, 2}, {1, 0, 29}},
       {{1, 46, 29}}},
      {"NEAR far beyond 25 adds no negative bonus",
       11,
       0,
       0,
       1,
       {{1, 1, 1}},
       {{1, 2, 100}},
       {{1, 3, 1}}},
      // Proximity: AND, OR, adjacency, AND NOT and NEAR become it.
      {"=| without a number copies unmatched",
       2,
       16,
       -1,
       2,
       {{1, 1, 1}, {2, 1, 1}},
       {{2, 1, 2}, {3, 1, 1}},
       {{1, 1, 1}, {2, 102, 1}, {3, 1, 1}}},
      {"=|2 drops a pair 3 apart", 6, 16, 2, 1, {{2, 0, 1}}, {{2, 0, 5}}, {}},
      {"=|3 keeps it", 6, 16, 3, 1, {{2, 0, 1}}, {{2, 0, 5}}, {{2, 44, 1}}},
      {"FILTER is untouched by =|", 4, 16, -1, 1, a, b, {{3, 20, 4}, {5, 30, 9}}},
  };
  for (const MergeCase& c : cases) {
    SCOPED_TRACE(c.name);
    const CItems merged =
        rowset_.MergeTwoResultset(Result(Set(1, 1), c.left), Result(Set(1, 1), c.right), c.code,
                                  c.flags, c.distance, c.word_count);
    EXPECT_EQ(RowsOf(merged), c.expected);
  }
}

TEST_F(ResultMergeTest, ArraysWithoutScoresOrPositions) {
  // Key-only rows: AND and OR keep keys; without positions NEAR is refused.
  const CItems left = Result(Set(0, 0), {{1}, {2}, {4}});
  const CItems right = Result(Set(0, 0), {{2}, {3}});
  EXPECT_EQ(RowsOf(rowset_.MergeTwoResultset(left, right, 1, 0, 0, 1)), (Rows{{2}}));
  EXPECT_EQ(RowsOf(rowset_.MergeTwoResultset(left, right, 2, 0, 0, 1)), (Rows{{1}, {2}, {3}, {4}}));
  struct ErrorCase {
    const char* name;
    CColumnSet left, right;
    int32_t code;
    int32_t number;
  };
  const std::vector<ErrorCase> errors = {
      {"AND of different columns", Set(1, 1), Set(0, 1), 1, 10},
      {"OR of different columns", Set(1, 0), Set(1, 1), 2, 10},
      {"adjacency without positions", Set(1, 0), Set(1, 0), 6, 57},
      {"NEAR without positions", Set(0, 0), Set(0, 0), 11, 57},
      {"=| without positions", Set(1, 0), Set(1, 0), 7, 57},
  };
  for (const ErrorCase& e : errors) {
    SCOPED_TRACE(e.name);
    const test::Raise raised = test::Raised<CGiTreeRowsetException>([&] {
      rowset_.MergeTwoResultset(Result(e.left, {}), Result(e.right, {}), e.code, 0, 0, 1);
    });
    EXPECT_EQ(raised.number, e.number);
  }
  // FILTER compares keys only: columns may differ.
  EXPECT_EQ(RowsOf(rowset_.MergeTwoResultset(Result(Set(1, 1), {{2, 5, 1}}), right, 4, 0, 0, 1)),
            (Rows{{2, 5, 1}}));
}

TEST_F(ResultMergeTest, CacheSizeCutsOrAndNearMergesAndSetsTheTruncatedFlag) {
  Rows odd;
  Rows even;
  for (int32_t i = 0; i < 20; ++i) {
    odd.push_back({2 * i + 1, 1, 1});
    even.push_back({2 * i + 2, 1, 2});
  }
  // Ten row widths: 9 rows and the count row.
  rowset_.SetCacheSize(10 * 12);
  const CItems merged =
      rowset_.MergeTwoResultset(Result(Set(1, 1), odd), Result(Set(1, 1), even), 2, 0, 0, 1);
  EXPECT_EQ(merged.Count(), 10);
  EXPECT_EQ(merged.Row(9)[0], 9);
  EXPECT_TRUE(rowset_.IsTruncated());

  CGiTreeRowset roomy(defs_);
  roomy.SetCacheSize(41 * 12);
  EXPECT_EQ(
      roomy.MergeTwoResultset(Result(Set(1, 1), odd), Result(Set(1, 1), even), 7, 0, -1, 1).Count(),
      41);
  EXPECT_FALSE(roomy.IsTruncated()) << "everything fitted";

  CGiTreeRowset tight(defs_);
  tight.SetCacheSize(5 * 12);
  EXPECT_EQ(
      tight.MergeTwoResultset(Result(Set(1, 1), odd), Result(Set(1, 1), even), 7, 0, -1, 1).Count(),
      5);
  EXPECT_TRUE(tight.IsTruncated());
}

TEST_F(ResultMergeTest, ReduceItemsKeepsTheLastRowOfEachKey) {
  struct Case {
    const char* name;
    CColumnSet set;
    int32_t word_count;
    Rows rows;
    Rows expected;
  };
  const std::vector<Case> cases = {
      // Score = 200 / words + rows of the key + the highest score.
      {"scores",
       Set(1, 1),
       2,
       {{1, 5, 1}, {1, 9, 4}, {1, 2, 8}, {4, 0, 3}},
       {{1, 100 + 3 + 9, 8}, {4, 100 + 1 + 0, 3}}},
      {"positions only", Set(0, 1), 1, {{2, 1}, {2, 7}, {3, 1}}, {{2, 7}, {3, 1}}},
      {"empty", Set(1, 1), 1, {}, {}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    CItems items = Result(c.set, c.rows);
    rowset_.ReduceItems(items, c.word_count);
    EXPECT_EQ(RowsOf(items), c.expected);
  }
}

TEST_F(ResultMergeTest, KeyedMergesOfAnUnreducedConditionEqualReducingItFirst) {
  const CItems left = Result(Set(1, 1), {{1, 10, 3}, {4, 20, 1}, {6, 30, 2}, {9, 40, 7}});
  // Keys 4 and 9 with several rows; 2 and 7 never met by the left side.
  const CItems raw = Result(
      Set(1, 1), {{2, 1, 1}, {4, 5, 1}, {4, 9, 6}, {7, 3, 2}, {9, 2, 4}, {9, 8, 5}, {9, 1, 9}});
  for (const int32_t words : {1, 2}) {
    CItems reduced = Result(Set(1, 1), RowsOf(raw));
    rowset_.ReduceItems(reduced, words);
    for (const int32_t code : {1, 4, 8, 9}) {
      SCOPED_TRACE("code " + std::to_string(code) + ", words " + std::to_string(words));
      EXPECT_EQ(RowsOf(KeepByCondition(left, raw, code, words)),
                RowsOf(rowset_.MergeTwoResultset(left, reduced, code, 0, 0, 1)));
    }
  }
  // AND by hand: key 4 gains 200 + 2 rows + 9, key 9 gains 200 + 3 + 8.
  EXPECT_EQ(RowsOf(KeepByCondition(left, raw, 1, 1)), (Rows{{4, 231, 1}, {9, 251, 7}}));
}

TEST_F(ResultMergeTest, RemoveKeysDropsDeletedKeysOnce) {
  CItems items = Result(Set(0, 1), {{1, 1}, {2, 1}, {2, 5}, {3, 1}, {9, 2}});
  std::vector<int32_t> met;
  RemoveKeys(items, std::vector<int32_t>{0, 2, 3, 4, 10}, [&](int32_t key) { met.push_back(key); });
  EXPECT_EQ(RowsOf(items), (Rows{{1, 1}, {9, 2}}));
  EXPECT_EQ(met, (std::vector<int32_t>{2, 3}));
}

TEST_F(ResultMergeTest, AppendedCommandsCarryTheirNumberInALastColumn) {
  const CItems first = Result(Set(1, 0), {{4, 7}, {9, 1}});
  const CItems second = Result(Set(1, 0), {{2, 3}});
  const CItems joined = rowset_.AddResultset(first, false, second, 2);
  EXPECT_EQ(joined.Width(), 3);
  EXPECT_EQ(RowsOf(joined), (Rows{{4, 7, 1}, {9, 1, 1}, {2, 3, 2}}));
  // A third command keeps the column; a findex with positions and no score
  // gives its key alone.
  const CItems third = rowset_.AddResultset(joined, true, Result(Set(0, 1), {{5, 8}}), 3);
  EXPECT_EQ(RowsOf(third), (Rows{{4, 7, 1}, {9, 1, 1}, {2, 3, 2}, {5, 0, 3}}));
}

}  // namespace
}  // namespace qm
