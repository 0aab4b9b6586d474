// Findex builds through the two-thread, memory-bounded sort against real data
// sources: the same files as the earlier two-way merge sort under a budget
// that forces many runs, whole text columns and the cut of values over the
// limit, and failures of either thread leaving the old findex as it was.
#include <gtest/gtest.h>
#include <stdlib.h>

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "base/exception.h"
#include "index/findex_files_writer.h"
#include "index/findex_writer.h"
#include "index/sorted_entries.h"
#include "index/word_sort.h"
#include "support/findex_decoder.h"
#include "support/test_sources.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::Source;

// General flags: split text at the default separators (no scores, no phrases).
constexpr int32_t kSplitWords = 4;

// A configuration value for the life of the object.
class ScopedSetting {
 public:
  ScopedSetting(const char* name, const char* value) : name_(name) { setenv(name, value, 1); }
  ~ScopedSetting() { unsetenv(name_); }
  ScopedSetting(const ScopedSetting&) = delete;
  ScopedSetting& operator=(const ScopedSetting&) = delete;

 private:
  const char* name_;
};

class BuildSortTest : public test::SourceRowsTest {
 protected:
  BuildSortTest() : SourceRowsTest("bs_") {}

  void SetUp() override {
    SourceRowsTest::SetUp();
    fs::create_directories(Indexes());
  }

  std::string Indexes() const { return home_.Data() + "Groups/PUBLIC/Indexes/"; }

  static CIndexHeader Findex(const std::string& name, const std::string& table, ColumnMap columns,
                             int32_t flags) {
    CIndexHeader d;
    d.IndexName = name;
    d.TableName = table;
    d.KeyColumn = "id";
    d.Columns = std::move(columns);
    d.GeneralFlags = flags;
    d.LanguageFlags = 0;
    return d;
  }

  // Sorts with method and writes the findex: runs as a build does, the
  // writer beside the final merge; the two-way merge through its sorted
  // file. Returns the runs the sort wrote.
  int64_t Build(CIndexHeader d, EntrySortingThread::Method method) {
    CPiSort sort(home_.Defs());
    if (method == EntrySortingThread::Method::Runs) {
      sort.SortFindexRows(d);
      CPiFIndex(home_.Defs()).BuildFromSorted(d, sort.Merged(), true);
    } else {
      sort.SetSortMethodForTesting(method);
      MFile sorted;
      sort.SortFindexTable(d, sorted);
      CPiFIndex(home_.Defs()).BuildFromSorted(d, sorted, true);
    }
    return sort.LastPhases().run_count;
  }

  test::DecodedFindex Decode(const std::string& upper, int32_t type, int32_t flags) const {
    return test::DecodeFindex(Indexes() + upper + ".sdx", Indexes() + upper + ".fst", type, flags);
  }

  // The keys of word in a decoded text findex.
  static std::vector<int32_t> Keys(const test::DecodedFindex& f, const std::string& word) {
    std::vector<int32_t> keys;
    for (const test::Word& w : f.words) {
      if (test::WordText(w.value) != word) continue;
      for (const test::Posting& p : w.postings) keys.push_back(p[0]);
    }
    return keys;
  }

  // The whole chain of what body raised; empty when it raised nothing.
  static std::string Failure(const std::function<void()>& body) {
    try {
      body();
    } catch (const CExceptionBase& e) {
      return e.GetFullTextUtf8(100);
    }
    return {};
  }
};

INSTANTIATE_TEST_SUITE_P(Sources, BuildSortTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         test::SourceName);

class BuildSortTestSqlite : public BuildSortTest {};
INSTANTIATE_TEST_SUITE_P(Sources, BuildSortTestSqlite, ::testing::Values(Source::SQLite),
                         test::SourceName);

TEST_P(BuildSortTest, RunsAndTheTwoWayMergeWriteTheSameFindexFiles) {
  // A 1 MB budget and 40,000 rows of two values each: every findex type
  // sorts through several runs.
  const ScopedSetting budget("MORVIL_SORT_MEMORY_MB", "1");
  const std::string t = Table(
      "id INTEGER, n INTEGER, n2 INTEGER, r DOUBLE PRECISION, r2 DOUBLE PRECISION, d TIMESTAMP, "
      "d2 TIMESTAMP, body VARCHAR(200)");
  const std::string series =
      GetParam() == Source::SQLite
          ? "WITH RECURSIVE s(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM s WHERE x < 40000) "
          : "WITH s(x) AS (SELECT generate_series(1, 40000)) ";
  const auto date = [&](const char* month, const char* day) {
    return GetParam() == Source::SQLite
               ? "printf('2024-%02d-%02d 10:00:00', " + std::string(month) + ", " + day + ")"
               : "make_timestamp(2024, " + std::string(month) + ", " + day + ", 10, 0, 0)";
  };
  // Few distinct values, each spread over many keys, in shuffled key order.
  Run("INSERT INTO " + t + " " + series +
      "SELECT (x * 7919) % 40009, x % 97, x % 31, (x % 89) * 0.5, (x % 13) * 0.25, " +
      date("x % 12 + 1", "x % 28 + 1") + ", " + date("x % 5 + 1", "x % 3 + 1") +
      ", 'river ' || (x % 61) || ' stone ' || (x % 7) || ' river' FROM s");
  struct Case {
    ColumnMap columns;
    int32_t flags;  // score and phrase support decide the row width
    int32_t type;
  };
  const int32_t text = GetParam() == Source::PostgresUnicode ? 4 : 2;
  const Case cases[] = {{{{"n", {}}, {"n2", {}}}, 3, 1},
                        {{{"r", {}}, {"r2", {}}}, 1, 6},
                        {{{"d", {}}, {"d2", {}}}, 2, 3},
                        {{{"body", {}}}, 7, text},
                        {{{"body", {}}}, kSplitWords, text}};
  for (const Case& c : cases) {
    SCOPED_TRACE(testing::Message() << "type " << c.type << " flags " << c.flags);
    EXPECT_GE(Build(Findex("Runs", t, c.columns, c.flags), EntrySortingThread::Method::Runs), 3);
    Build(Findex("Merge", t, c.columns, c.flags), EntrySortingThread::Method::TwoWayMerge);
    const std::string fst = test::ReadFile(Indexes() + "RUNS.fst");
    const std::string sdx = test::ReadFile(Indexes() + "RUNS.sdx");
    EXPECT_TRUE(fst == test::ReadFile(Indexes() + "MERGE.fst")) << "the .fst files differ";
    // Block 0 holds the header with its build times; the tree follows.
    ASSERT_GT(sdx.size(), 4096u);
    EXPECT_TRUE(sdx.substr(4096) == test::ReadFile(Indexes() + "MERGE.sdx").substr(4096))
        << "the trees differ";
    const auto runs = Decode("RUNS", c.type, c.flags);
    EXPECT_EQ(runs.faults, std::vector<std::string>{});
    EXPECT_EQ(runs.findex_type, c.type);
    EXPECT_GT(runs.words.size(), 1u);
  }
  // The traces show the runs merged in one pass.
  EXPECT_NE(home_.TraceText().find("Sorting. Turns Left: 1"), std::string::npos);
  EXPECT_TRUE(home_.WorkFiles().empty());
}

TEST_P(BuildSortTest, TheLastWordOfALongTextIsFound) {
  const std::string t = Table("id INTEGER, body TEXT");
  std::string body;
  while (body.size() < 200000 - 12) body += "meadow ";
  body.resize(200000 - 12, ' ');
  body += " lastmeadowx";
  ASSERT_EQ(body.size(), 200000u);
  Run("INSERT INTO " + t + " VALUES (4, 'short text'), (9, '" + body + "')");
  CIndexHeader d = Findex("Long", t, {{"body", {}}}, kSplitWords);
  CPiFIndex(home_.Defs()).BuildRowFindex(d, true);
  const test::DecodedFindex f = Decode("LONG", d.FindexType, kSplitWords);
  EXPECT_EQ(Keys(f, "LASTMEADOWX"), std::vector<int32_t>{9});
  EXPECT_EQ(Keys(f, "MEADOW"), std::vector<int32_t>{9});
}

TEST_P(BuildSortTestSqlite, AValueOverTheLimitIsCutAndReported) {
  const ScopedSetting limit("MORVIL_MAX_COLUMN_TEXT_MB", "1");
  const std::string t = Table("id INTEGER, title TEXT, body TEXT");
  std::string body = "firstword ";
  while (body.size() < 1100000) body += "filler ";
  body += "beyondlimit";
  Run("INSERT INTO " + t + " VALUES (3, 'kept', 'within limit'), (7, 'also kept', '" + body +
      "')");
  CIndexHeader d = Findex("Cut", t, {{"title", {}}, {"body", {}}}, kSplitWords);
  CPiSort sort(home_.Defs());
  MFile sorted;
  sort.SortFindexTable(d, sorted);
  CPiFIndex(home_.Defs()).BuildFromSorted(d, sorted, true);
  EXPECT_EQ(sort.CutValues(), 1);
  const test::DecodedFindex f = Decode("CUT", d.FindexType, kSplitWords);
  EXPECT_EQ(Keys(f, "FIRSTWORD"), std::vector<int32_t>{7});
  EXPECT_EQ(Keys(f, "BEYONDLIMIT"), std::vector<int32_t>{});
  EXPECT_EQ(Keys(f, "LIMIT"), std::vector<int32_t>{3});
  EXPECT_NE(home_.TraceText().find(
                "Column text longer than 1 MB cut there. Findex: Cut, Key: 7, Column: body"),
            std::string::npos);
}

TEST_P(BuildSortTestSqlite, AFailureInEitherThreadEndsTheBuildWithItsErrorAndKeepsTheFindex) {
  const ScopedSetting budget("MORVIL_SORT_MEMORY_MB", "1");
  const std::string t = Table("id INTEGER, body TEXT");
  Run("INSERT INTO " + t +
      " WITH RECURSIVE s(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM s WHERE x < 40000) "
      "SELECT x, 'word' || (x % 500) || ' other' || (x % 13) || ' third' || (x % 7) || "
      "' fourth' || (x % 11) FROM s");
  const CIndexHeader d = Findex("Kept", t, {{"body", {}}}, 7);
  CIndexHeader first = d;
  CPiFIndex(home_.Defs()).BuildRowFindex(first, true);
  const std::string sdx = test::ReadFile(Indexes() + "KEPT.sdx");
  const std::string fst = test::ReadFile(Indexes() + "KEPT.fst");

  struct Case {
    const char* name;
    std::function<void()> arrange;
    const char* cause;  // in the raised chain
  };
  const Case cases[] = {
      // The row loop meets a key it cannot read, halfway through the rows.
      {"reader", [&] { Run("UPDATE " + t + " SET id = 'twenty' WHERE id = 20000"); },
       "Could not convert column value into appropriate type"},
      // The writer fails early, while the merge beside it still has more
      // entries than wait for the writer: the merge must stop too.
      {"writer",
       [&] {
         Run("UPDATE " + t + " SET id = 20000 WHERE id = 'twenty'");
         FindexLimits few_bytes;
         few_bytes.max_fst_bytes = 100000;
         SetFindexLimitsForTesting(few_bytes);
       },
       "32-bit positions"},
      // Runs cannot be written: the work folder is gone.
      {"sorter",
       [&] {
         SetFindexLimitsForTesting({});
         fs::remove_all(home_.WorkData());
       },
       "WorkData"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    c.arrange();
    CIndexHeader again = d;
    const std::string text = Failure([&] { CPiFIndex(home_.Defs()).BuildRowFindex(again, true); });
    EXPECT_NE(text.find(c.cause), std::string::npos) << text;
    EXPECT_TRUE(test::ReadFile(Indexes() + "KEPT.sdx") == sdx);
    EXPECT_TRUE(test::ReadFile(Indexes() + "KEPT.fst") == fst);
    std::vector<std::string> left;
    for (const auto& e : fs::directory_iterator(Indexes())) left.push_back(e.path().filename());
    EXPECT_EQ(left.size(), 2u) << "a temporary file is left";
  }
  EXPECT_FALSE(fs::exists(home_.WorkData()));
}

}  // namespace
}  // namespace qm
