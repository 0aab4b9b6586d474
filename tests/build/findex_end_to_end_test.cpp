// Findexes built from real data sources through the command object: SQLite
// always, PostgreSQL through the ANSI and the Unicode driver when the test
// services run. Definitions with weights and tags, every findex type, key
// errors, background builds, every information value, updates into add-ons
// and rebuilds, deletes and drops.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <regex>
#include <string>
#include <thread>
#include <vector>

#include "build/data_source_fixture.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using test::Source;
using test::SourceName;

class FindexEndToEndTest : public test::DataSourceTest {};

TEST_P(FindexEndToEndTest, CreateFindexWithWeightsAndTagsAndEveryInformationValue) {
  const std::string books = Table(
      "books", "id integer, title varchar(100), body varchar(200)",
      {"1, 'River fish', 'The river runs'", "2, 'Mountain', 'Fish swim'", "3, NULL, 'Quiet'"});
  ASSERT_EQ(Run("CREATE FINDEX Books ON TABLE " + books +
                " COLUMNS title:CONTENT_WEIGHT = 3:CONTENT_TYPE=DEFAULT,body KEY id"),
            "");

  VARIANT_BOOL exists = VARIANT_FALSE;
  ASSERT_EQ(command_->FindexExist(T("BOOKS"), T("PUBLIC"), &exists), S_OK);
  EXPECT_EQ(exists, VARIANT_TRUE);
  EXPECT_TRUE(fs::exists(IndexFolder() + "BOOKS.sdx"));

  EXPECT_EQ(Info("Books", idxTableName), books);
  EXPECT_EQ(Info("Books", idxColumnNames), "body,title");
  EXPECT_EQ(Info("Books", idxKeyName), "id");
  // Read through the narrow ODBC calls, every driver describes text columns
  // as narrow ones, the Unicode PostgreSQL driver too.
  EXPECT_EQ(Info("Books", idxTypeName), "Text (Ansi)");
  EXPECT_EQ(Info("Books", idxType), "2");
  // RIVER FISH | RIVER RUNS (THE is a stop word) | MOUNTAIN | FISH SWIM | QUIET
  EXPECT_EQ(Info("Books", idxWordCount), "8");
  EXPECT_EQ(Info("Books", idxDistinctWordCount), "6");
  EXPECT_EQ(Info("Books", idxKeyCount), "3");
  EXPECT_EQ(Info("Books", idxFracmentationLevel), "0");
  EXPECT_EQ(Info("Books", idxVersion), "6.14");
  EXPECT_EQ(Info("Books", idxSQLUsedAsTable), "No");
  EXPECT_EQ(Info("Books", idxSQLSelect), "");
  EXPECT_EQ(Info("Books", idxDBConnectionString), connection_);
  EXPECT_EQ(Info("Books", idxDBDisplayName), "books source");
  const std::regex time(R"(\d{4}-\d{1,2}-\d{1,2} \d{1,2}:\d{1,2}:\d{1,2})");
  EXPECT_TRUE(std::regex_match(Info("Books", idxBuildTime), time)) << Info("Books", idxBuildTime);
  EXPECT_TRUE(std::regex_match(Info("Books", idxLastUpdateTime), time));
  EXPECT_EQ(Info("Books", idxIndexMaxSize), "");
  EXPECT_EQ(Info("Books", idxIndexStartValue), "");
}

TEST_P(FindexEndToEndTest, NumberAndDateColumnsMakeTypedFindexes) {
  const std::string values =
      Table("values", "id integer, amount integer, price double precision, seen timestamp",
            {"1, 10, 2.5, '2024-03-09 14:05:07'", "2, 20, 7.25, '2025-01-31 08:00:00'"});
  const std::pair<const char*, const char*> kColumns[] = {
      {"amount", "Integer"}, {"price", "Double"}, {"seen", "Date/Time"}};
  for (const auto& [column, type] : kColumns) {
    ASSERT_EQ(Run(std::string("CREATE FINDEX Typed ON TABLE ") + values + " COLUMNS " + column +
                  " KEY id"),
              "")
        << column;
    EXPECT_EQ(Info("Typed", idxTypeName), type) << column;
    EXPECT_EQ(Info("Typed", idxWordCount), "2");
  }
  // A findex over an SQL select (CreateFindex) stores the select lower-cased.
  const std::string select = "SELECT ID, AMOUNT FROM " + values + " WHERE AMOUNT > 15";
  ASSERT_EQ(command_->CreateFindex(T("Selected"), T(select), T("amount"), T("id")), S_OK)
      << LastError();
  EXPECT_EQ(Info("Selected", idxSQLUsedAsTable), "Yes");
  EXPECT_EQ(Info("Selected", idxSQLSelect),
            "select id, amount from " + values + " where amount > 15");
  EXPECT_EQ(Info("Selected", idxKeyCount), "1");
  EXPECT_EQ(Info("Selected", idxTableName), "");
}

TEST_P(FindexEndToEndTest, NullAndNonNumericKeysAreRefused) {
  const std::string nulls =
      Table("nullkeys", "id integer, t varchar(20)", {"1, 'one'", "NULL, 'two'"});
  std::string text = Run("CREATE FINDEX Nulls ON TABLE " + nulls + " COLUMNS t KEY id");
  EXPECT_NE(text.find("Unique key column contains NULL values"), std::string::npos) << text;
  const std::string words = Table("wordkeys", "id varchar(10), t varchar(20)", {"'a1', 'one'"});
  text = Run("CREATE FINDEX Words ON TABLE " + words + " COLUMNS t KEY id");
  EXPECT_NE(text.find("Unique key is not numeric"), std::string::npos) << text;
  EXPECT_TRUE(fs::is_empty(IndexFolder()));
}

TEST_P(FindexEndToEndTest, BackgroundBuildReportsProgressThenItsOutcome) {
  const std::string rows = Table("rows", "id integer, body varchar(100)");
  AddWordRows(rows, 1, 3000);
  ASSERT_EQ(
      command_->ExecuteEx(T("CREATE FINDEX Rows ON TABLE " + rows + " COLUMNS body KEY id"), 0),
      S_OK);
  std::vector<int32_t> seen{Progress()};
  while (seen.back() != 100 && seen.size() < 1000000) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    seen.push_back(Progress());
  }
  ASSERT_EQ(seen.back(), 100);
  EXPECT_TRUE(std::is_sorted(seen.begin(), seen.end())) << "progress never goes backwards";
  EXPECT_EQ(ErrorNumber(), 0);
  EXPECT_EQ(ErrorMsg(), "");
  EXPECT_EQ(Info("Rows", idxWordCount), "9000");

  // A build that fails in the background says so once.
  ASSERT_EQ(
      command_->Execute(T("CREATE FINDEX Gone ON TABLE " + prefix_ + "missing COLUMNS a KEY id")),
      S_OK);
  while (Progress() != 100) std::this_thread::sleep_for(std::chrono::milliseconds(1));
  EXPECT_EQ(ErrorNumber(), 1);
  EXPECT_FALSE(ErrorMsg().empty());
  EXPECT_EQ(ErrorMsg(), "");
  EXPECT_FALSE(fs::exists(IndexFolder() + "GONE.sdx"));
}

TEST_P(FindexEndToEndTest, UpdatesGoToAddOnsOrRebuildAndDropTakesEverything) {
  const std::string rows = Table("rows", "id integer, body varchar(100)");
  AddWordRows(rows, 1, 700);  // 2,100 words: updates go to add-ons
  ASSERT_EQ(Run("CREATE FINDEX Rows ON TABLE " + rows + " COLUMNS body KEY id"), "");
  AddWordRows(rows, 701, 710);
  ASSERT_EQ(Run("UPDATE FINDEX Rows"), "");
  EXPECT_EQ(Info("Rows", idxFracmentationLevel), "1");
  EXPECT_EQ(Info("Rows", idxKeyCount), "710");
  EXPECT_EQ(Info("Rows", idxWordCount), "2130");
  EXPECT_EQ(Info("Rows_ADD_1", idxKeyCount), "10") << "the add-on holds the new rows only";
  // An update with nothing new leaves everything as it is.
  ASSERT_EQ(Run("UPDATE FINDEX Rows"), "");
  EXPECT_EQ(Info("Rows", idxKeyCount), "710");

  // A small findex is rebuilt whole: no row indexed before is lost.
  const std::string few = Table("few", "id integer, body varchar(100)");
  AddWordRows(few, 1, 5);
  ASSERT_EQ(Run("CREATE FINDEX Few ON TABLE " + few + " COLUMNS body KEY id"), "");
  AddWordRows(few, 6, 7);
  ASSERT_EQ(Run("UPDATE FINDEX Few ON TABLE " + few + " COLUMNS body KEY id"), "");
  EXPECT_EQ(Info("Few", idxKeyCount), "7");
  EXPECT_EQ(Info("Few", idxFracmentationLevel), "0");

  ASSERT_EQ(Run("DELETE FROM FINDEX Rows 3"), "");
  EXPECT_TRUE(fs::exists(IndexFolder() + "ROWS.del"));
  ASSERT_EQ(Run("DROP FINDEX Rows"), "");
  for (const char* file :
       {"ROWS.sdx", "ROWS.fst", "ROWS.del", "ROWS_ADD_1.sdx", "ROWS_ADD_1.fst"}) {
    EXPECT_FALSE(fs::exists(IndexFolder() + file)) << file;
  }
  EXPECT_TRUE(fs::exists(IndexFolder() + "FEW.sdx"));
}

INSTANTIATE_TEST_SUITE_P(Sources, FindexEndToEndTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         SourceName);

}  // namespace
}  // namespace qm
