// Orders built from real data sources through the command object: SQLite
// always, PostgreSQL through the ANSI and the Unicode driver when the test
// services run. CREATE, UPDATE and DROP ORDER statements, CreateOrder and
// CreateOrderEx, the stored options, every information value, date/time key
// updates and background builds.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "data_source_fixture.h"
#include "order_file_decoder.h"
#include "quillmere/api_enums.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using Entries = std::vector<test::ColumnEntry>;
using Rows = std::vector<std::vector<int32_t>>;

using test::Source;

class OrderEndToEndTest : public test::DataSourceTest {
 protected:
  // The order's information value (the base class reads a findex's).
  std::string Info(const std::string& order, int32_t value) {
    EXPECT_EQ(command_->SetCurrentObjectName(T(order)), S_OK);
    BSTR text = u"untouched";
    EXPECT_EQ(command_->GetOrderInfo(value, &text), S_OK) << LastError();
    return Utf16ToUtf8(text);
  }

  std::string OrderFolder() const { return GroupFolder() + "Orders/"; }

  std::vector<std::string> OrderFiles() const {
    std::vector<std::string> names;
    for (const auto& e : fs::directory_iterator(OrderFolder()))
      names.push_back(e.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }

  // The value type code the header of order records for column (both upper-cased).
  int32_t ColumnType(const std::string& order, const std::string& column) {
    for (const auto& c : test::DecodeOrderHeader(OrderFolder() + order + ".sri").columns) {
      if (ToUpper(c.name) == column) return c.type;
    }
    ADD_FAILURE() << "order " << order << " has no column " << column;
    return 0;
  }

  // The column file, read in the value type the header records.
  Entries Column(const std::string& order, const std::string& column) {
    return test::DecodeColumnFile(OrderFolder() + order + "_" + column + ".col",
                                  ColumnType(order, column));
  }

  // Only the Unicode PostgreSQL driver describes text columns as wide.
  int32_t TextType() const { return GetParam() == Source::PostgresUnicode ? 4 : 2; }

  Rows RowsOf(const std::string& order, int width) {
    return test::DecodeOrderRows(OrderFolder() + order + ".srt", width);
  }

  void WaitForJob() {
    for (int i = 0; i < 60000 && Progress() != 100; ++i) {
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    ASSERT_EQ(Progress(), 100) << "the background job did not end";
  }
};

INSTANTIATE_TEST_SUITE_P(Sources, OrderEndToEndTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         test::SourceName);

TEST_P(OrderEndToEndTest, CreateOrderWithTheCurrentOptionsAndEveryInformationValue) {
  const std::string books = Table("books", "id integer, title varchar(100), year integer",
                                  {"1, '-River', 1999", "2, 'river-', 2004", "3, 'Lake', NULL"});
  ASSERT_EQ(command_->SetOrderGeneralOptions(VARIANT_TRUE, VARIANT_TRUE, T("-")), S_OK);
  ASSERT_EQ(Run("CREATE ORDER Titles ON TABLE " + books + " COLUMNS title, year KEY id"), "");

  EXPECT_EQ(OrderFiles(), (std::vector<std::string>{"TITLES.sri", "TITLES.srt", "TITLES_TITLE.col",
                                                    "TITLES_YEAR.col"}));
  EXPECT_EQ(ColumnType("TITLES", "TITLE"), TextType());
  EXPECT_EQ(ColumnType("TITLES", "YEAR"), 1);
  EXPECT_EQ(Column("TITLES", "TITLE"), (Entries{{"LAKE", {3}}, {"RIVER", {1, 2}}}));
  EXPECT_EQ(Column("TITLES", "YEAR"), (Entries{{"1999", {1}}, {"2004", {2}}}));
  EXPECT_EQ(RowsOf("TITLES", 3), (Rows{{1, 1, 0}, {2, 1, 1}, {3, 0, 2147483647}}));

  EXPECT_EQ(Info("Titles", odrTableName), books);
  EXPECT_EQ(Info("Titles", odrColumnNames), "title,year");
  EXPECT_EQ(Info("Titles", odrKeyName), "id");
  EXPECT_EQ(Info("titles", odrTypeName), "text");
  EXPECT_EQ(Info("Titles", odrType), "2");
  EXPECT_EQ(Info("Titles", odrVersion), "6.14");
  EXPECT_EQ(Info("Titles", odrSQLUsedAsTable), "no");
  EXPECT_EQ(Info("Titles", odrSQLSelect), "");
  // Saved on request, and like every text of the order lower-cased.
  EXPECT_EQ(Info("Titles", odrDBConnectionString), ToLower(std::string_view(connection_)));
  EXPECT_EQ(Info("Titles", odrDBDisplayName), "books source");
  EXPECT_EQ(Info("Titles", odrBuildTime).substr(0, 2), "20");
  EXPECT_EQ(Info("Titles", odrLastUpdateTime), Info("Titles", odrBuildTime));
  EXPECT_EQ(Info("Titles", 999), "");

  // The options it was built with, as stored.
  BSTR text;
  ASSERT_EQ(command_->GetOrderGeneralOption(ogoIgnorreCase, VARIANT_FALSE, &text), S_OK);
  EXPECT_EQ(Utf16ToUtf8(text), "1");
  ASSERT_EQ(command_->GetOrderGeneralOption(ogoIgnoreChars, VARIANT_FALSE, &text), S_OK);
  EXPECT_EQ(Utf16ToUtf8(text), "-");

  // The API's form: the SQL is the table; numbers alone make type 1.
  ASSERT_EQ(command_->SetOrderGeneralOptions(VARIANT_FALSE, VARIANT_FALSE, nullptr), S_OK);
  ASSERT_EQ(
      command_->CreateOrder(T("Years"), T("SELECT id, year FROM " + books), T("year"), T("id")),
      S_OK)
      << LastError();
  EXPECT_EQ(Info("Years", odrTypeName), "integer");
  EXPECT_EQ(Info("Years", odrSQLUsedAsTable), "yes");
  EXPECT_EQ(Info("Years", odrSQLSelect), "select id, year from " + books);
  EXPECT_EQ(Info("Years", odrDBConnectionString), "");
  EXPECT_EQ(RowsOf("YEARS", 2), (Rows{{1, 1999}, {2, 2004}, {3, 2147483647}}));
}

TEST_P(OrderEndToEndTest, UpdatesMergeRefuseOtherDefinitionsAndRebuildsStartOver) {
  const std::string t =
      Table("t", "id integer, title varchar(20), n integer", {"1, 'pear', 5", "2, 'apple', 3"});
  ASSERT_EQ(Run("CREATE ORDER Fruit ON TABLE " + t + " COLUMNS title,n KEY id"), "");
  OnSource({"insert into " + t + " values (3, 'fig', 1)"});
  ASSERT_EQ(Run("UPDATE ORDER Fruit"), "");  // the stored definition
  OnSource({"insert into " + t + " values (4, 'apple', 9)"});
  ASSERT_EQ(Run("UPDATE ORDER Fruit ON TABLE " + t + " COLUMNS title,n KEY id"), "");
  EXPECT_EQ(ColumnType("FRUIT", "TITLE"), TextType());
  EXPECT_EQ(Column("FRUIT", "TITLE"),
            (Entries{{"apple", {2, 4}}, {"fig", {3}}, {"pear", {1}}}));
  EXPECT_EQ(RowsOf("FRUIT", 3), (Rows{{1, 2, 2}, {2, 0, 1}, {3, 1, 0}, {4, 0, 3}}));

  const std::string changed = Run("UPDATE ORDER Fruit ON TABLE " + t + " COLUMNS n KEY id");
  EXPECT_NE(changed.find("Order definition changed, rebuild required"), std::string::npos)
      << changed;
  ASSERT_EQ(Run("UPDATE ORDER Fruit ON TABLE " + t + " COLUMNS n KEY id REBUILD"), "");
  EXPECT_EQ(OrderFiles(), (std::vector<std::string>{"FRUIT.sri", "FRUIT.srt"}));
  EXPECT_EQ(Info("Fruit", odrTypeName), "integer");
  OnSource({"update " + t + " set n = 50 where id = 1"});
  ASSERT_EQ(Run("CREATE ORDER Fruit"), "");  // a rebuild from the stored definition
  EXPECT_EQ(RowsOf("FRUIT", 2), (Rows{{1, 50}, {2, 3}, {3, 1}, {4, 9}}));

  const std::string missing = Run("UPDATE ORDER Nothing");
  EXPECT_FALSE(missing.empty());
  EXPECT_FALSE(fs::exists(OrderFolder() + "NOTHING.sri"));
}

TEST_P(OrderEndToEndTest, DateTimeKeyUpdatesReadOnlyLaterRows) {
  const std::string t =
      Table("dated", "id integer, title varchar(20), changed timestamp",
            {"1, 'old', '2024-01-01 10:00:00'", "2, 'older', '2023-06-01 08:00:00'"});
  ASSERT_EQ(command_->SetOrderUpdateOptions(0, VARIANT_TRUE, VARIANT_FALSE), S_OK);
  ASSERT_EQ(command_->CreateOrderEx(T("Dated"), T("select id, title, changed from " + t),
                                    T("title"), T("id"), VARIANT_TRUE, T("changed")),
            S_OK)
      << LastError();
  // Key 1 changes after the highest change time; key 2 changes, but its
  // time stays before it, so the update does not see it.
  OnSource({"update " + t + " set title = 'renewed', changed = '2024-01-02 00:00:00' where id = 1",
            "update " + t + " set title = 'unseen' where id = 2",
            "insert into " + t + " values (3, 'new', '2024-01-01 10:00:01')"});
  ASSERT_EQ(Run("UPDATE ORDER Dated"), "");
  EXPECT_EQ(ColumnType("DATED", "TITLE"), TextType());
  EXPECT_EQ(Column("DATED", "TITLE"),
            (Entries{{"new", {3}}, {"older", {2}}, {"renewed", {1}}}));
  EXPECT_NE(TraceText().find("changed>'2024-01-01 10:00:00'"), std::string::npos);
}

TEST_P(OrderEndToEndTest, DropOrderRemovesEveryFileAndBackgroundBuildsReport) {
  if (GetParam() != Source::SQLite) GTEST_SKIP() << "drops and jobs do not depend on the driver";
  const std::string t = Table("t", "id integer, a varchar(10), b integer", {"1, 'x', 2"});
  ASSERT_EQ(command_->CreateOrderEx(T("Both"), T("select id, a, b from " + t), T("a,b"), T("id"),
                                    VARIANT_FALSE, nullptr),
            S_OK);
  WaitForJob();
  EXPECT_EQ(ErrorNumber(), 0) << ErrorMsg();
  EXPECT_EQ(OrderFiles().size(), 4u);
  ASSERT_EQ(Run("DROP ORDER both"), "");
  EXPECT_TRUE(OrderFiles().empty());
  EXPECT_FALSE(Run("DROP ORDER Both").empty());

  ASSERT_EQ(Run("CREATE ORDER Single ON TABLE " + t + " COLUMNS b KEY id"), "");
  ASSERT_EQ(command_->DropOrder(T("Single")), S_OK) << LastError();
  EXPECT_TRUE(OrderFiles().empty());

  // No row: error 26 reported by the job.
  const std::string empty = Table("empty", "id integer, a varchar(10)");
  ASSERT_EQ(command_->ExecuteEx(T("CREATE ORDER None ON TABLE " + empty + " COLUMNS a KEY id"),
                                VARIANT_FALSE),
            S_OK);
  WaitForJob();
  EXPECT_EQ(ErrorNumber(), 1);
  EXPECT_NE(ErrorMsg().find("No rows were selected for the order"), std::string::npos);
  EXPECT_TRUE(OrderFiles().empty());
  EXPECT_TRUE(fs::is_empty(GroupFolder() + "WorkData"));
}

}  // namespace
}  // namespace qm
