// Item arrays: growth, the key sort and its order among equal keys, merging
// and widening with fillers, gap filling, and the stored form, also damaged.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <numeric>
#include <random>
#include <string>
#include <vector>

#include "support/file_test_util.h"
#include "base/exception_family.h"
#include "base/fast_array_int.h"
#include "format/items.h"
#include "format/mfile.h"

namespace qm {
namespace {

using test::RaisedText;
using Rows = std::vector<std::vector<int32_t>>;
constexpr int32_t F = CItems::kFiller;

Rows AllRows(const CItems& items) {
  Rows rows;
  for (int32_t i = 0; i < items.Count(); ++i) {
    rows.emplace_back(items.RowAddress(i), items.RowAddress(i) + items.Width());
  }
  return rows;
}

CItems Array(const CColumnSet& set, const Rows& rows) {
  CItems items(set);
  for (const auto& r : rows) items.InsertItem(r);
  return items;
}

TEST(ItemArray, GrowthKeepsRowsAndSetItemPastTheEndZeroesTheGap) {
  CItems items(CColumnSet{1, 0, 0, 0});
  for (int32_t i = 0; i < 2001; ++i) items.InsertItem(std::vector<int32_t>{i, -i});
  EXPECT_EQ(items.GetItem(1999, ItemKind::Score), -1999);
  items.AllocateMemoryPreserve(4500);
  EXPECT_EQ(items.GetItem(1234, 1), -1234);
  items.AllocateMemory(7000);
  EXPECT_EQ(items.Count(), 0);

  // Also where rows were dropped before.
  items.InsertItem(std::vector<int32_t>{5, 5});
  items.InsertItem(std::vector<int32_t>{6, 6});
  items.Truncate(1);
  items.SetItem(4999, std::vector<int32_t>{9, 9});
  EXPECT_EQ(items.Count(), 5000);
  EXPECT_EQ(AllRows(items)[1], (std::vector<int32_t>{0, 0}));
  items.SetItemOption(6000, ItemKind::Score, 3);
  EXPECT_EQ(items.GetItem(6000, ItemKind::Score), 3);
  EXPECT_THROW(items.SetItem(-1, std::vector<int32_t>{1, 1}), CFreeItemException);
  EXPECT_THROW(items.SetItemOption(0, ItemKind::Position, 1), CFreeItemException);
}

TEST(ItemArray, AllocationFailuresAreReported) {
  CItems items(CColumnSet{});
  for (int32_t i = 0; i < 2000; ++i) items.InsertItem(std::vector<int32_t>{i});
  FastArrayInt ints(1);
  ints.Insert(1);
  testing::internal::CaptureStdout();
  {
    test::AllocationLimit limit(100);
    const auto number = [](auto body) {
      try {
        body();
      } catch (const CException& e) {
        return e.GetErrorNumber();
      }
      return 0;
    };
    EXPECT_EQ(number([&] { items.InsertItem(std::vector<int32_t>{1}); }), 11);
    EXPECT_EQ(items.GetItem(1999, 0), 1999);  // the rows stay
    EXPECT_EQ(RaisedText<CFreeItemException>([&] { items.SetItemOption(2000, ItemKind::Key, 1); }),
              "Out of memory. Trying to reallocate 16000 bytes (Module:FreeItem,Method:CItems::SetItemOption)");
    EXPECT_EQ(number([&] { ints.Insert(2); }), 11);
    EXPECT_EQ(RaisedText<CFreeItemException>([&] { items.AllocateMemory(5000); }),
              "Out of memory. Trying to allocate 28000 bytes (Module:FreeItem,Method:CItems::AllocateMemory)");
  }
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "Error allocating memory\nError allocating memory\nError allocationg memory\n");
  ints.Insert(2);
  EXPECT_EQ(std::vector<int32_t>(ints.Values().begin(), ints.Values().end()), (std::vector<int32_t>{1, 2}));
}

TEST(ItemArray, SortPutsTheLaterOfEqualKeysFirst) {
  CItems items = Array(CColumnSet{0, 0, 1, 0}, {{5, 1}, {3, 0}, {5, 2}, {1, 0}});
  items.SortByKey();
  EXPECT_EQ(AllRows(items), (Rows{{1, 0}, {3, 0}, {5, 2}, {5, 1}}));

  // Against a reference ordering (key ascending, then original place
  // descending), for sizes around the run lengths and several widths.
  std::mt19937 random(17);
  for (int32_t width : {1, 4}) {
    for (int32_t n : {2, 16, 17, 5003}) {
      CItems a(width);
      Rows rows;
      for (int32_t i = 0; i < n; ++i) {
        std::vector<int32_t> row(static_cast<std::size_t>(width), i);
        row[0] = i % 97 == 0 ? INT32_MIN : static_cast<int32_t>(random() % 50) - 25;
        rows.push_back(row);
        a.InsertItem(row);
      }
      std::vector<std::size_t> order(rows.size());
      std::iota(order.begin(), order.end(), 0);
      std::sort(order.begin(), order.end(), [&](std::size_t x, std::size_t y) {
        return rows[x][0] != rows[y][0] ? rows[x][0] < rows[y][0] : x > y;
      });
      Rows expected;
      for (std::size_t i : order) expected.push_back(rows[i]);
      a.SortByKey();
      ASSERT_EQ(AllRows(a), expected) << "width " << width << ", rows " << n;
    }
  }
}

TEST(ItemArray, MergeWidenAndFillGaps) {
  const CItems scored = Array(CColumnSet{1, 0, 0, 0}, {{1, 10}, {3, 30}});
  const CItems placed = Array(CColumnSet{0, 1, 0, 1}, {{2, 4, 40}, {3, 6, 60}});
  const CItems merged = scored.Merge(placed);
  EXPECT_EQ(AllRows(merged), (Rows{{1, 10, F, F}, {2, F, 4, 40}, {3, 30, F, F}, {3, F, 6, 60}}));

  // The a columns are shared, the b columns of the two sides stand side by side.
  const CItems left = Array(CColumnSet{0, 0, 1, 1}, {{1, 7, 8}});
  const CItems right = Array(CColumnSet{0, 0, 1, 2}, {{0, 5, 6, 9}});
  EXPECT_EQ(AllRows(left.Merge(right)), (Rows{{0, 5, F, 6, 9}, {1, 7, 8, F, F}}));
  EXPECT_EQ(AllRows(left.Widen(CColumnSet{1, 0, 0, 1})), (Rows{{1, F, 7, 8, F}}));


  CItems gaps = Array(CColumnSet{0, 0, 1, 0}, {{1, 0}, {0, 5}, {3, 0}});
  gaps.FillGaps();
  EXPECT_EQ(AllRows(gaps), (Rows{{1, 5}, {3, 0}, {0, 0}}));
}

TEST(StoredItems, CountThenRowsLittleEndianAndDamagedCounts) {
  test::ScratchDir dir("items");
  const std::string empty = dir.Path() + "empty", two = dir.Path() + "two", bad = dir.Path() + "bad";
  MFile file;
  file.OpenFile(empty, MFile::kCreate);
  CItems(CColumnSet{1, 1, 0, 0}).Write(file);
  file.MCommit();
  EXPECT_EQ(test::ReadFile(empty), std::string(4, '\0'));

  const CItems items = Array(CColumnSet{1, 0, 0, 0}, {{1, -2}, {0x01020304, 5}});
  file.OpenFile(two, MFile::kCreate);
  items.Write(file);
  file.MCommit();
  const std::string stored("\x02\0\0\0\x01\0\0\0\xFE\xFF\xFF\xFF\x04\x03\x02\x01\x05\0\0\0", 20);
  EXPECT_EQ(test::ReadFile(two), stored);
  CItems back = Array(CColumnSet{1, 0, 0, 0}, {{9, 9}});
  back.Read(file);  // from the start of the file, replacing
  EXPECT_EQ(AllRows(back), AllRows(items));
  file.Close();
  back.Load(two, false);
  EXPECT_EQ(back.Count(), 4);
  EXPECT_EQ(back.GetItem(3, 0), 0x01020304);
  back.AppendEncodedRows(std::vector<uint8_t>{7, 0, 0, 0, 8, 0, 0, 0});
  EXPECT_EQ(AllRows(back).back(), (std::vector<int32_t>{7, 8}));
  // A read that stops within a row keeps the whole rows only.
  EXPECT_EQ(back.AppendStoredRows(2, [&](uint8_t* target, std::size_t n) {
    EXPECT_EQ(n, 16u);
    std::memcpy(target, stored.data() + 4, 12);
    return std::size_t{12};
  }), 1);
  EXPECT_EQ(AllRows(back).back(), (std::vector<int32_t>{1, -2}));
  EXPECT_EQ(back.Count(), 6);

  // Counts that do not fit the file are refused before anything is allocated
  // (under the lowered limit an allocation would report memory instead).
  test::AllocationLimit limit(1 << 16);
  for (const auto& [count, n] : {std::pair{std::string("\xFF\xFF\xFF\xFF", 4), -1},
                                 std::pair{std::string("\xFF\xFF\xFF\x7F", 4), INT32_MAX}}) {
    test::WriteFile(bad, count + stored.substr(4));
    EXPECT_EQ(RaisedText<CFreeItemException>([&] { back.Load(bad, true); }),
              "Damaged item array " + bad + ": " + std::to_string(n) +
                  " rows of 8 bytes do not fit 20 bytes (Module:FreeItem,Method:CItems::Load)");
    EXPECT_EQ(back.Count(), 6);
  }
}

}  // namespace
}  // namespace qm
