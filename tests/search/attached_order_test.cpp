// Result rows ordered and grouped by the columns of real orders, built
// through the command object from SQLite: both order types, doubles and
// date/times as two sort keys, keys the order lacks, the repository name
// choice, the lock an attached order holds, and the refusals.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "api/command_fixture.h"
#include "base/error_messages.h"
#include "base/exception_family.h"
#include "format/bfile.h"
#include "format/items.h"
#include "format/order_info.h"
#include "locks/lock_manager.h"
#include "search/rowset_order.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using Ints = std::vector<int32_t>;

constexpr int32_t kNull = 2147483647;

class AttachedOrderTest : public test::CommandFixture {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    UseShippedMessages();
    UseSqlite();
    Sql({"create table items (id integer, n integer, r double precision, d timestamp)",
         "insert into items values (1, 7, 2.5, '2024-02-29 13:45:59')",
         "insert into items values (2, -4, NULL, '1999-12-31 23:59:58')",
         "insert into items values (3, NULL, -1.25, NULL)",
         "insert into items values (4, 7, -300.5, '2024-02-29 08:00:00')",
         "insert into items values (5, 0, 10000000000.0, '2024-02-29 13:45:59')",
         "insert into items values (6, 12, 0.0, '2001-01-01 00:00:00')",
         "create table books (id integer, title varchar(40), n integer)",
         "insert into books values (1, 'pear', 3)", "insert into books values (2, 'apple', 1)",
         "insert into books values (3, 'fig', 2)", "insert into books values (4, NULL, 5)",
         "insert into books values (5, 'apple', 4)"});
    ASSERT_EQ(Run("CREATE ORDER Items ON TABLE items COLUMNS n, r, d KEY id"), "");
    ASSERT_EQ(Run("CREATE ORDER Titles ON TABLE books COLUMNS title, n KEY id"), "");
    defs_ = Defs();
    context_.key_column = "id";
  }

  void TearDown() override {
    order_.reset();
    CommandFixture::TearDown();
  }

  // Result rows of keys only, in this order; key 9 is in no order.
  static CItems Rows(const Ints& keys = {1, 2, 3, 4, 5, 6, 9}) {
    CItems rows(1);
    rows.InsertItem(Ints{static_cast<int32_t>(keys.size() + 1)});
    for (const int32_t key : keys) rows.InsertItem(Ints{key});
    return rows;
  }

  static Ints Keys(const CItems& rows) {
    Ints keys;
    for (int32_t i = CGiRowsetOrder::kFirstRow; i < rows.Count(); ++i) keys.push_back(rows.Key(i));
    return keys;
  }

  void Order(CItems& rows, const std::string& list) {
    order_->SetOrder(rows, list, true, context_);
    order_->SortItems(rows, context_);
  }

  // Every group of the collected rows: the column's value and count.
  std::vector<std::pair<int32_t, int32_t>> Groups(const CItems& rows, const std::string& column) {
    order_->CollectItems(rows);
    std::vector<std::pair<int32_t, int32_t>> groups;
    for (int guard = 0; !order_->IsEOB() && guard < 20; ++guard) {
      groups.emplace_back(order_->GetValue(rows, column, context_),
                          order_->GetCount(rows, column, context_));
      order_->MoveNext();
    }
    return groups;
  }

  // The number and the whole message chain of a failing SetOrder.
  std::pair<int32_t, std::string> Refusal(const std::string& list) {
    CItems rows = Rows();
    try {
      order_->SetOrder(rows, list, true, context_);
    } catch (const CGiTreeRowsetException& e) {
      return {e.GetErrorNumber(), e.GetFullTextUtf8(1000)};
    }
    ADD_FAILURE() << list << " was accepted";
    return {};
  }

  std::string OrderFolder() const { return GroupFolder() + "Orders/"; }

  CGlobalDefs defs_;
  RowsetOrderContext context_;
  std::unique_ptr<CGiRowsetOrder> order_ = std::make_unique<CGiRowsetOrder>(defs_);
};

TEST_F(AttachedOrderTest, ValuesOfBothOrderTypesSortWithNullsAndMissingKeysLast) {
  struct Case {
    const char* list;
    Ints keys;
  };
  const Case cases[] = {
      // Equal values keep the tie rule: the later row first.
      {"Items.N", {2, 5, 4, 1, 6, 9, 3}},
      {"ITEMS.N DESC", {9, 3, 6, 4, 1, 5, 2}},
      // Doubles across signs and magnitudes.
      {"items.r asc", {4, 3, 6, 1, 5, 9, 2}},
      {"ITEMS.R DESC", {9, 2, 5, 1, 6, 3, 4}},
      // Date/time: the date key, then the time key.
      {"ITEMS.D DESC", {9, 3, 5, 1, 4, 6, 2}},
      {"ITEMS.N ASC, ITEMS.D DESC", {2, 5, 1, 4, 6, 9, 3}},
      // A text order holds ranks: apple, fig, pear, then NULL.
      {"TITLES.TITLE", {5, 2, 3, 1, 9, 6, 4}},
      {"TITLES.N DESC", {9, 6, 4, 5, 1, 3, 2}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.list);
    CItems rows = Rows();
    Order(rows, c.list);
    EXPECT_EQ(Keys(rows), c.keys);
  }
  CItems rows = Rows();
  Order(rows, "ITEMS.N ASC, ITEMS.D DESC, KEY");
  EXPECT_EQ(order_->SqlOrderString(), "ITEMS.N ASC,ITEMS.D DESC,id ASC");
  order_->SetOrder(rows, "REVERSE", true, context_);
  order_->SortItems(rows, context_);
  EXPECT_EQ(Keys(rows), (Ints{9, 3, 6, 4, 1, 5, 2}));
  EXPECT_EQ(order_->SqlOrderString(), "ITEMS.N DESC,ITEMS.D ASC,id DESC");
}

TEST_F(AttachedOrderTest, GroupsReadValuesCountsGroupStringsAndGroupSql) {
  CItems rows = Rows();
  Order(rows, "ITEMS.N");
  EXPECT_EQ(Groups(rows, "items.n"),
            (std::vector<std::pair<int32_t, int32_t>>{{-4, 1}, {0, 1}, {7, 2}, {12, 1}, {kNull, 2}}));
  EXPECT_EQ(order_->GetGroupString(rows, "ITEMS.N", context_, 2, 3), "(0,7,12)");
  // The other columns of the order are attached with it and readable per
  // group: key 2 has no value of R.
  order_->CollectItems(rows);
  EXPECT_EQ(order_->GetValue(rows, "ITEMS.R", context_), kNull);
  const auto rebuild = [](const std::string& keys) { return "select * from items where id in " + keys; };
  EXPECT_EQ(order_->GetGroupSql(rows, "ITEMS.N", context_, 3, 1, rebuild),
            "select * from items where id in (4,1) order by ITEMS.N ASC");
  EXPECT_EQ(order_->GetNumGroups(), 1);

  // Doubles: two sort keys, one value; the group string gives the values.
  Order(rows, "ITEMS.R");
  order_->CollectItems(rows);
  EXPECT_EQ(order_->GetGroupString(rows, "ITEMS.R", context_, 1, 0),
            "(-300.5,-1.25,0,2.5,1e+10,2147483647)");
  EXPECT_EQ(order_->GetValue(rows, "ITEMS.R", context_), -300);

  // Date/time: a group holds the rows of one date and time.
  Order(rows, "ITEMS.D");
  const auto dates = Groups(rows, "ITEMS.D");
  Ints counts;
  for (const auto& group : dates) counts.push_back(group.second);
  EXPECT_EQ(counts, (Ints{1, 1, 1, 2, 2}));
  EXPECT_EQ(dates[3].first, (2024 * 256 + 2) * 256 + 29);

  // A text order: ranks, with the counts of the distinct values; keys 6
  // and 9 are not in it. New rows take the order anew.
  CItems fresh = Rows();
  Order(fresh, "TITLES.TITLE");
  EXPECT_EQ(Groups(fresh, "TITLES.TITLE"),
            (std::vector<std::pair<int32_t, int32_t>>{{0, 2}, {1, 1}, {2, 1}, {kNull, 3}}));
  EXPECT_EQ(order_->GetGroupKeyString(fresh, "TITLES.TITLE", context_, 1, 2), "(5,2,3)");
  order_->CollectItems(fresh);
  // A number column of a text order reads its values, not its ranks.
  EXPECT_EQ(order_->GetValue(fresh, "TITLES.N", context_), 1);  // apple's last row, key 2
  Order(fresh, "TITLES.N DESC");
  order_->CollectItems(fresh);
  EXPECT_EQ(order_->GetGroupString(fresh, "TITLES.N", context_, 1, 0), "(2147483647,5,4,3,2,1)");
}

TEST_F(AttachedOrderTest, OrderColumnsThatCannotBeAttachedRaiseError61WithTheCause) {
  fs::resize_file(OrderFolder() + "TITLES.srt", 10);
  test::WriteFile(OrderFolder() + "NOHEAD.sri", "not a header");
  test::WriteFile(OrderFolder() + "NOHEAD.srt", std::string(4, '\0'));
  // A header whose second column claims slots past the first's.
  ASSERT_EQ(Run("CREATE ORDER Bent ON TABLE items COLUMNS n, r KEY id"), "");
  {
    COrderInfo info;
    BFile sri;
    sri.OpenFile(OrderFolder() + "BENT.sri", BFile::kReadOnly, 64);
    info.ReadInfo(sri);
    sri.Close();
    info.Columns[1].BuilderValues[1] = 7;
    sri.OpenFile(OrderFolder() + "BENT.sri", BFile::kCreate, 64);
    info.WriteInfo(sri);
  }
  struct Case {
    const char* list;
    const char* cause;
  };
  const Case cases[] = {
      {"ITEMS.PRICE", "Column PRICE is not prepared for order"},
      {"NOSUCH.N", "NOSUCH.sri"},
      {"../ITEMS.N DESC", "Invalid order name"},
      {"TITLES.TITLE", "Order file is damaged"},
      {"NOHEAD.N", "Error reading order header"},
      {"BENT.N", "Order BENT is damaged: its header does not describe its rows"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.list);
    const auto [number, text] = Refusal(c.list);
    EXPECT_EQ(number, 61);
    EXPECT_NE(text.find(c.cause), std::string::npos) << text;
  }
}

TEST_F(AttachedOrderTest, RepositoryOrdersAreChosenByTheirMarkerFile) {
  Sql({"create table shelf (id integer, n integer)", "insert into shelf values (1, -7)",
       "insert into shelf values (2, 4)"});
  ASSERT_EQ(Run("CREATE ORDER Shelf ON TABLE items COLUMNS n KEY id"), "");
  ASSERT_EQ(Run("CREATE ORDER _R_Shelf ON TABLE shelf COLUMNS n KEY id"), "");
  struct Case {
    std::vector<const char*> markers;
    Ints keys;
  };
  const Case cases[] = {
      {{}, {1, 2}},                            // Shelf: 7, -4
      {{"_R_SHELF.odr"}, {2, 1}},              // _R_Shelf: -7, 4
      {{"SHELF.odr", "_R_SHELF.odr"}, {1, 2}},  // its own marker wins
  };
  for (const Case& c : cases) {
    for (const char* marker : {"SHELF.odr", "_R_SHELF.odr"}) fs::remove(OrderFolder() + marker);
    for (const char* marker : c.markers) test::WriteFile(OrderFolder() + marker, "");
    order_ = std::make_unique<CGiRowsetOrder>(defs_);
    CItems rows = Rows({2, 1});
    Order(rows, "SHELF.N DESC");
    EXPECT_EQ(Keys(rows), c.keys) << c.markers.size();
  }
}

TEST_F(AttachedOrderTest, AnAttachedOrderKeepsItsFilesFromBeingSwappedUntilReset) {
  CItems rows = Rows();
  Order(rows, "ITEMS.N");
  CLockManager::ScaleTimeoutsForTesting(0.01);
  const std::string refused = Run("CREATE ORDER Items ON TABLE items COLUMNS n KEY id");
  CLockManager writer(home_.Data(), "PUBLIC", "ITEMS", kLockOrder);
  EXPECT_THROW(writer.LockExclusive(), CLockManagerException);
  order_->Reset("id");
  EXPECT_NO_THROW(writer.LockExclusive());
  writer.UnlockAll();
  CLockManager::ScaleTimeoutsForTesting(1.0);
  EXPECT_NE(refused, "") << "the order was rebuilt under an attached reader";
  EXPECT_EQ(Run("CREATE ORDER Items ON TABLE items COLUMNS n KEY id"), "");
}

}  // namespace
}  // namespace qm
