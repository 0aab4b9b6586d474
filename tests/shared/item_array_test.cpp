// Item arrays: growth, the key sort and its order among equal keys, merging
// and widening with fillers, gap filling, and the stored form, also damaged.
#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>
#include <random>
#include <string>
#include <vector>

#include "core_test_support.h"
#include "file_test_util.h"
#include "shared/exception_family.h"
#include "shared/fast_array_int.h"
#include "shared/items.h"
#include "shared/mfile.h"

namespace qm {
namespace {

using test::RaisedText;
constexpr int32_t F = CItems::kFiller;

std::vector<std::vector<int32_t>> AllRows(const CItems& items) {
  std::vector<std::vector<int32_t>> rows;
  for (int32_t i = 0; i < items.Count(); ++i) {
    const int32_t* r = items.RowAddress(i);
    rows.emplace_back(r, r + items.Width());
  }
  return rows;
}

CItems Array(const CColumnSet& set, const std::vector<std::vector<int32_t>>& rows) {
  CItems items(set);
  for (const auto& r : rows) items.InsertItem(r);
  return items;
}

TEST(ItemArray, ColumnSetsAndRows) {
  const CColumnSet sp{1, 1, 0, 0};
  EXPECT_EQ(sp.Width(), 3);
  EXPECT_EQ(sp.Size(), 12);
  EXPECT_TRUE(sp.Equals(CColumnSet{1, 1, 4, 0}));
  EXPECT_FALSE(sp.Equals(CColumnSet{1, 1, 0, 1}));
  CColumnSet merged{0, 1, 2, 1};
  merged.Merge(CColumnSet{1, 0, 5, 2});
  EXPECT_EQ(merged.Width(), 1 + 1 + 1 + 2 + 3);

  CItemsRow row(CColumnSet{0, 1, 1, 1});
  EXPECT_THROW(row.Get(ItemKind::Key), CFreeItemException);  // not allocated
  row.AllocateRow();
  row.Set(ItemKind::Key, 7);
  row.Set(ItemKind::Position, 3);
  row.SetOption(1, 9);
  EXPECT_EQ(std::vector<int32_t>(row.Data().begin(), row.Data().end()),
            (std::vector<int32_t>{7, 3, 0, 9}));
  EXPECT_EQ(row.Get(ItemKind::Option), 0);
  EXPECT_THROW(row.Get(ItemKind::Score), CFreeItemException);
  EXPECT_THROW(row.SetOption(2, 1), CFreeItemException);
  EXPECT_THROW(row.Set(ItemKind::Option, 1), CFreeItemException);

  CItems items(CColumnSet{0, 1, 0, 0});
  items.InsertItem(std::vector<int32_t>{4, 2});
  EXPECT_EQ(items.GetItem(0, ItemKind::Position), 2);
  EXPECT_EQ(RaisedText<CFreeItemException>([&] { items.GetItem(0, ItemKind::Score); }),
            "General Error (Module:FreeItem,Method:CItems::GetItem)");
  EXPECT_THROW(items.GetItem(1, 0), CFreeItemException);
  EXPECT_THROW(items.GetItem(0, 2), CFreeItemException);
  EXPECT_EQ(items.RowAddress(1), nullptr);
  EXPECT_THROW(items.InsertItem(std::vector<int32_t>{1}), CFreeItemException);  // wrong width
}

TEST(ItemArray, GrowthKeepsRowsAndFollowsTheSteps) {
  CItems items(CColumnSet{1, 0, 0, 0});
  EXPECT_EQ(items.Capacity(), 2000);
  for (int32_t i = 0; i < 2001; ++i) items.InsertItem(std::vector<int32_t>{i, -i});
  EXPECT_EQ(items.Capacity(), 4000);
  EXPECT_EQ(items.GetItem(1999, ItemKind::Score), -1999);
  EXPECT_EQ(items.GetItem(2000, 0), 2000);

  items.AllocateMemoryPreserve(4500);  // growth + n, keeping the rows
  EXPECT_EQ(items.Capacity(), 6500);
  EXPECT_EQ(items.Count(), 2001);
  EXPECT_EQ(items.GetItem(1234, 1), -1234);
  items.AllocateMemory(10);  // room enough: nothing changes
  EXPECT_EQ(items.Count(), 2001);
  items.AllocateMemory(7000);
  EXPECT_EQ(items.Capacity(), 9000);
  EXPECT_EQ(items.Count(), 0);
  items.AllocateMemoryForce(1);
  EXPECT_EQ(items.Capacity(), 2001);
  items.ReleaseMemory();
  EXPECT_EQ(items.Capacity(), 2000);

  // SetItem past the end grows to the index and zeroes the gap, also where
  // rows were dropped before.
  items.InsertItem(std::vector<int32_t>{5, 5});
  items.InsertItem(std::vector<int32_t>{6, 6});
  items.Truncate(1);
  items.SetItem(4999, std::vector<int32_t>{9, 9});
  EXPECT_EQ(items.Count(), 5000);
  EXPECT_GE(items.Capacity(), 5000);
  EXPECT_EQ(items.GetItem(1, 0), 0);
  EXPECT_EQ(items.GetItem(4998, 1), 0);
  items.SetItemOption(6000, ItemKind::Score, 3);
  EXPECT_EQ(items.Count(), 6001);
  EXPECT_EQ(items.GetItem(6000, ItemKind::Score), 3);
  EXPECT_THROW(items.SetItem(-1, std::vector<int32_t>{1, 1}), CFreeItemException);
  EXPECT_THROW(items.SetItemOption(-1, ItemKind::Key, 1), CFreeItemException);
  EXPECT_THROW(items.SetItemOption(0, ItemKind::Position, 1), CFreeItemException);
}

TEST(ItemArray, AllocationFailuresAreReported) {
  CItems items(CColumnSet{});
  for (int32_t i = 0; i < 2000; ++i) items.InsertItem(std::vector<int32_t>{i});
  test::AllocationLimit limit(1000);
  testing::internal::CaptureStdout();
  try {
    items.InsertItem(std::vector<int32_t>{1});
    ADD_FAILURE() << "no failure";
  } catch (const CFreeItemException& e) {
    EXPECT_EQ(e.GetErrorNumber(), 11);
  }
  EXPECT_EQ(items.Count(), 2000);  // the rows stay
  EXPECT_EQ(items.GetItem(1999, 0), 1999);
  EXPECT_EQ(RaisedText<CFreeItemException>([&] { items.SetItemOption(2000, ItemKind::Key, 1); }),
            "Out of memory. Trying to reallocate 16000 bytes "
            "(Module:FreeItem,Method:CItems::SetItemOption)");
  EXPECT_EQ(RaisedText<CFreeItemException>([&] { items.AllocateMemory(5000); }),
            "Out of memory. Trying to allocate 28000 bytes (Module:FreeItem,Method:CItems::AllocateMemory)");
  FastArrayInt ints(2);
  ints.Insert(1);
  ints.Insert(2);
  try {
    SetAllocationLimitForTesting(8);
    ints.Insert(3);
    ADD_FAILURE() << "no failure";
  } catch (const CCollectionException& e) {
    EXPECT_EQ(e.GetErrorNumber(), 11);
  }
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Error allocating memory\nError allocating memory\nError allocationg memory\n");
  SetAllocationLimitForTesting(0);
  ints.Insert(3);
  EXPECT_EQ(ints.Capacity(), 52);
  EXPECT_EQ(std::vector<int32_t>(ints.Values().begin(), ints.Values().end()),
            (std::vector<int32_t>{1, 2, 3}));
}

TEST(ItemArray, SortPutsTheLaterOfEqualKeysFirst) {
  CItems items = Array(CColumnSet{0, 0, 1, 0}, {{5, 1}, {3, 0}, {5, 2}, {1, 0}});
  items.SortByKey();
  EXPECT_EQ(AllRows(items), (std::vector<std::vector<int32_t>>{{1, 0}, {3, 0}, {5, 2}, {5, 1}}));

  // Against a reference ordering (key ascending, then original place
  // descending) for sizes around the run lengths and for several widths.
  std::mt19937 random(17);
  for (int32_t width : {1, 2, 3, 4, 7}) {
    for (int32_t n : {0, 1, 2, 15, 16, 17, 33, 1000, 5003}) {
      CItems a(width);
      std::vector<std::vector<int32_t>> rows;
      for (int32_t i = 0; i < n; ++i) {
        std::vector<int32_t> row(static_cast<std::size_t>(width), i);
        row[0] = static_cast<int32_t>(random() % 50) - 25;  // many equal keys, some negative
        if (i % 97 == 0) row[0] = INT32_MIN;
        rows.push_back(row);
        a.InsertItem(row);
      }
      std::vector<std::size_t> order(rows.size());
      std::iota(order.begin(), order.end(), 0);
      std::sort(order.begin(), order.end(), [&](std::size_t x, std::size_t y) {
        return rows[x][0] != rows[y][0] ? rows[x][0] < rows[y][0] : x > y;
      });
      std::vector<std::vector<int32_t>> expected;
      for (std::size_t i : order) expected.push_back(rows[i]);
      a.SortByKey();
      ASSERT_EQ(AllRows(a), expected) << "width " << width << ", rows " << n;
    }
  }
}

TEST(ItemArray, CompareRowAndFirstDifference) {
  CItems items = Array(CColumnSet{1, 1, 0, 0}, {{10, 5, 7}});
  const std::vector<SortColumn> spec = {{1, true}, {2, false}};
  const int32_t lower_score[] = {99, 4, 0};
  const int32_t same[] = {11, 5, 7};
  const int32_t later_position[] = {10, 5, 8};
  EXPECT_EQ(items.CompareRow(0, lower_score, spec, false, false), -1);  // descending score
  EXPECT_EQ(items.CompareRow(0, later_position, spec, false, false), -1);
  EXPECT_EQ(items.CompareRow(0, same, spec, false, false), 0);
  EXPECT_EQ(items.CompareRow(0, same, spec, true, false), -1);
  EXPECT_EQ(items.CompareRow(0, same, spec, true, true), 1);
  EXPECT_EQ(items.FirstDifference(0, lower_score, spec), 0);
  EXPECT_EQ(items.FirstDifference(0, later_position, spec), 1);
  EXPECT_EQ(items.FirstDifference(0, same, spec), -1);
  const std::vector<SortColumn> bad = {{3, false}};
  EXPECT_THROW(items.CompareRow(0, same, bad, false, false), CFreeItemException);
}

TEST(ItemArray, MergeAndWidenFillMissingColumns) {
  const CItems scored = Array(CColumnSet{1, 0, 0, 0}, {{1, 10}, {3, 30}});
  const CItems placed = Array(CColumnSet{0, 1, 0, 1}, {{2, 4, 40}, {3, 6, 60}});
  const CItems merged = scored.Merge(placed);
  EXPECT_TRUE(merged.Columns().Equals(CColumnSet{1, 1, 0, 1}));
  EXPECT_EQ(AllRows(merged), (std::vector<std::vector<int32_t>>{
                                 {1, 10, F, F}, {2, F, 4, 40}, {3, 30, F, F}, {3, F, 6, 60}}));
  EXPECT_EQ(merged.Capacity(), 4);  // steps of one row: a tenth of 2, at least 1

  // The b columns of the two sides stand side by side.
  const CItems left = Array(CColumnSet{0, 0, 1, 1}, {{1, 7, 8}});
  const CItems right = Array(CColumnSet{0, 0, 1, 2}, {{0, 5, 6, 9}});
  EXPECT_EQ(AllRows(left.Merge(right)),
            (std::vector<std::vector<int32_t>>{{0, 5, F, 6, 9}, {1, 7, 8, F, F}}));
  EXPECT_EQ(AllRows(left.Widen(CColumnSet{1, 0, 0, 1})),
            (std::vector<std::vector<int32_t>>{{1, F, 7, 8, F}}));

  CItems big(CColumnSet{}), small(CColumnSet{});
  for (int32_t i = 0; i < 100; ++i) big.InsertItem(std::vector<int32_t>{2 * i});
  for (int32_t i = 0; i < 35; ++i) small.InsertItem(std::vector<int32_t>{2 * i + 1});
  const CItems all = big.Merge(small);
  EXPECT_EQ(all.Count(), 135);
  EXPECT_EQ(all.Growth(), 10);
  EXPECT_EQ(all.Capacity(), 140);
  for (int32_t i = 1; i < all.Count(); ++i) ASSERT_LE(all.Key(i - 1), all.Key(i));
}

TEST(ItemArray, FillGapsPullsValuesForward) {
  CItems items = Array(CColumnSet{0, 0, 1, 0}, {{1, 0}, {0, 5}, {3, 0}});
  items.FillGaps();
  EXPECT_EQ(AllRows(items), (std::vector<std::vector<int32_t>>{{1, 5}, {3, 0}, {0, 0}}));
}

class StoredItems : public ::testing::Test {
 protected:
  std::string Path(const std::string& name) const { return dir_.Path() + name; }
  test::ScratchDir dir_{"items"};
};

TEST_F(StoredItems, CountThenRowsLittleEndian) {
  MFile file;
  file.OpenFile(Path("empty"), MFile::kCreate);
  CItems(CColumnSet{1, 1, 0, 0}).Write(file);
  file.MCommit();
  file.Close();
  EXPECT_EQ(test::ReadFile(Path("empty")), std::string(4, '\0'));

  const CItems items = Array(CColumnSet{1, 0, 0, 0}, {{1, -2}, {0x01020304, 5}});
  file.OpenFile(Path("two"), MFile::kCreate);
  items.Write(file);
  file.MCommit();
  EXPECT_EQ(test::ReadFile(Path("two")),
            std::string("\x02\0\0\0\x01\0\0\0\xFE\xFF\xFF\xFF\x04\x03\x02\x01\x05\0\0\0", 20));

  CItems back(CColumnSet{1, 0, 0, 0});
  back.InsertItem(std::vector<int32_t>{9, 9});
  back.Read(file);  // from the start of the file, replacing
  EXPECT_EQ(AllRows(back), AllRows(items));
  EXPECT_GE(back.Capacity(), 3);
  file.Close();
  back.Load(Path("two"), false);
  EXPECT_EQ(back.Count(), 4);
  EXPECT_EQ(back.GetItem(3, 0), 0x01020304);
  back.Load(Path("two"), true);
  EXPECT_EQ(AllRows(back), AllRows(items));

  const std::vector<uint8_t> encoded = {7, 0, 0, 0, 8, 0, 0, 0};
  back.AppendEncodedRows(encoded);
  EXPECT_EQ(AllRows(back).back(), (std::vector<int32_t>{7, 8}));
  EXPECT_THROW(back.AppendEncodedRows(std::span(encoded).first(6)), CFreeItemException);
}

TEST_F(StoredItems, DamagedCountsAreRefusedBeforeAllocating) {
  // Without the count check each of these would try to allocate far beyond
  // the lowered limit and report running out of memory instead.
  test::AllocationLimit limit(1 << 16);
  const std::string two_rows("\0\0\0\0\1\0\0\0\2\0\0\0\3\0\0\0\4\0\0\0", 20);
  struct Case {
    std::string count;
    int32_t n;
  };
  for (const Case& c : {Case{std::string("\xFF\xFF\xFF\xFF", 4), -1}, Case{std::string("\x03\0\0\0", 4), 3},
                        Case{std::string("\xFF\xFF\xFF\x7F", 4), INT32_MAX}}) {
    test::WriteFile(Path("bad"), c.count + two_rows.substr(4));
    CItems items(CColumnSet{0, 0, 1, 0});
    items.InsertItem(std::vector<int32_t>{1, 1});
    EXPECT_EQ(RaisedText<CFreeItemException>([&] { items.Load(Path("bad"), true); }),
              "Damaged item array " + Path("bad") + ": " + std::to_string(c.n) +
                  " rows of 8 bytes do not fit 20 bytes (Module:FreeItem,Method:CItems::Load)");
    EXPECT_EQ(items.Count(), 1);
  }
  test::WriteFile(Path("short"), "\1\0");
  CItems items(CColumnSet{});
  EXPECT_THROW(items.Load(Path("short"), true), CException);
  test::WriteFile(Path("exact"), std::string("\x02\0\0\0", 4) + two_rows.substr(4));
  CItems exact(CColumnSet{0, 0, 1, 0});
  exact.Load(Path("exact"), true);
  EXPECT_EQ(AllRows(exact), (std::vector<std::vector<int32_t>>{{1, 2}, {3, 4}}));
}

}  // namespace
}  // namespace qm
