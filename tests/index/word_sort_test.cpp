// The word sort against real data sources: the entries of the sorted file,
// the findex type, the row errors, document columns, and the files left
// behind.
#include "index/word_sort.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <tuple>

#include "platform/text_encoding.h"
#include "format/column_set.h"
#include "base/error_messages.h"
#include "base/exception_family.h"
#include "support/sorted_file_reader.h"
#include "support/test_sources.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using test::Source;

// (word or value as text, key, weight or 0, position or 0)
using Entry = std::tuple<std::string, int32_t, int32_t, int32_t>;

class WordSortTest : public test::SourceRowsTest {
 protected:
  WordSortTest() : SourceRowsTest("ws_") {}

  static CIndexHeader Findex(const std::string& table, ColumnMap columns, int32_t flags) {
    CIndexHeader d;
    d.IndexName = "Books";
    d.TableName = table;
    d.KeyColumn = "id";
    d.Columns = std::move(columns);
    d.GeneralFlags = flags;
    d.LanguageFlags = 0;
    return d;
  }

  std::vector<test::SortedEntry> Sort(CIndexHeader& d) {
    CPiSort sort(home_.Defs());
    MFile sorted;
    sort.SortFindexTable(d, sorted);
    const CColumnSet set = CColumnSet::FromGeneralFlags(d.GeneralFlags);
    auto entries = test::ReadSortedEntries(sorted, set.Width(), static_cast<VALUE_TYPE>(d.FindexType));
    // Positions ascend among entries of one value and key.
    test::ExpectSortedAndStable(entries, set.p != 0 ? set.PositionColumn() : -1);
    return entries;
  }

  std::vector<Entry> SortedEntries(CIndexHeader& d) {
    const CColumnSet set = CColumnSet::FromGeneralFlags(d.GeneralFlags);
    std::vector<Entry> out;
    for (const auto& e : Sort(d)) {
      out.emplace_back(test::WordText(e.value), e.row[0], set.s ? e.row[1] : 0,
                       set.p ? e.row[set.PositionColumn()] : 0);
    }
    return out;
  }

  std::vector<std::string> Values(CIndexHeader& d) {
    std::vector<std::string> out;
    for (const auto& e : SortedEntries(d)) out.push_back(std::get<0>(e));
    return out;
  }

  // The first message of the PiSort error the build raises, and its number.
  std::pair<std::string, int32_t> Failure(CIndexHeader d) {
    try {
      Sort(d);
    } catch (const CPiSortException& e) {
      return {Utf16ToUtf8(e.GetCurrentEntry().text), e.GetErrorNumber()};
    }
    return {"no error", 0};
  }
};

INSTANTIATE_TEST_SUITE_P(Sources, WordSortTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         test::SourceName);

// The rules below do not depend on the driver.
class WordSortTestSqlite : public WordSortTest {};
INSTANTIATE_TEST_SUITE_P(Sources, WordSortTestSqlite, ::testing::Values(Source::SQLite),
                         test::SourceName);

TEST_P(WordSortTest, IndexedColumnsAloneDecideTheFindexType) {
  const std::string t = Table("id INTEGER, n INTEGER, r DOUBLE PRECISION, d TIMESTAMP, label VARCHAR(20)");
  Run("INSERT INTO " + t + " VALUES (1, 10, 2.5, '2024-02-29 13:45:59', 'x')");
  Run("INSERT INTO " + t + " VALUES (2, -5, -1.25, '1999-12-31 23:59:59', NULL)");
  Run("INSERT INTO " + t + " VALUES (4, NULL, 10000000000, NULL, 'z')");

  // Integers widen to doubles; with phrases, the second column is position 1.
  CIndexHeader doubles = Findex(t, {{"n", {}}, {"r", {}}}, 6);
  EXPECT_EQ(SortedEntries(doubles),
            (std::vector<Entry>{{"-5.000000", 2, 0, 0}, {"-1.250000", 2, 0, 1},
                                {"2.500000", 1, 0, 1}, {"10.000000", 1, 0, 0},
                                {"10000000000.000000", 4, 0, 1}}));
  EXPECT_EQ(doubles.FindexType, 6);

  // The text column label is selected, not indexed.
  CIndexHeader selected = Findex(t, {{"d", {}}}, 4);
  selected.SqlUsedAsTable = 1;
  selected.SqlSelect = "select label, d, id from " + t;
  EXPECT_EQ(Values(selected), (std::vector<std::string>{"1999-12-31 23:59:59", "2024-2-29 13:45:59"}));
  EXPECT_EQ(selected.FindexType, 3);
}

TEST_P(WordSortTestSqlite, RowErrorsStopTheBuildWithTheirMessagesAndLeaveNoFile) {
  const std::string suffix = " (Module:PiSort,Method:WriteFindexRows)";
  // The binary column gives every row a work-file copy: they must go too.
  const std::string nulls = Table("id INTEGER, title TEXT, doc BLOB");
  Run("INSERT INTO " + nulls + " VALUES (1, 'a', X'41'), (NULL, 'b', X'42')");
  ColumnMap with_document = {{"title", {}}, {"doc", {{"CONTENT_TYPE", "DOCUMENT"}}}};
  EXPECT_EQ(Failure(Findex(nulls, with_document, 6)).first,
            "Unique key column contains NULL values" + suffix);

  const std::string empty = Table("id INTEGER, title TEXT");
  const auto [none, number] = Failure(Findex(empty, {{"title", {}}}, 6));
  EXPECT_EQ(number, 47);
  EXPECT_NE(none.find("(Module:PiSort,Method:SortFindexTable)"), std::string::npos) << none;
  EXPECT_TRUE(home_.WorkFiles().empty());

  // Rows without a single value still count, and give an empty sorted file.
  Run("INSERT INTO " + empty + " VALUES (5, NULL)");
  CIndexHeader all_null = Findex(empty, {{"title", {}}}, 6);
  EXPECT_TRUE(Sort(all_null).empty());
  EXPECT_EQ(all_null.KeyCount, 1);
}

TEST_P(WordSortTestSqlite, DocumentColumnsIndexTheirTextAndFilesOutsideTheBaseAreRefused) {
  test::WriteFile(home_.Data() + "Converters/Converters.txt", "ALL=[PLAIN_TEXT]\n");
  const std::string docs = home_.Data() + "docs/";
  fs::create_directories(docs + "sub");
  test::WriteFile(docs + "sub/inside.txt", "alpha beta");
  test::WriteFile(home_.Data() + "outside.txt", "secret words");
  fs::create_symlink(home_.Data() + "outside.txt", docs + "link.txt");

  const std::string t = Table("id INTEGER, path TEXT, doc BLOB, page TEXT");
  Run("INSERT INTO " + t + " VALUES (1, 'sub/inside.txt', X'67616D6D61', 'x.html')");
  Run("INSERT INTO " + t + " VALUES (2, '../outside.txt', NULL, NULL)");
  Run("INSERT INTO " + t + " VALUES (3, 'link.txt', NULL, NULL)");
  Run("INSERT INTO " + t + " VALUES (4, 'sub/../../docs2/x.txt', NULL, NULL)");
  CIndexHeader d = Findex(
      t,
      {{"path", {{"CONTENT_TYPE", "file_path"}, {"BASE_FILE_PATH", docs}}},
       {"doc", {{"CONTENT_TYPE", "DOCUMENT"}, {"DOCUMENT_TYPE", "txt"}}},
       {"page", {{"CONTENT_TYPE", "URL"}, {"BASE_URL", "http://127.0.0.1:1/"}}}},
      6);
  // doc, page, path: the page that cannot be fetched is empty text, which
  // moves the position on by one like any value without words.
  EXPECT_EQ(SortedEntries(d),
            (std::vector<Entry>{{"ALPHA", 1, 0, 5}, {"BETA", 1, 0, 6}, {"GAMMA", 1, 0, 1}}));
  const std::string trace = home_.TraceText();
  for (const char* refused : {"docs/../outside.txt", "docs/link.txt", "docs/sub/../../docs2/x.txt"}) {
    EXPECT_NE(trace.find(refused), std::string::npos) << refused;
  }
  EXPECT_EQ(trace.find("secret"), std::string::npos);
  EXPECT_NE(trace.find("Could not open url http://127.0.0.1:1/x.html"), std::string::npos);
  EXPECT_TRUE(home_.WorkFiles().empty());
}

TEST_P(WordSortTestSqlite, DefaultOptionsTakeTheLanguageDataOfTheDataRoot) {
  fs::copy(std::string(QM_SOURCE_DATA_DIR) + "Language", home_.Data() + "Language",
           fs::copy_options::recursive);
  const std::string t = Table("id INTEGER, body TEXT");
  Run("INSERT INTO " + t + " VALUES (4, 'The river and the fish')");
  CIndexHeader d;  // default options: phrases, English stop words
  d.TableName = t;
  d.KeyColumn = "id";
  d.Columns = {{"body", {}}};
  EXPECT_EQ(SortedEntries(d), (std::vector<Entry>{{"FISH", 4, 0, 2}, {"RIVER", 4, 0, 1}}));
}

}  // namespace
}  // namespace qm
