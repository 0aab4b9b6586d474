// Statements evaluated end to end over findexes built from SQLite: every
// operator and modifier, phrases and NEAR across sentence and column gaps,
// typed findexes, deleted keys, add-on findexes, the cache size, paging and
// appended commands.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "search/record_writer.h"
#include "search/search_fixture.h"

namespace qm {
namespace {

using KeyList = std::vector<int32_t>;
using test::RecordWriter;

class SearchEvaluationTest : public test::SearchFixture {
 protected:
  // Positions: body first (columns go by name), a gap, then title; a
  // sentence end leaves a gap too.
  void BuildWines() {
    Sql({"create table wines (id integer, title varchar(50), body varchar(100))",
         "insert into wines values (1, 'red wine', 'cheap red wine from the south')",
         "insert into wines values (2, 'white wine', 'tasting red. Wine cellar')",
         "insert into wines values (3, 'beer', 'red beer and wine')",
         "insert into wines values (4, 'wine list', 'a good red')",
         "insert into wines values (5, 'cheese', 'red cheese with wine')",
         "insert into wines values (6, 'water', 'plain water')",
         "insert into wines values (7, 'library', 'python library for perl')",
         "insert into wines values (8, 'libraries', 'lib of python')",
         "insert into wines values (10, 'again', 'red wine and then red again')",
         "insert into wines values (11, 'red', 'paint')"});
    Options(true, true);
    ASSERT_EQ(Run("CREATE FINDEX Wines ON TABLE wines COLUMNS title,body KEY id"), "");
  }
};

TEST_F(SearchEvaluationTest, OperatorsModifiersAndPatternsFindTheRowsTheyDescribe) {
  BuildWines();
  struct Case {
    const char* condition;
    KeyList keys;
  };
  const std::vector<Case> cases = {
      {"WINES='wine'", {1, 2, 3, 4, 5, 10}},
      {"WINES='nowhere'", {}},
      {"WINES='wine' AND WINES='cheese'", {5}},
      {"WINES='wine' AND WINES='nowhere'", {}},
      {"WINES='beer' OR WINES='cheese'", {3, 5}},
      {"WINES='beer' OR WINES='nowhere'", {3}},
      {"WINES='wine' AND NOT WINES='cheese'", {1, 2, 3, 4, 10}},
      {"NOT WINES='wine'", {6, 7, 8, 11}},
      {"WINES='red' FILTER WINES='beer'", {3}},
      {"WINES='red' FILTER NOT WINES='beer'", {1, 2, 4, 5, 10, 11}},
      {"(WINES='beer' OR WINES='water') AND NOT WINES='red'", {6}},
      // Phrases: adjacent in one sentence of one column only.
      {"WINES='red wine'", {1, 10}},
      {"WINES='tasting red'", {2}},
      {"WINES='good red wine'", {}},
      {"WINES='red wine and then red'", {10}},
      // NEAR/n: n words between, plus the left side's words.
      {"WINES='red' NEAR/1 WINES='wine'", {1, 2, 3, 4, 5, 10}},
      {"WINES='red' NEAR/0 WINES='wine'", {1, 2, 4, 10}},
      {"WINES='python' NEAR/1 WINES='library'", {7}},
      {"WINES='python' NEAR WINES='perl'", {7}},
      // Patterns.
      {"WINES='lib*'", {7, 8}},
      {"WINES='lib'", {8}},
      // Similar words.
      {"WINES=^2'wxnx'", {1, 2, 3, 4, 5, 10}},
      {"WINES=~50'wxnx'", {1, 2, 3, 4, 5, 10}},
      // Ranges of words.
      {"WINES>'water'", {1, 2, 3, 4, 5, 10}},
      {"WINES>='water'", {1, 2, 3, 4, 5, 6, 10}},
      {"WINES<'beer'", {3, 4, 10}},
      {"WINES<='beer'", {3, 4, 10}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.condition);
    const test::SearchOutcome found = Search(c.condition);
    EXPECT_EQ(found.error, "");
    EXPECT_EQ(found.keys, c.keys);
    EXPECT_EQ(found.total, static_cast<int32_t>(c.keys.size()));
    EXPECT_EQ(found.scores.size(), found.keys.size());
  }
}

TEST_F(SearchEvaluationTest, ProximityFindsEitherWordAndRanksCloseWordsHigher) {
  BuildWines();
  const test::SearchOutcome found = Search("WINES=|'red wine'");
  ASSERT_EQ(found.error, "");
  EXPECT_EQ(found.keys, (KeyList{1, 2, 3, 4, 5, 10, 11}));
  const auto score = [&](int32_t key) {
    return found.scores[static_cast<std::size_t>(
        std::find(found.keys.begin(), found.keys.end(), key) - found.keys.begin())];
  };
  EXPECT_GT(score(1), score(11)) << "adjacent words against one word";
  EXPECT_GT(score(1), score(3)) << "adjacent words against words two apart";
  // With a distance, only rows with both words within it remain.
  EXPECT_EQ(Search("WINES=|1'red wine'").keys, (KeyList{1, 2, 4, 10}));
}

TEST_F(SearchEvaluationTest, TypedFindexesCompareValuesAndRefuseWordsOfAnotherType) {
  Sql({"create table nums (id integer, amount integer, price double precision, seen timestamp)",
       "insert into nums values (1, 10, 2.5, '2024-03-09 14:05:07')",
       "insert into nums values (2, 20, 7.25, '2025-01-31 08:00:00')",
       "insert into nums values (3, 30, 7.25, '2025-01-31 17:30:00')"});
  // Without stop words: "OR" between two values stays an operator.
  Options(false, true);
  ASSERT_EQ(Run("CREATE FINDEX Amounts ON TABLE nums COLUMNS amount KEY id"), "");
  ASSERT_EQ(Run("CREATE FINDEX Prices ON TABLE nums COLUMNS price KEY id"), "");
  ASSERT_EQ(Run("CREATE FINDEX Seen ON TABLE nums COLUMNS seen KEY id"), "");
  struct Case {
    const char* condition;
    KeyList keys;
    const char* error;  // a text the failure holds
  };
  // Each value type's text is read once per kind of value; how ranges of
  // each type compare is FindexLookupTest's.
  const std::vector<Case> cases = {
      {"AMOUNTS='20'", {2}, ""},
      {"AMOUNTS='0'", {}, ""},
      {"AMOUNTS='-7'", {}, ""},
      {"AMOUNTS>'10'", {2, 3}, ""},
      {"AMOUNTS<'25'", {1, 2}, ""},
      {"AMOUNTS='10' OR '30'", {1, 3}, ""},
      {"AMOUNTS!='20'", {1, 3}, ""},
      {"NOT PRICES='7.25'", {1}, ""},
      {"NOT SEEN='2025-01-31'", {1}, ""},
      {"AMOUNTS='abc'", {}, "Not a valid integer (Module:GiTreeRowset,Method:SearchNext)"},
      {"AMOUNTS='12abc'", {}, "Not a valid integer"},
      {"AMOUNTS='99999999999'", {}, "Not a valid integer"},
      {"PRICES='7.25'", {2, 3}, ""},
      {"PRICES='cheap'", {}, "Not a valid double (Module:GiTreeRowset,Method:SearchNext)"},
      {"SEEN='2025-01-31'", {2, 3}, ""},
      {"SEEN='2025-01-31 08:00:00'", {2}, ""},
      {"SEEN='not a date'", {}, "Invalid date or time"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.condition);
    const test::SearchOutcome found = Search(c.condition);
    EXPECT_NE(found.error.find(c.error), std::string::npos) << found.error;
    if (*c.error == '\0') {
      EXPECT_EQ(found.error, "");
    }
    EXPECT_EQ(found.keys, c.keys);
  }
}

TEST_F(SearchEvaluationTest, SearchWordsAreNormalisedAsTheIndexerDid) {
  Sql({"create table words (id integer, body varchar(50))",
       "insert into words values (1, 'the runner runs')",
       "insert into words values (2, 'running water')", "insert into words values (3, 'smith')",
       "insert into words values (4, 'smyth')", "insert into words values (5, 'ruby')"});
  Options(false, true);
  // English stemming, then the phonetic code.
  ASSERT_EQ(command_->SetIndexLanguageOptions(2, -1, -1, 0, 0, 0), S_OK);
  ASSERT_EQ(Run("CREATE FINDEX Words ON TABLE words COLUMNS body KEY id"), "");
  struct Case {
    const char* condition;
    KeyList keys;
  };
  const std::vector<Case> cases = {
      {"WORDS='run'", {1, 2}},
      {"WORDS='runs'", {1, 2}},
      {"WORDS='Running'", {1, 2}},
      {"WORDS='smith'", {3, 4}},
      {"WORDS='smith' AND NOT WORDS='smyth'", {}},
      {"WORDS='runner runs'", {1}},
      {"WORDS='runs runner'", {}},
      {"WORDS='running water'", {2}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.condition);
    EXPECT_EQ(Keys(c.condition), c.keys);
  }
}

TEST_F(SearchEvaluationTest, DeletedKeysNeverAppear) {
  BuildWines();
  ASSERT_EQ(Run("DELETE FROM FINDEX Wines 3"), "");
  ASSERT_EQ(Run("DELETE FROM FINDEX Wines 10"), "");
  EXPECT_EQ(Keys("WINES='wine'"), (KeyList{1, 2, 4, 5}));
  EXPECT_EQ(Keys("WINES='beer'"), KeyList{});
  EXPECT_EQ(Keys("NOT WINES='cheese'"), (KeyList{1, 2, 4, 6, 7, 8, 11}));
  EXPECT_EQ(Keys("WINES='w*'"), (KeyList{1, 2, 4, 5, 6}));
}

TEST_F(SearchEvaluationTest, AddOnFindexesJoinTheirFindexInKeyOrder) {
  // 2,000 words make the update go to an add-on findex.
  std::vector<std::string> rows;
  for (int32_t id = 1; id <= 666; ++id) {
    const std::string w = "w" + std::to_string(id);
    rows.push_back("insert into big values (" + std::to_string(id) + ", '" + w + "a " + w + "b " +
                   w + "c')");
  }
  rows.insert(rows.begin(), "create table big (id integer, body varchar(100))");
  rows.push_back("insert into big values (667, 'two words')");
  Sql(rows);
  Options(false, true);
  ASSERT_EQ(Run("CREATE FINDEX Big ON TABLE big COLUMNS body KEY id"), "");
  Sql({"insert into big values (668, 'w668a w5a')", "insert into big values (669, 'w669a words')",
       "insert into big values (670, 'two w66b')"});
  ASSERT_EQ(Run("UPDATE FINDEX Big"), "");
  ASSERT_TRUE(std::filesystem::exists(IndexFolder() + "BIG_ADD_1.sdx"));
  ASSERT_EQ(Run("DELETE FROM FINDEX Big 669"), "");

  struct Case {
    const char* condition;
    KeyList keys;
  };
  const std::vector<Case> cases = {
      {"BIG='two'", {667, 670}},
      {"BIG='w5a'", {5, 668}},
      {"BIG='words'", {667}},
      {"BIG='w669a'", {}},
      {"BIG='w66*'", {66, 660, 661, 662, 663, 664, 665, 666, 668, 670}},
      {"BIG='w66b' OR BIG='two'", {66, 667, 670}},
      {"BIG='two words'", {667}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.condition);
    EXPECT_EQ(Keys(c.condition), c.keys);
  }
}

TEST_F(SearchEvaluationTest, RepositoriesSearchEveryMemberFindexAsOne) {
  const std::string folder = GroupFolder() + "Repositories/";
  std::filesystem::create_directories(folder);
  struct Member {
    const char* collector;
    int32_t number;
    std::vector<std::string> rows;
  };
  const std::vector<Member> members = {{"C1", 4, {"1, 'river'", "2, 'lake'"}},
                                       {"C2", 9, {"3, 'river'", "7, 'sea'"}},
                                       {"C3", 12, {"5, 'river'", "2, 'river'"}}};
  RecordWriter repository;
  repository.Int(1).Text("x").Date(2024, 1, 2).Text("y").Text("").Date(2024, 1, 2).Int(7).Int(3);
  for (const Member& m : members) {
    const std::string table = std::string("lib_") + m.collector;
    std::vector<std::string> statements{"create table " + table + " (id integer, t varchar(20))"};
    for (const std::string& row : m.rows)
      statements.push_back("insert into " + table + " values (" + row + ")");
    Sql(statements);
    ASSERT_EQ(Run("CREATE FINDEX _R_LIB_" + std::to_string(m.number) + " ON TABLE " + table +
                  " COLUMNS t KEY id"),
              "");
    RecordWriter collector;
    collector.Int(1).Text("a").Date(2024, 1, 2).Date(2024, 1, 2).Text("b").Text("c").Int(m.number);
    collector.Text("").Int(5).Int(0).Int(0).Int(0).Text("s1").Text("s2");
    test::WriteFile(folder + "LIB_" + m.collector + ".col", collector.Block());
    repository.Text(m.collector).Int(5);
  }
  test::WriteFile(folder + "LIB.rep", repository.Block());
  ASSERT_EQ(Run("DELETE FROM FINDEX _R_LIB_12 5"), "");

  struct Case {
    const char* condition;
    KeyList keys;
  };
  const std::vector<Case> cases = {
      {"LIB='river'", {1, 2, 3}},
      {"LIB='riv*'", {1, 2, 3}},
      {"LIB='river' AND NOT LIB='lake'", {1, 3}},
      {"NOT LIB='river'", {7}},
      {"LIB='sea' OR LIB='lake'", {2, 7}},
      {"LIB>'lake'", {1, 2, 3, 7}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.condition);
    EXPECT_EQ(Keys(c.condition), c.keys);
  }
}

TEST_F(SearchEvaluationTest, CacheSizeCutsReadsAndMergesAndSaysSo) {
  std::vector<std::string> rows{"create table counts (id integer, body varchar(20))"};
  for (int32_t id = 1; id <= 40; ++id) {
    rows.push_back("insert into counts values (" + std::to_string(id) + ", '" +
                   (id % 2 == 1 ? "alpha" : "beta") + "')");
  }
  Sql(rows);
  Options(true, true);  // rows of 12 bytes: key, score, position
  ASSERT_EQ(Run("CREATE FINDEX Counts ON TABLE counts COLUMNS body KEY id"), "");

  const test::SearchOutcome whole = Search("COUNTS='alpha' OR COUNTS='beta'");
  EXPECT_EQ(whole.total, 40);
  EXPECT_FALSE(whole.truncated);
  // Ten row widths: 9 rows and the count row.
  const test::SearchOutcome cut = Search("COUNTS='alpha' OR COUNTS='beta'", 10 * 12);
  EXPECT_EQ(cut.keys, (KeyList{1, 2, 3, 4, 5, 6, 7, 8, 9}));
  EXPECT_TRUE(cut.truncated);
  const test::SearchOutcome word = Search("COUNTS='alpha'", 10 * 12);
  EXPECT_TRUE(word.truncated);
  EXPECT_EQ(word.keys, (KeyList{1, 3, 5, 7, 9, 11, 13, 15, 17}));
  const test::SearchOutcome roomy = Search("COUNTS='alpha'", 21 * 12);
  EXPECT_FALSE(roomy.truncated);
  EXPECT_EQ(roomy.total, 20);
}

TEST_F(SearchEvaluationTest, WindowsAndAppendedCommands) {
  BuildWines();
  CGlobalDefs defs = Defs();
  CGiTreeRowset rowset(defs);
  rowset.Commands()
      .Add(std::make_unique<CGiCmdTree>(defs))
      .SplitSqlW(u"SELECT ID FROM T WHERE [WINES='red' OR WINES='water']");
  rowset.StartRowset(1, false);
  ASSERT_EQ(rowset.GetTotal(), 8);
  EXPECT_EQ(rowset.SqlOrder(), "id ASC");
  struct Window {
    int32_t start, count;
    int32_t first, num;
  };
  const std::vector<Window> windows = {{5, 10, 5, 4}, {1, 3, 1, 3},  {8, 1, 8, 1},
                                       {9, 5, 9, 0},  {-2, 2, 1, 2}, {3, -1, 3, 0}};
  for (const Window& w : windows) {
    SCOPED_TRACE(std::to_string(w.start) + "," + std::to_string(w.count));
    rowset.SetLimits(w.start, w.count);
    EXPECT_EQ(rowset.GetFirst(), w.first);
    EXPECT_EQ(rowset.GetNum(), w.num);
  }

  rowset.Commands()
      .Add(std::make_unique<CGiCmdTree>(defs))
      .SplitSqlW(u"SELECT ID FROM T WHERE [WINES='python']");
  rowset.StartRowset(2, true);
  EXPECT_EQ(rowset.GetCommandCount(), 2);
  EXPECT_EQ(rowset.GetTotal(), 10);
  const CItems& result = rowset.Result();
  std::vector<std::pair<int32_t, int32_t>> key_and_command;
  for (int32_t i = 1; i < result.Count(); ++i) {
    key_and_command.emplace_back(result.Key(i), result.Row(i)[result.Width() - 1]);
  }
  EXPECT_EQ(key_and_command,
            (std::vector<std::pair<int32_t, int32_t>>{
                {1, 1}, {2, 1}, {3, 1}, {4, 1}, {5, 1}, {6, 1}, {10, 1}, {11, 1}, {7, 2}, {8, 2}}));
}

TEST_F(SearchEvaluationTest, MissingFindexAndDamagedDeletedKeysAreErrors) {
  BuildWines();
  EXPECT_NE(Search("NOWHERE='wine'").error, "");
  test::WriteFile(IndexFolder() + "WINES.del", std::string("\x05\x00\x00\x00\x01\x00", 6));
  const test::SearchOutcome damaged = Search("WINES='wine'");
  EXPECT_NE(damaged.error.find("Deleted-key file is damaged"), std::string::npos) << damaged.error;
  EXPECT_TRUE(damaged.keys.empty());
}

}  // namespace
}  // namespace qm
