// Ordering, grouping and score operations on result rows filled here: by
// score and by key, the tie rule, REVERSE, the SQL order string, the
// maximum score, rounding and adjusting scores, and reading groups.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

#include "base/error_messages.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "format/items.h"
#include "search/rowset_order.h"
#include "support/raised_error.h"
#include "support/test_support.h"

namespace qm {
namespace {

using Ints = std::vector<int32_t>;
using test::Raised;

constexpr const char* kRoundText =
    "Error rounding score. The index does not support ordering by score. Please create the index "
    "with the SCORE keyword to support ordering by score. (Module:GiTreeRowset,Method:RoundScore)";
constexpr const char* kAdjustText =
    "Error adjusting score. The index does not support ordering by score. Please create the "
    "index with the SCORE keyword to support ordering by score. "
    "(Module:GiTreeRowset,Method:AdjustWeight)";

class ResultOrderTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(LoadErrorMessagesFromFile(std::string(QM_SOURCE_DATA_DIR) + "System/mrvconf.ini"));
    defs_.SetDataPath(home_.Data());
    context_.score_support = true;
    context_.key_column = "Id";
    context_.part_count = 0;
  }

  // Result rows (key, score) in this order after the count row; without
  // scores the rows hold keys only.
  static CItems Rows(const std::vector<std::pair<int32_t, int32_t>>& rows, bool scores = true) {
    CColumnSet set;
    set.s = scores ? 1 : 0;
    CItems items(set);
    items.InsertItem(Ints(static_cast<std::size_t>(set.Width()), 0));
    for (const auto& [key, score] : rows) {
      Ints row{key};
      if (scores) row.push_back(score);
      items.InsertItem(row);
    }
    items.Row(0)[0] = items.Count();
    return items;
  }

  static Ints Column(const CItems& rows, int32_t column) {
    Ints out;
    for (int32_t i = CGiRowsetOrder::kFirstRow; i < rows.Count(); ++i) out.push_back(rows.Row(i)[column]);
    return out;
  }

  void Order(CItems& rows, const std::string& list) {
    order_.SetOrder(rows, list, true, context_);
    order_.SortItems(rows, context_);
  }

  test::ConfiguredHome home_;
  CGlobalDefs defs_;
  RowsetOrderContext context_;
  CGiRowsetOrder order_{defs_};
};

// Keys 1..5 with two pairs of equal scores.
const std::vector<std::pair<int32_t, int32_t>> kScored = {{1, 50}, {2, 70}, {3, 50}, {4, 70}, {5, 10}};

TEST_F(ResultOrderTest, OrderListsSortBySortKeysAndWriteTheSqlOrderString) {
  struct Case {
    const char* list;
    Ints keys;
    const char* sql;
    bool score_active;
  };
  const Case cases[] = {
      // Equal scores: the later row first, so descending keys.
      {"SCORE", {4, 2, 3, 1, 5}, "SCORE DESC", true},
      {"score asc", {5, 3, 1, 4, 2}, "SCORE ASC", true},
      {"KEY", {1, 2, 3, 4, 5}, "Id ASC", false},
      {"key DESC", {5, 4, 3, 2, 1}, "Id DESC", false},
      {"SCORE DESC, KEY ASC", {2, 4, 1, 3, 5}, "SCORE DESC,Id ASC", true},
      {" , KEY   DESC ,, ", {5, 4, 3, 2, 1}, "Id DESC", false},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.list);
    CItems rows = Rows(kScored);
    Order(rows, c.list);
    EXPECT_EQ(Column(rows, 0), c.keys);
    EXPECT_EQ(order_.SqlOrderString(), c.sql);
    EXPECT_EQ(order_.ScoreActive(), c.score_active);
    EXPECT_EQ(rows.Row(0)[0], 6) << "the count row stays first";
  }
}

TEST_F(ResultOrderTest, ManyEqualScoresComeOutInTheReverseOfTheirOrderBeforeTheSort) {
  // Rows of few distinct scores, not in key order, past the sizes of the
  // cases above: the stable order of the reversed rows is the tie rule.
  std::vector<std::pair<int32_t, int32_t>> input;
  uint32_t seed = 12345;
  for (int32_t key = 1; key <= 5000; ++key) {
    seed = seed * 1103515245u + 12345u;
    input.emplace_back(static_cast<int32_t>(seed >> 8) % 100000, static_cast<int32_t>(seed >> 20) % 7);
  }
  for (const char* list : {"SCORE", "SCORE ASC"}) {
    SCOPED_TRACE(list);
    CItems rows = Rows(input);
    Order(rows, list);
    std::vector<std::pair<int32_t, int32_t>> expected(input.rbegin(), input.rend());
    const bool descending = std::string(list) == "SCORE";
    std::stable_sort(expected.begin(), expected.end(), [&](const auto& a, const auto& b) {
      return descending ? a.second > b.second : a.second < b.second;
    });
    Ints keys;
    for (const auto& row : expected) keys.push_back(row.first);
    EXPECT_EQ(Column(rows, 0), keys);
  }
}

TEST_F(ResultOrderTest, ReverseFlipsRowsDirectionsAndTheSqlOrderString) {
  CItems rows = Rows(kScored);
  Order(rows, "SCORE DESC, KEY ASC");
  order_.SetOrder(rows, " reverse ", true, context_);
  EXPECT_EQ(order_.SqlOrderString(), "SCORE ASC,Id DESC");
  EXPECT_EQ(order_.SqlOrderString(true), "Id DESC");
  order_.SortItems(rows, context_);
  EXPECT_EQ(Column(rows, 0), (Ints{5, 3, 1, 4, 2}));
  EXPECT_TRUE(order_.ScoreActive());
  // Sorting again uses the flipped directions and gives the same rows.
  order_.SortItems(rows, context_);
  EXPECT_EQ(Column(rows, 0), (Ints{5, 3, 1, 4, 2}));
}

TEST_F(ResultOrderTest, FaultyOrderListsRaiseTheirNumberedErrors) {
  struct Case {
    const char* list;
    bool score_support;
    int32_t number;
    const char* text;
  };
  const Case cases[] = {
      {"KEY SIDEWAYS", true, 59,
       "Invalid sort direction in the order list: use ASC or DESC "
       "(Module:GiTreeRowset,Method:SetOrder)"},
      {"SCORE DESC", false, 60,
       "Cannot order by SCORE: the findex was built without score support "
       "(Module:GiTreeRowset,Method:SetOrder)"},
      {"TITLE", true, 61,
       "Cannot order by this column: no order could be opened for it. Write order columns as "
       "ORDER.COLUMN and build the order first (Module:GiTreeRowset,Method:SetOrder)"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.list);
    CItems rows = Rows(kScored);
    context_.score_support = true;
    order_.SetOrder(rows, "KEY DESC", false, context_);
    context_.score_support = c.score_support;
    const test::Raise raised = Raised<CGiTreeRowsetException>(
        [&] { order_.SetOrder(rows, std::string("KEY, ") + c.list, true, context_); });
    EXPECT_EQ(raised.number, c.number);
    EXPECT_EQ(raised.text, c.text);
    // A list that fails leaves the order as it was.
    EXPECT_EQ(order_.SqlOrderString(), "Id DESC");
    EXPECT_FALSE(order_.AddOrderClause());
    order_.SortItems(rows, context_);
    EXPECT_EQ(Column(rows, 0), (Ints{5, 4, 3, 2, 1}));
  }
}

TEST_F(ResultOrderTest, TheMaximumScoreIsTheHighestScoreOrTwoHundredPerConditionPart) {
  struct Case {
    std::vector<std::pair<int32_t, int32_t>> rows;
    int32_t parts;
    int32_t max;
  };
  const Case cases[] = {
      {{{1, 120}, {2, 90}}, 1, 200},
      {{{1, 120}, {2, 450}}, 2, 450},
      {{{7, 30}}, 0, 30},
      {{}, 3, 0},
  };
  for (const Case& c : cases) {
    CItems rows = Rows(c.rows);
    context_.part_count = c.parts;
    Order(rows, "KEY");
    EXPECT_EQ(order_.GetMaxScore(rows, context_), c.max) << c.parts;
  }
  // Before any sort the rows give the same answer.
  CGiRowsetOrder fresh(defs_);
  CItems unsorted = Rows({{1, 20}, {2, 640}});
  EXPECT_EQ(fresh.GetMaxScore(unsorted, context_), 640);

  CItems keys_only = Rows({{1, 0}}, false);
  EXPECT_EQ(Raised<CGiTreeRowsetException>([&] { order_.GetMaxScore(keys_only, context_); }).text,
            "The result set is not ordered by score (Module:GiTreeRowset,Method:GetMaxWeight)");
}

TEST_F(ResultOrderTest, RoundingCutsScoresToHundredsAndOrderListsRoundWithScoreGroups) {
  CItems rows = Rows({{1, 199}, {2, 99}, {3, 200}, {4, 0}, {5, 1250}});
  order_.RoundScore(rows, context_);
  EXPECT_EQ(Column(rows, 1), (Ints{100, 0, 200, 0, 1200}));

  CItems grouped = Rows({{1, 150}, {2, 180}, {3, 120}});
  context_.score_group_count = 2;
  Order(grouped, "SCORE DESC");
  // All three score 100 once rounded: descending keys.
  EXPECT_EQ(Column(grouped, 0), (Ints{3, 2, 1}));
  EXPECT_EQ(Column(grouped, 1), (Ints{100, 100, 100}));

  context_.score_support = false;
  EXPECT_EQ(Raised<CGiTreeRowsetException>([&] { order_.RoundScore(rows, context_); }).text,
            kRoundText);
}

TEST_F(ResultOrderTest, AdjustingAddsAFallingValueRowByRow) {
  struct Case {
    double start;
    double step;
    int32_t type;
    int32_t stop_count;
    bool stop_at_zero;
    Ints scores;
    Ints adjusted;
  };
  const Case cases[] = {
      {50, 20, 0, 2, false, {100, 100, 100}, {150, 130, 100}},
      {100, 60, 0, 0, false, {100, 100, 100, 100}, {200, 140, 80, 20}},
      {100, 60, 0, 0, true, {100, 100, 100, 100}, {200, 140, 100, 100}},
      {-30, -20, 0, 0, true, {100, 100, 100}, {70, 90, 100}},
      {0.5, 0.25, 1, 0, false, {100, 100, 100}, {150, 125, 100}},
      // The whole new score is truncated toward zero; below zero it is 0.
      {0.7, 0, 0, 0, false, {10}, {10}},
      {-0.15, 0, 1, 0, false, {7}, {5}},
      {-150, 0, 0, 0, false, {100, 200}, {0, 50}},
      {100, 10, 2, 0, false, {100, 5}, {100, 5}},
  };
  for (const Case& c : cases) {
    std::vector<std::pair<int32_t, int32_t>> input;
    for (std::size_t i = 0; i < c.scores.size(); ++i) {
      input.emplace_back(static_cast<int32_t>(i + 1), c.scores[i]);
    }
    CItems rows = Rows(input);
    order_.AdjustWeight(rows, context_, c.start, c.step, c.type, c.stop_count, c.stop_at_zero);
    EXPECT_EQ(Column(rows, 1), c.adjusted) << c.start << " " << c.step << " type " << c.type;
  }
  CItems rows = Rows(kScored);
  context_.score_support = false;
  EXPECT_EQ(Raised<CGiTreeRowsetException>([&] {
              order_.AdjustWeight(rows, context_, 1, 0, 0, 0, true);
            }).text,
            kAdjustText);
}

TEST_F(ResultOrderTest, GroupsHoldOneRowPerRunWithCountsPerSortLevel) {
  CItems rows = Rows(kScored);
  Order(rows, "SCORE, KEY");
  ASSERT_EQ(Column(rows, 0), (Ints{2, 4, 1, 3, 5}));
  order_.CollectItems(rows);
  ASSERT_EQ(order_.GetTotalGroups(), 5);

  // Each level counts the rows of the run that closes at the group, 0 elsewhere.
  Ints scores, keys, score_counts, key_counts;
  for (int guard = 0; !order_.IsEOB() && guard < 10; ++guard) {
    scores.push_back(order_.GetValue(rows, "score", context_));
    keys.push_back(order_.GetValue(rows, "ID", context_));
    score_counts.push_back(order_.GetCount(rows, "SCORE", context_));
    key_counts.push_back(order_.GetCount(rows, "KEY", context_));
    order_.MoveNext();
  }
  EXPECT_EQ(scores, (Ints{70, 70, 50, 50, 10}));
  EXPECT_EQ(keys, (Ints{2, 4, 1, 3, 5}));
  EXPECT_EQ(score_counts, (Ints{0, 2, 0, 2, 1}));
  EXPECT_EQ(key_counts, (Ints{1, 1, 1, 1, 1}));
  order_.MovePrev();
  EXPECT_FALSE(order_.IsEOB());
  EXPECT_EQ(order_.GetValue(rows, "KEY", context_), 3);

  struct Window {
    const char* column;
    int32_t first;
    int32_t num;
    const char* values;
    const char* keys;
    int32_t groups;
  };
  const Window windows[] = {
      {"SCORE", 1, 0, "(70,50,10)", "(2,4,1,3,5)", 3},
      {"SCORE", 1, 2, "(70)", "(2,4)", 1},
      {"SCORE", 0, 4, "(70,50)", "(2,4,1,3)", 2},
      {"KEY", 2, 2, "(4,1)", "(4,1)", 2},
      {"SCORE", 6, 3, "()", "()", 0},
  };
  for (const Window& w : windows) {
    SCOPED_TRACE(std::string(w.column) + " " + std::to_string(w.first) + "+" + std::to_string(w.num));
    EXPECT_EQ(order_.GetGroupString(rows, w.column, context_, w.first, w.num), w.values);
    EXPECT_EQ(order_.GetGroupKeyString(rows, w.column, context_, w.first, w.num), w.keys);
    EXPECT_EQ(order_.GetNumGroups(), w.groups);
  }

  // Group SQL: the command's SQL for the keys, the order list without SCORE.
  const auto rebuild = [](const std::string& keys) { return "select * from t where Id in " + keys; };
  EXPECT_EQ(order_.GetGroupSql(rows, "SCORE", context_, 3, 2, rebuild),
            "select * from t where Id in (1,3) order by Id ASC");
  EXPECT_EQ(order_.GetGroupSql(rows, "SCORE", context_, 6, 1, rebuild), "");
}

TEST_F(ResultOrderTest, ASingleLevelOfEqualScoresMakesOneGroupPerScore) {
  CItems rows = Rows(kScored);
  order_.SetOrder(rows, "SCORE", false, context_);
  order_.SortItems(rows, context_);
  order_.CollectItems(rows);
  EXPECT_EQ(order_.GetTotalGroups(), 3);
  Ints counts;
  for (int guard = 0; !order_.IsEOB() && guard < 10; ++guard) {
    counts.push_back(order_.GetCount(rows, "SCORE", context_));
    order_.MoveNext();
  }
  EXPECT_EQ(counts, (Ints{2, 2, 1}));
  // Without the order clause no order list follows the group SQL.
  EXPECT_EQ(order_.GetGroupSql(rows, "SCORE", context_, 1, 1, [](const std::string& k) { return k; }),
            "(4,2)");
}

TEST_F(ResultOrderTest, GroupReadsRefuseUncollectedUnknownAndUnorderedColumns) {
  CItems rows = Rows(kScored);
  Order(rows, "SCORE");
  struct Case {
    const char* column;
    const char* text;
  };
  for (const Case& c : {Case{"ORDERS.DAY", "Result set has not been collected"},
                        Case{"SCORE", "Result set has not been collected"}}) {
    EXPECT_EQ(Raised<CGiTreeRowsetException>([&] { order_.GetValue(rows, c.column, context_); }).text,
              std::string(c.text) + " (Module:GiTreeRowset,Method:GetValue)");
  }
  order_.CollectItems(rows);
  EXPECT_EQ(Raised<CGiTreeRowsetException>([&] { order_.GetValue(rows, "ORDERS.DAY", context_); }).text,
            "Group name not found (Module:GiTreeRowset,Method:GetValue)");
  EXPECT_EQ(Raised<CGiTreeRowsetException>([&] { order_.GetCount(rows, "KEY", context_); }).text,
            "Column KEY is not ordered (Module:GiTreeRowset,Method:GetCount)");

  CItems empty = Rows({});
  Order(empty, "SCORE");
  order_.CollectItems(empty);
  EXPECT_EQ(order_.GetTotalGroups(), 0);
  EXPECT_TRUE(order_.IsEOB());
  EXPECT_EQ(Raised<CGiTreeRowsetException>([&] { order_.GetValue(empty, "SCORE", context_); }).text,
            "Out of bound (Module:GiTreeRowset,Method:GetValue)");
}

}  // namespace
}  // namespace qm
