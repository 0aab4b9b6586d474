// The order builder on its own: refusals, names that become file names,
// damaged files, locks, and what failures leave behind.
#include <gtest/gtest.h>
#include <unistd.h>

#include <bit>
#include <filesystem>
#include <functional>
#include <map>

#include "index/file_swap.h"
#include "index/order_file_set.h"
#include "index/pi_order.h"
#include "locks/lock_manager.h"
#include "support/order_file_decoder.h"
#include "platform/text_encoding.h"
#include "base/error_messages.h"
#include "base/exception_family.h"
#include "support/test_sources.h"

namespace qm {
namespace {

namespace fs = std::filesystem;

using test::Source;

using Rows = std::vector<std::vector<int32_t>>;
using Entries = std::vector<test::ColumnEntry>;

int32_t Low(double v) { return static_cast<int32_t>(std::bit_cast<uint64_t>(v)); }
int32_t High(double v) { return static_cast<int32_t>(std::bit_cast<uint64_t>(v) >> 32); }

class OrderBuildTest : public test::SourceRowsTest {
 protected:
  OrderBuildTest() : SourceRowsTest("ob_") {}

  void SetUp() override {
    fs::create_directories(Orders());
    SourceRowsTest::SetUp();
  }

  void TearDown() override { file_swap::SetRenameHookForTesting({}); }

  static COrderInfo Order(const std::string& name, const std::string& table,
                          std::vector<std::string> columns) {
    COrderInfo d;
    d.OrderName = name;
    d.TableName = table;
    d.KeyColumn = "id";
    for (auto& c : columns) d.Columns.push_back(OrderColumn{std::move(c), {}});
    return d;
  }

  void Build(COrderInfo& d, bool rebuild = true, bool all = false) {
    CPiOrder order(home_.Defs());
    if (all) {
      order.BuildOrderAll(d, rebuild);
    } else {
      order.BuildOrderInt(d, rebuild);
    }
  }

  // The first message a host sees of the error a build raises.
  std::string Failure(COrderInfo d, bool rebuild = true, bool all = false) {
    try {
      Build(d, rebuild, all);
    } catch (const CException& e) {
      const std::string text = e.GetFullTextUtf8(kLevelWritten);
      return text.substr(0, text.find("\r\n"));
    }
    return "no error";
  }

  std::string Orders() const { return home_.Data() + "Groups/PUBLIC/Orders/"; }
  std::string File(const std::string& name) const { return Orders() + name; }

  std::vector<std::string> OrderFiles() const {
    std::vector<std::string> names;
    for (const auto& e : fs::directory_iterator(Orders())) names.push_back(e.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }

  // Every order file's bytes, by name.
  std::map<std::string, std::string> Snapshot() const {
    std::map<std::string, std::string> files;
    for (const std::string& name : OrderFiles()) files[name] = test::ReadFile(File(name));
    return files;
  }

  Rows RowsOf(const std::string& name) {
    const test::OrderHeader h = test::DecodeOrderHeader(File(name + ".sri"));
    int width = 1;
    for (const auto& c : h.columns) width += c.slots;
    return test::DecodeOrderRows(File(name + ".srt"), width);
  }

  Entries ColumnOf(const std::string& order, const std::string& column) {
    const test::OrderHeader h = test::DecodeOrderHeader(File(order + ".sri"));
    for (const auto& c : h.columns) {
      if (ToUpper(c.name) == column)
        return test::DecodeColumnFile(File(order + "_" + column + ".col"), c.type);
    }
    ADD_FAILURE() << "no column " << column;
    return {};
  }
};

// The rules below do not depend on the driver.
class OrderBuildTestSqlite : public OrderBuildTest {};
INSTANTIATE_TEST_SUITE_P(Sources, OrderBuildTestSqlite, ::testing::Values(Source::SQLite),
                         test::SourceName);

TEST_P(OrderBuildTestSqlite, UpdatesThatChangeTheDefinitionAreRefusedUnlessRebuilt) {
  const std::string t = Table("id INTEGER, label VARCHAR(10), n INTEGER, r DOUBLE PRECISION");
  Run("INSERT INTO " + t + " VALUES (1, 'x', 2, 0.5)");
  COrderInfo d = Order("Shape", t, {"n"});
  Build(d);
  Run("INSERT INTO " + t + " VALUES (2, 'y', 3, 1.5)");
  const auto before = Snapshot();
  const std::string refused =
      "Order definition changed, rebuild required (Module:PiOrderSort,Method:BuildOrderInt)";
  EXPECT_EQ(Failure(Order("Shape", t, {"n", "label"}), false), refused);  // type and columns
  EXPECT_EQ(Failure(Order("Shape", t, {"n"}), false, true),
            "Order definition changed, rebuild required (Module:PiOrderSort,Method:BuildOrderAll)");
  EXPECT_EQ(Snapshot(), before);

  // Rebuilds take any definition; the column files of the old one go.
  COrderInfo text = Order("Shape", t, {"label", "n"});
  Build(text);
  EXPECT_EQ(OrderFiles(),
            (std::vector<std::string>{"SHAPE.sri", "SHAPE.srt", "SHAPE_LABEL.col", "SHAPE_N.col"}));
  COrderInfo numbers = Order("Shape", t, {"r"});
  Build(numbers);
  EXPECT_EQ(OrderFiles(), (std::vector<std::string>{"SHAPE.sri", "SHAPE.srt"}));
  EXPECT_EQ(RowsOf("SHAPE"), (Rows{{1, Low(0.5), High(0.5)}, {2, Low(1.5), High(1.5)}}));
}

TEST_P(OrderBuildTestSqlite, FailedBuildsLeaveTheOrderAsItWasAndNoTemporaryFile) {
  const std::string t = Table("id INTEGER, label VARCHAR(10), n INTEGER");
  Run("INSERT INTO " + t + " VALUES (1, 'x', 2), (2, 'y', 3)");
  COrderInfo d = Order("Kept", t, {"label", "n"});
  Build(d);
  const auto before = Snapshot();

  // The move fails once, on the .srt: the files already moved go back.
  bool failed = false;
  file_swap::SetRenameHookForTesting([&failed](const std::string& target) {
    if (failed || !target.ends_with("KEPT.srt")) return false;
    return failed = true;
  });
  COrderInfo again = Order("Kept", t, {"label", "n"});
  const std::string renaming = Failure(again);
  EXPECT_TRUE(renaming.starts_with("Error renaming ")) << renaming;
  EXPECT_NE(renaming.find("KEPT.srt (Module:PiOrder,Method:RenameOrder2)"), std::string::npos)
      << renaming;
  file_swap::SetRenameHookForTesting({});
  EXPECT_EQ(Snapshot(), before);

  const std::string nulls = Table("id INTEGER, label VARCHAR(10), n INTEGER");
  Run("INSERT INTO " + nulls + " VALUES (1, 'a', 1), (NULL, 'b', 2)");
  EXPECT_EQ(Failure(Order("Other", nulls, {"n"})),
            "Unique key column contains NULL values (Module:PiOrderSort,Method:BuildOrderInt)");
  const std::string text_keys = Table("id VARCHAR(10), n INTEGER");
  Run("INSERT INTO " + text_keys + " VALUES ('abc', 1)");
  EXPECT_EQ(Failure(Order("Other", text_keys, {"n"})),
            "Unique key is not numeric (Module:PiOrderSort,Method:BuildOrderInt)");
  const std::string blobs = Table("id INTEGER, data BLOB");
  Run("INSERT INTO " + blobs + " VALUES (1, X'00')");
  EXPECT_EQ(Failure(Order("Other", blobs, {"data"})),
            "Column data holds binary data, which cannot be ordered "
            "(Module:PiOrderSort,Method:BuildOrderInt)");

  // No row: error 26 for a build; an update of an order is no failure.
  const std::string empty = Table("id INTEGER, label VARCHAR(10)");
  const std::string none = Failure(Order("Other", empty, {"label"}));
  EXPECT_EQ(none.find("No rows were selected for the order"), 0u) << none;
  EXPECT_NE(none.find("(Module:PiOrderSort,Method:BuildOrderAll)"), std::string::npos) << none;
  EXPECT_EQ(Snapshot(), before);
  EXPECT_TRUE(home_.WorkFiles().empty());
}

TEST_P(OrderBuildTestSqlite, NamesThatBecomeFileNamesAreChecked) {
  const std::string t = Table("id INTEGER, b_c VARCHAR(10), c VARCHAR(10), n INTEGER");
  Run("INSERT INTO " + t + " VALUES (1, 'x', 'y', 3)");
  const std::string path = Failure(Order("Escape", t, {"../n"}));
  EXPECT_EQ(path.find("Invalid order column name \"../n\""), 0u) << path;
  EXPECT_EQ(Failure(Order("../up", t, {"n"})).find("Invalid order name"), 0u);

  COrderInfo a = Order("A", t, {"b_c"});
  Build(a);
  // A_B with column c would write A_B_C.col, which is order A's column b_c.
  const std::string taken = Failure(Order("A_B", t, {"c"}));
  EXPECT_EQ(taken.find(
                "The column file A_B_C.col of order A_B, column c, belongs to order A, column b_c"),
            0u)
      << taken;
  COrderInfo values = Order("A_B", t, {"n"});  // no column files: no collision
  Build(values);
  const std::string twice = Failure(Order("Twice", t, {"c", "C"}));
  EXPECT_NE(twice.find("names column C twice"), std::string::npos) << twice;
  EXPECT_EQ(OrderFiles(),
            (std::vector<std::string>{"A.sri", "A.srt", "A_B.sri", "A_B.srt", "A_B_C.col"}));
}

TEST_P(OrderBuildTestSqlite, DamagedOrdersAreRefused) {
  const std::string t = Table("id INTEGER, n INTEGER, label VARCHAR(10)");
  Run("INSERT INTO " + t + " VALUES (1, 2, 'x')");
  COrderInfo d = Order("Hurt", t, {"n"});
  Build(d);
  COrderInfo text = Order("Text", t, {"label"});
  Build(text);
  Run("INSERT INTO " + t + " VALUES (2, 3, 'y')");

  // A row file whose size does not agree with its count.
  std::string rows = test::ReadFile(File("HURT.srt"));
  test::WriteFile(File("HURT.srt"), rows + "xx");
  EXPECT_NE(Failure(Order("Hurt", t, {"n"}), false).find("Order file is damaged"),
            std::string::npos);
  // A column file that ends inside an entry.
  std::string column = test::ReadFile(File("TEXT_LABEL.col"));
  test::WriteFile(File("TEXT_LABEL.col"), column.substr(0, column.size() - 2));
  EXPECT_NE(Failure(Order("Text", t, {"label"}), false).find("Order column file is damaged"),
            std::string::npos);

  std::string header = test::ReadFile(File("HURT.sri"));
  header[6] = 0x58;  // version 600
  header[7] = 0x02;
  test::WriteFile(File("HURT.sri"), header);
  CPiOrder order(home_.Defs());
  try {
    order.OpenOrder("Hurt", CPiOrder::kModeRead);
    ADD_FAILURE() << "a damaged header was read";
  } catch (const CPiOrderException& e) {
    EXPECT_EQ(Utf16ToUtf8(e.GetCurrentEntry().text),
              "Error reading order header (Module:PiOrder,Method:OpenOrder)");
  }
  EXPECT_FALSE(order.IsOpen());
  // A rebuild replaces a damaged order whole.
  COrderInfo rebuilt = Order("Hurt", t, {"n"});
  Build(rebuilt);
  EXPECT_EQ(RowsOf("HURT"), (Rows{{1, 2}, {2, 3}}));
}

TEST_P(OrderBuildTestSqlite, MovesAndDropsWaitForTheReadersOfTheOrder) {
  const std::string t = Table("id INTEGER, label VARCHAR(10)");
  Run("INSERT INTO " + t + " VALUES (1, 'x')");
  COrderInfo d = Order("Locked", t, {"label"});
  Build(d);
  Run("INSERT INTO " + t + " VALUES (2, 'y')");
  const auto before = Snapshot();
  CLockManager::ScaleTimeoutsForTesting(0.001);
  {
    // A search reading the order holds a reader unit of its kind 3 lock.
    CLockManager reader(home_.Data(), "PUBLIC", "locked", kLockOrder);
    reader.LockReader();
    EXPECT_EQ(Failure(Order("Locked", t, {"label"}), false),
              "Could not get exclusive access to order LOCKED to put the new build in place "
              "(Module:PiOrder,Method:RenameOrder2)");
    CPiOrder order(home_.Defs());
    order.OpenOrder("Locked", CPiOrder::kModeRead);
    EXPECT_THROW(order.DropOrder(), CPiOrderException);
    EXPECT_EQ(Snapshot(), before);
  }
  CLockManager::ScaleTimeoutsForTesting(1.0);
  COrderInfo update = Order("Locked", t, {"label"});
  Build(update, false);
  EXPECT_EQ(ColumnOf("LOCKED", "LABEL"), (Entries{{"x", {1}}, {"y", {2}}}));
}

// The two PostgreSQL drivers give the same text columns narrow (ANSI) and
// wide (Unicode): an order built through one and updated through the other.
class OrderBuildTestPostgres : public OrderBuildTest {};
INSTANTIATE_TEST_SUITE_P(Sources, OrderBuildTestPostgres,
                         ::testing::Values(Source::PostgresAnsi, Source::PostgresUnicode),
                         test::SourceName);

TEST_P(OrderBuildTestPostgres, UpdatesKeepTheStoredTextFormWhateverFormTheDriverGives) {
  const Source other =
      GetParam() == Source::PostgresAnsi ? Source::PostgresUnicode : Source::PostgresAnsi;
  if (test::PostgresConnection(other).empty()) GTEST_SKIP() << "needs both PostgreSQL drivers";
  const bool wide = GetParam() == Source::PostgresUnicode;
  const std::string t = Table("id INTEGER, label VARCHAR(20)");
  Run("INSERT INTO " + t + " VALUES (1, 'ｆig'), (2, 'Äpfel'), (3, 'apple')");
  auto order = [&] {
    COrderInfo d = Order("Forms", t, {"label"});
    d.GeneralFlags = 1;  // ignore case
    d.IgnoreChars = u"-";
    return d;
  };
  COrderInfo built = order();
  Build(built);
  ASSERT_EQ(test::DecodeOrderHeader(File("FORMS.sri")).columns.at(0).type, wide ? 4 : 2);

  home_.Defs().SetConnectionString(test::PostgresConnection(other), "test");
  Run("INSERT INTO " + t + " VALUES (4, '-äpfel'), (5, '😀'), (6, 'APPLE-')");
  COrderInfo update = order();
  update.IgnoreChars.clear();  // the stored order's preparation applies
  ASSERT_EQ(Failure(update, false), "no error");

  EXPECT_EQ(test::DecodeOrderHeader(File("FORMS.sri")).columns.at(0).type, wide ? 4 : 2);
  // Values read in the other form are prepared and meet their stored equals;
  // the stored form's comparison places them: U+FF26 (EF BC A6) before
  // U+1F600 (F0 ...) in UTF-8, after it (D83D ...) in UTF-16.
  const Entries narrow_order{{"APPLE", {3, 6}}, {"ÄPFEL", {2, 4}}, {"ＦIG", {1}}, {"😀", {5}}};
  const Entries wide_order{{"APPLE", {3, 6}}, {"ÄPFEL", {2, 4}}, {"😀", {5}}, {"ＦIG", {1}}};
  EXPECT_EQ(ColumnOf("FORMS", "LABEL"), wide ? wide_order : narrow_order);
  const int32_t fig = wide ? 3 : 2;
  const int32_t smiley = wide ? 2 : 3;
  EXPECT_EQ(RowsOf("FORMS"), (Rows{{1, fig}, {2, 1}, {3, 0}, {4, 1}, {5, smiley}, {6, 0}}));
  EXPECT_TRUE(home_.WorkFiles().empty());
}

TEST_P(OrderBuildTestSqlite, AKeyReadTwiceKeepsTheLastRowReadForIt) {
  const std::string t = Table("seq INTEGER, id INTEGER, label VARCHAR(10), n INTEGER");
  Run("INSERT INTO " + t + " VALUES (1, 7, 'b', 1), (2, 3, 'a', 2), (3, 7, 'c', 5)");
  for (bool text : {false, true}) {
    COrderInfo d = Order(text ? "Twice2" : "Twice1", t, {text ? "label" : "n"});
    d.SqlUsedAsTable = 1;
    d.SqlSelect = "select id, label, n from " + t + " order by seq";
    Build(d);
    EXPECT_EQ(d.Count, 2);
    if (text) {
      EXPECT_EQ(ColumnOf("TWICE2", "LABEL"), (Entries{{"a", {3}}, {"c", {7}}}));
      EXPECT_EQ(RowsOf("TWICE2"), (Rows{{3, 0}, {7, 1}}));
    } else {
      EXPECT_EQ(RowsOf("TWICE1"), (Rows{{3, 2}, {7, 5}}));
    }
  }
}

}  // namespace
}  // namespace qm
