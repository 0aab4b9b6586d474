// Orders built from real data sources through the command object: SQLite
// always, PostgreSQL through the ANSI and the Unicode driver when the test
// services run. Type 1 and type 2 orders read back with the decoder of
// order_file_decoder.h, information values, updates by key and by
// date/time key, drops and background builds.
#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <filesystem>
#include <string>
#include <vector>

#include "support/data_source_fixture.h"
#include "support/order_file_decoder.h"
#include "quillmere/api_enums.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using Entries = std::vector<test::ColumnEntry>;
using Rows = std::vector<std::vector<int32_t>>;
using test::Source;

constexpr int32_t kNull = 2147483647;

int32_t Low(double v) { return static_cast<int32_t>(std::bit_cast<uint64_t>(v)); }
int32_t High(double v) { return static_cast<int32_t>(std::bit_cast<uint64_t>(v) >> 32); }

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
    for (const auto& e : fs::directory_iterator(OrderFolder())) names.push_back(e.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }

  test::OrderHeader Header(const std::string& order) const {
    return test::DecodeOrderHeader(OrderFolder() + order + ".sri");
  }

  // The value type code the header records for column (upper-cased).
  int32_t ColumnType(const std::string& order, const std::string& column) const {
    for (const auto& c : Header(order).columns) {
      if (ToUpper(c.name) == column) return c.type;
    }
    ADD_FAILURE() << "order " << order << " has no column " << column;
    return 0;
  }

  // The column file, read in the value type its header records.
  Entries Column(const std::string& order, const std::string& column) const {
    return test::DecodeColumnFile(OrderFolder() + order + "_" + column + ".col",
                                  ColumnType(order, column));
  }

  // The rows of the .srt, as wide as the header's columns say.
  Rows RowsOf(const std::string& order) const {
    int width = 1;
    for (const auto& c : Header(order).columns) width += c.slots;
    return test::DecodeOrderRows(OrderFolder() + order + ".srt", width);
  }

  // Only the Unicode PostgreSQL driver describes text columns as wide.
  int32_t TextType() const { return GetParam() == Source::PostgresUnicode ? 4 : 2; }
};

INSTANTIATE_TEST_SUITE_P(Sources, OrderEndToEndTest,
                         ::testing::Values(Source::SQLite, Source::PostgresAnsi,
                                           Source::PostgresUnicode),
                         test::SourceName);

// Drops and background jobs do not depend on the driver.
class OrderEndToEndTestSqlite : public OrderEndToEndTest {};
INSTANTIATE_TEST_SUITE_P(Sources, OrderEndToEndTestSqlite, ::testing::Values(Source::SQLite),
                         test::SourceName);

TEST_P(OrderEndToEndTest, NumbersAndDatesMakeType1OrdersWithNullsAsTheHighestValue) {
  const std::string t =
      Table("prices", "id integer, n integer, r double precision, d timestamp",
            {"3, 7, 2.5, '2024-02-29 13:45:59'", "1, NULL, -1.25, NULL",
             "2, -4, NULL, '1999-12-31 23:59:58'"});
  ASSERT_EQ(Run("CREATE ORDER Prices ON TABLE " + t + " COLUMNS n, r, d KEY id"), "");
  EXPECT_EQ(OrderFiles(), (std::vector<std::string>{"PRICES.sri", "PRICES.srt"}));
  const test::OrderHeader h = Header("PRICES");
  EXPECT_EQ(h.type, 1);
  EXPECT_EQ(h.name, "Prices");
  EXPECT_EQ(h.count, 3);
  EXPECT_EQ(h.sort_max, 3);
  Rows layout;  // type, first slot, slots of each column
  for (const auto& c : h.columns) layout.push_back({c.type, c.first, c.slots});
  EXPECT_EQ(layout, (Rows{{1, 1, 1}, {6, 2, 2}, {3, 4, 2}}));
  // A double takes its low then high half, a date/time its date then time key.
  const auto date = [](int y, int m, int d) { return (y * 256 + m) * 256 + d; };
  EXPECT_EQ(RowsOf("PRICES"),
            (Rows{{1, kNull, Low(-1.25), High(-1.25), kNull, 0},
                  {2, -4, kNull, 0, date(1999, 12, 31), date(23, 59, 58)},
                  {3, 7, Low(2.5), High(2.5), date(2024, 2, 29), date(13, 45, 59)}}));
  EXPECT_EQ(Info("Prices", odrTypeName), "integer");
  EXPECT_TRUE(fs::is_empty(GroupFolder() + "WorkData"));
}

TEST_P(OrderEndToEndTest, TextMakesType2OrdersOfRanks) {
  const std::string books =
      Table("books", "id integer, title varchar(100), n integer",
            {"1, '-River', 10", "2, 'river-', 9", "3, 'Lake', NULL", "4, NULL, -3", "5, 'la-ke', 10"});
  ASSERT_EQ(command_->SetOrderGeneralOptions(VARIANT_TRUE, VARIANT_TRUE, T("-")), S_OK);
  ASSERT_EQ(Run("CREATE ORDER Titles ON TABLE " + books + " COLUMNS title, n KEY id"), "");

  EXPECT_EQ(OrderFiles(), (std::vector<std::string>{"TITLES.sri", "TITLES.srt", "TITLES_N.col",
                                                    "TITLES_TITLE.col"}));
  EXPECT_EQ(ColumnType("TITLES", "TITLE"), TextType());
  // Case folded, ignore characters trimmed from the ends only; numbers keep
  // their type and sort as numbers; a NULL has no entry and the highest rank.
  EXPECT_EQ(Column("TITLES", "TITLE"), (Entries{{"LA-KE", {5}}, {"LAKE", {3}}, {"RIVER", {1, 2}}}));
  EXPECT_EQ(ColumnType("TITLES", "N"), 1);
  EXPECT_EQ(Column("TITLES", "N"), (Entries{{"-3", {4}}, {"9", {2}}, {"10", {1, 5}}}));
  EXPECT_EQ(RowsOf("TITLES"),
            (Rows{{1, 2, 2}, {2, 2, 1}, {3, 1, kNull}, {4, kNull, 0}, {5, 0, 2}}));

  EXPECT_EQ(Info("Titles", odrColumnNames), "title,n");
  EXPECT_EQ(Info("titles", odrTypeName), "text");
  // Saved on request, and like every text of the order lower-cased.
  EXPECT_EQ(Info("Titles", odrDBConnectionString), ToLower(std::string_view(connection_)));
}

TEST_P(OrderEndToEndTest, UpdatesByKeyMergeAndRebuildsStartOver) {
  const std::string t =
      Table("t", "id integer, title varchar(20), n integer", {"1, 'pear', 5", "2, 'apple', 3"});
  ASSERT_EQ(Run("CREATE ORDER Fruit ON TABLE " + t + " COLUMNS title,n KEY id"), "");
  // Key 1 is not read again: only keys past the highest one are.
  OnSource({"insert into " + t + " values (3, 'fig', 1)",
            "update " + t + " set title = 'plum' where id = 1"});
  ASSERT_EQ(Run("UPDATE ORDER Fruit"), "");  // the stored definition
  OnSource({"insert into " + t + " values (4, 'apple', 9)"});
  ASSERT_EQ(Run("UPDATE ORDER Fruit ON TABLE " + t + " COLUMNS title,n KEY id"), "");
  EXPECT_EQ(ColumnType("FRUIT", "TITLE"), TextType());
  EXPECT_EQ(Column("FRUIT", "TITLE"), (Entries{{"apple", {2, 4}}, {"fig", {3}}, {"pear", {1}}}));
  EXPECT_EQ(RowsOf("FRUIT"), (Rows{{1, 2, 2}, {2, 0, 1}, {3, 1, 0}, {4, 0, 3}}));

  ASSERT_EQ(Run("UPDATE ORDER Fruit ON TABLE " + t + " COLUMNS n KEY id REBUILD"), "");
  EXPECT_EQ(Info("Fruit", odrTypeName), "integer");
  OnSource({"update " + t + " set n = 50 where id = 1"});
  ASSERT_EQ(Run("CREATE ORDER Fruit"), "");  // a rebuild from the stored definition
  EXPECT_EQ(RowsOf("FRUIT"), (Rows{{1, 50}, {2, 3}, {3, 1}, {4, 9}}));
}

TEST_P(OrderEndToEndTest, DateTimeKeyUpdatesReadOnlyLaterRowsAndReplaceTheRowsOfKeysReadAgain) {
  const std::string t = Table("dated", "id integer, title varchar(20), n integer, changed timestamp",
                              {"1, 'pear', 5, '2024-01-01 10:00:00'",
                               "2, 'apple', 3, '2023-06-01 08:00:00'",
                               "3, 'fig', 8, '2024-01-01 10:00:00'"});
  ASSERT_EQ(command_->SetOrderUpdateOptions(0, VARIANT_TRUE, VARIANT_FALSE), S_OK);
  for (const char* column : {"title", "n"}) {
    ASSERT_EQ(command_->CreateOrderEx(T(column), T("select id, title, n, changed from " + t),
                                      T(column), T("id"), VARIANT_TRUE, T("changed")),
              S_OK)
        << LastError();
  }
  // Key 1 changes after the highest change time and key 4 is new; key 3
  // changes, but its time stays, so the update does not see it.
  OnSource({"update " + t + " set title = 'zucchini', n = 50, changed = '2024-01-02 09:00:00' "
                           "where id = 1",
            "update " + t + " set title = 'kiwi', n = 0 where id = 3",
            "insert into " + t + " values (4, 'apple', 1, '2024-01-01 10:00:01')"});
  ASSERT_EQ(Run("UPDATE ORDER Title"), "");
  ASSERT_EQ(Run("UPDATE ORDER N"), "");
  EXPECT_NE(TraceText().find("changed>'2024-01-01 10:00:00'"), std::string::npos);
  // pear had key 1 only: it goes, and every rank after it moves.
  EXPECT_EQ(ColumnType("TITLE", "TITLE"), TextType());
  EXPECT_EQ(Column("TITLE", "TITLE"), (Entries{{"apple", {2, 4}}, {"fig", {3}}, {"zucchini", {1}}}));
  EXPECT_EQ(RowsOf("TITLE"), (Rows{{1, 2}, {2, 0}, {3, 1}, {4, 0}}));
  EXPECT_EQ(RowsOf("N"), (Rows{{1, 50}, {2, 3}, {3, 8}, {4, 1}}));
  EXPECT_EQ(Header("N").sort_max, 4);

  // Nothing later: the update succeeds and changes no byte.
  const std::string sri = test::ReadFile(OrderFolder() + "N.sri");
  const std::string srt = test::ReadFile(OrderFolder() + "N.srt");
  ASSERT_EQ(Run("UPDATE ORDER N"), "");
  EXPECT_EQ(test::ReadFile(OrderFolder() + "N.sri"), sri);
  EXPECT_EQ(test::ReadFile(OrderFolder() + "N.srt"), srt);
  EXPECT_TRUE(fs::is_empty(GroupFolder() + "WorkData"));
}

TEST_P(OrderEndToEndTestSqlite, DropOrderRemovesEveryFileAndBackgroundBuildsReport) {
  const std::string t = Table("t", "id integer, a varchar(10), b integer", {"1, 'x', 2"});
  ASSERT_EQ(command_->CreateOrderEx(T("Both"), T("select id, a, b from " + t), T("a,b"), T("id"),
                                    VARIANT_FALSE, nullptr),
            S_OK);
  test::WaitForJob(*command_);
  EXPECT_EQ(ErrorNumber(), 0) << ErrorMsg();
  ASSERT_EQ(Run("CREATE ORDER Single ON TABLE " + t + " COLUMNS b KEY id"), "");
  EXPECT_EQ(OrderFiles().size(), 6u);
  ASSERT_EQ(Run("DROP ORDER both"), "");
  EXPECT_EQ(OrderFiles(), (std::vector<std::string>{"SINGLE.sri", "SINGLE.srt"}));
  ASSERT_EQ(command_->DropOrder(T("Single")), S_OK) << LastError();
  EXPECT_TRUE(OrderFiles().empty());
}

}  // namespace
}  // namespace qm
