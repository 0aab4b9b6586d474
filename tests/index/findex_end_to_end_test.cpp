// Findexes built from real data sources through the command object: SQLite
// always, PostgreSQL through the ANSI and the Unicode driver when the test
// services run. Definitions with weights and tags, every findex type (narrow
// and Unicode text read back with the tests' own decoder), key errors,
// background builds and every information value.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <map>
#include <regex>
#include <string>
#include <thread>
#include <variant>
#include <vector>

#include "support/data_source_fixture.h"
#include "support/findex_decoder.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using test::Source;
using test::SourceName;

class FindexEndToEndTest : public test::DataSourceTest {};

TEST_P(FindexEndToEndTest, CreateFindexWithWeightsAndTagsAndEveryInformationValue) {
  const std::string books =
      Table("books", "id integer, title varchar(100), body varchar(200)",
            {"1, 'River fish', 'The river. Runs'", "2, 'Mountain', 'Fish swim'",
             "3, NULL, 'Quiet Москва'"});
  // Scores and phrases, so weights and positions are in the postings.
  ASSERT_EQ(command_->SetIndexGeneralOptions(-1, -1, 0, nullptr, -1, -1), S_OK);
  ASSERT_EQ(Run("CREATE FINDEX Books ON TABLE " + books +
                " COLUMNS title:CONTENT_WEIGHT = 3:CONTENT_TYPE=DEFAULT,body KEY id"),
            "");

  // Only the Unicode PostgreSQL driver describes text columns as wide.
  const bool unicode = GetParam() == Source::PostgresUnicode;
  const int32_t type = unicode ? 4 : 2;
  const test::DecodedFindex findex =
      test::DecodeFindex(IndexFolder() + "BOOKS.sdx", IndexFolder() + "BOOKS.fst", type, 3);
  EXPECT_EQ(findex.faults, std::vector<std::string>{});
  EXPECT_EQ(findex.findex_type, type);
  // Word -> postings (key, weight, position). body comes first in the column
  // map, title one position after its last word; a sentence end leaves a gap
  // too; only written words take a position (THE is a stop word); title
  // words weigh 3.
  std::map<std::string, std::vector<test::Posting>> words;
  for (const test::Word& word : findex.words) words[test::WordText(word.value)] = word.postings;
  const std::map<std::string, std::vector<test::Posting>> expected = {
      {"FISH", {{1, 3, 6}, {2, 1, 1}}},
      {"MOUNTAIN", {{2, 3, 4}}},
      {"QUIET", {{3, 1, 1}}},
      {"RIVER", {{1, 1, 1}, {1, 3, 5}}},
      {"RUNS", {{1, 1, 3}}},
      {"SWIM", {{2, 1, 2}}},
      {"МОСКВА", {{3, 1, 2}}}};
  EXPECT_EQ(words, expected);

  EXPECT_EQ(Info("Books", idxTableName), books);
  EXPECT_EQ(Info("Books", idxColumnNames), "body,title");
  EXPECT_EQ(Info("Books", idxKeyName), "id");
  EXPECT_EQ(Info("Books", idxTypeName), unicode ? "Text (Unicode)" : "Text (Ansi)");
  EXPECT_EQ(Info("Books", idxType), std::to_string(type));
  EXPECT_EQ(Info("Books", idxWordCount), "9");
  EXPECT_EQ(Info("Books", idxDistinctWordCount), "7");
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
  struct Typed {
    const char* column;
    const char* type_name;
    test::WordValue first, second;  // the values of keys 1 and 2
  };
  const Typed kColumns[] = {
      {"amount", "Integer", int32_t{10}, int32_t{20}},
      {"price", "Double", 2.5, 7.25},
      {"seen", "Date/Time", test::Date16{2024, 3, 9, 14, 5, 7, 0},
       test::Date16{2025, 1, 31, 8, 0, 0, 0}}};
  for (const Typed& c : kColumns) {
    SCOPED_TRACE(c.column);
    ASSERT_EQ(Run(std::string("CREATE FINDEX Typed ON TABLE ") + values + " COLUMNS " + c.column +
                  " KEY id"),
              "");
    EXPECT_EQ(Info("Typed", idxTypeName), c.type_name);
    EXPECT_EQ(Info("Typed", idxWordCount), "2");
    // Default options: postings of key and position, one value a row.
    const int32_t type = test::TypeCode(c.first);
    const test::DecodedFindex findex =
        test::DecodeFindex(IndexFolder() + "TYPED.sdx", IndexFolder() + "TYPED.fst", type, 2);
    EXPECT_EQ(findex.faults, std::vector<std::string>{});
    EXPECT_EQ(findex.findex_type, type);
    EXPECT_EQ(findex.words, (std::vector<test::Word>{{c.first, {{1, 0}}}, {c.second, {{2, 0}}}}));
  }
}

TEST_P(FindexEndToEndTest, NullAndNonNumericKeysAreRefused) {
  const std::string nulls =
      Table("nullkeys", "id integer, t varchar(20)", {"1, 'one'", "NULL, 'two'"});
  // The host sees the row loop's own message alone, not the wrappers above it.
  EXPECT_EQ(Run("CREATE FINDEX Nulls ON TABLE " + nulls + " COLUMNS t KEY id"),
            "Unique key column contains NULL values (Module:PiSort,Method:WriteFindexRows)\r\n");
  const std::string words = Table("wordkeys", "id varchar(10), t varchar(20)", {"'a1', 'one'"});
  EXPECT_EQ(Run("CREATE FINDEX Words ON TABLE " + words + " COLUMNS t KEY id"),
            "Unique key is not numeric (Module:PiSort,Method:WriteFindexRows)\r\n");
  EXPECT_TRUE(fs::is_empty(IndexFolder()));
}

TEST_P(FindexEndToEndTest, BackgroundBuildReportsProgressThenItsOutcome) {
  const std::string rows = Table("rows", "id integer, body varchar(100)");
  Insert(rows, WordRows(1, 3000));
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

INSTANTIATE_TEST_SUITE_P(Sources, FindexEndToEndTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         SourceName);

}  // namespace
}  // namespace qm
