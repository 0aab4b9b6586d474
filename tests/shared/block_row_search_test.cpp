// Leaf rows: the sorted insert, and the start and stop searches with every
// answer they can give, on leaves built by hand.
#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "shared/block.h"
#include "shared/exception_family.h"
#include "test_values.h"

namespace qm {
namespace {

CValue Text(std::string_view s) { return test::Value(s); }
CValue Int(int32_t i) { return test::Value(i); }

// A leaf whose rows are appended as given (no sorting).
CBlock Leaf(const std::vector<std::pair<std::string, int32_t>>& rows) {
  CBlock block(64);
  for (const auto& [value, id] : rows) {
    block.InsertValue(Text(value));
    block.InsertInt(id);
  }
  return block;
}

std::vector<std::pair<std::string, int32_t>> Rows(CBlock& block) {
  std::vector<std::pair<std::string, int32_t>> rows;
  block.SetCursor(6);
  while (!block.AtEnd()) {
    CValue v(VALUE_TYPE::AsciiString);
    block.ReadValue(v);
    rows.emplace_back(std::string(v.Narrow()), block.ReadInt());
  }
  return rows;
}

TEST(LeafInsert, KeepsValueOrderWithNewRowsBeforeEqualOnes) {
  CBlock block(64);
  block.InsertRowLeaf(Text("b"), 1);
  block.InsertRowLeaf(Text("a"), 2);
  block.InsertRowLeaf(Text("c"), 3);
  block.InsertRowLeaf(Text("b"), 4);
  block.InsertRowLeaf(Text("bb"), 5);
  EXPECT_EQ(block.GetCursor(), 6);
  const std::vector<std::pair<std::string, int32_t>> expected = {
      {"a", 2}, {"b", 4}, {"b", 1}, {"bb", 5}, {"c", 3}};
  EXPECT_EQ(Rows(block), expected);
  // Byte for byte what appending the rows in that order gives.
  CBlock appended = Leaf(expected);
  EXPECT_TRUE(std::equal(block.Data(), block.Data() + block.Size(), appended.Data()));
  EXPECT_EQ(block.GetUsed(), appended.GetUsed());
}

TEST(LeafInsert, ARowThatDoesNotFitChangesNothing) {
  CBlock block(64);
  const std::string wide_value(4000, 'm');
  block.InsertRowLeaf(Text(wide_value), 1);
  block.SetCursor(40);
  const std::vector<uint8_t> before(block.Data(), block.Data() + block.Size() + 6);
  const int32_t used = block.GetUsed();
  // In front of the row (moving it), and behind it.
  for (const std::string& v : {std::string(80, 'a'), std::string(80, 'z')}) {
    EXPECT_FALSE(block.IsFreeRowLeaf(Text(v)));
    EXPECT_THROW(block.InsertRowLeaf(Text(v), 2), CBlockException);
    EXPECT_EQ(std::vector<uint8_t>(block.Data(), block.Data() + block.Size() + 6), before);
    EXPECT_EQ(block.GetUsed(), used);
    EXPECT_EQ(block.GetCursor(), 40);
  }
  // What IsFreeRowLeaf admits always goes in.
  std::string fits(4096 - 6 - used - 2 - 1, 'a');
  ASSERT_TRUE(block.IsFreeRowLeaf(Text(fits)));
  block.InsertRowLeaf(Text(fits), 3);
  EXPECT_EQ(Rows(block).front(), std::make_pair(fits, 3));
}

TEST(StopSearch, FindsWhereAKeysItemsEnd) {
  CBlock leaf = Leaf({{"d", 10}, {"m", 20}});
  EXPECT_EQ(leaf.GetRowStopId(Text("k")), 20);
  EXPECT_EQ(leaf.GetRowStopId(Text("a")), 10);
  EXPECT_EQ(leaf.GetRowStopId(Text("d")), 20);  // the first row above d
  EXPECT_EQ(leaf.GetRowStopId(Text("m")), 20);  // the last row, equal
  EXPECT_EQ(leaf.GetRowStopId(Text("z")), CBlock::kReachedEnd);

  EXPECT_EQ(leaf.GetRowStopIdAtOrAfter(Text("d")), 10);
  EXPECT_EQ(leaf.GetRowStopIdAtOrAfter(Text("k")), 20);
  EXPECT_EQ(leaf.GetRowStopIdAtOrAfter(Text("z")), CBlock::kReachedEnd);

  CBlock descending = Leaf({{"m", 20}, {"d", 10}});
  EXPECT_EQ(descending.GetRowStopIdDescending(Text("k")), 10);
  EXPECT_EQ(descending.GetRowStopIdDescending(Text("z")), 20);
  EXPECT_EQ(descending.GetRowStopIdDescending(Text("m")), 20);
  EXPECT_EQ(descending.GetRowStopIdDescending(Text("a")), CBlock::kReachedEnd);

  CBlock empty(64);
  EXPECT_EQ(empty.GetRowStopId(Text("k")), CBlock::kNoRows);
  EXPECT_EQ(empty.GetRowStopIdAtOrAfter(Text("k")), CBlock::kNoRows);
  EXPECT_EQ(empty.GetRowStopIdDescending(Text("k")), CBlock::kNoRows);
}

TEST(StartSearch, EveryAnswer) {
  CBlock leaf = Leaf({{"apple", 10}, {"banana", 20}, {"cherry", 30}});
  const CValue none = Text("");
  const CValue top = Text("zzz");
  constexpr int32_t kNeither = 2;  // a match mode that matches nothing

  // Exact (mode 1) and matching (mode 0: contains the key, not above upper).
  EXPECT_EQ(leaf.GetRowStartId(Text("banana"), none, 1, 0), 20);
  EXPECT_EQ(leaf.GetRowStartId(Text("ban"), top, 0, 0), 20);
  EXPECT_EQ(leaf.GetRowStartId(Text("ban"), Text("bam"), 0, 0), CBlock::kNotFound);
  EXPECT_EQ(leaf.GetRowStartId(Text("b"), none, 1, 0), CBlock::kNotFound);
  EXPECT_EQ(leaf.GetRowStartId(Text("cherry"), none, kNeither, 0), CBlock::kReachedEnd);
  EXPECT_EQ(leaf.GetRowStartId(Text("zebra"), none, 1, 0), CBlock::kReachedEnd);

  // Greater (64), with and without equal (1).
  EXPECT_EQ(leaf.GetRowStartId(Text("b"), none, kNeither, 64), 20);
  EXPECT_EQ(leaf.GetRowStartId(Text("banana"), none, kNeither, 64), CBlock::kInNextBlock);
  EXPECT_EQ(leaf.GetRowStartId(Text("banana"), none, kNeither, 65), 20);
  EXPECT_EQ(leaf.GetRowStartId(Text("zebra"), none, kNeither, 65), CBlock::kInNextBlock);

  // Less (128): the last row below the key, or the key itself with equal.
  EXPECT_EQ(leaf.GetRowStartId(Text("b"), none, kNeither, 128), 10);
  EXPECT_EQ(leaf.GetRowStartId(Text("cherry"), none, kNeither, 128), 20);
  EXPECT_EQ(leaf.GetRowStartId(Text("cherry"), none, kNeither, 129), 30);
  EXPECT_EQ(leaf.GetRowStartId(Text("zebra"), none, kNeither, 128), 30);
  EXPECT_EQ(leaf.GetRowStartId(Text("apple"), none, kNeither, 128), CBlock::kInPreviousBlock);
  EXPECT_EQ(leaf.GetRowStartId(Text("a"), none, kNeither, 129), CBlock::kInPreviousBlock);

  CBlock empty(64);
  EXPECT_EQ(empty.GetRowStartId(Text("a"), none, 1, 0), CBlock::kNoRows);
}

TEST(StartSearch, NumbersMatchWhenNotSmaller) {
  CBlock leaf(64);
  for (int32_t v : {5, 9, 30}) leaf.InsertRowLeaf(Int(v), v * 100);
  EXPECT_EQ(leaf.GetRowStartId(Int(7), Int(10), 0, 0), 900);
  EXPECT_EQ(leaf.GetRowStartId(Int(10), Int(20), 0, 0), CBlock::kReachedEnd);  // 30 is above 20
  EXPECT_EQ(leaf.GetRowStartId(Int(6), Int(8), 0, 0), CBlock::kNotFound);    // 9 is above 8
  EXPECT_EQ(leaf.GetRowStartId(Int(9), Int(0), 1, 0), 900);
  EXPECT_EQ(leaf.GetRowStopId(Int(9)), 3000);
}

TEST(NodeSearch, DescendsIntoTheChildBeforeTheFirstSeparatorNotBelowTheKey) {
  CBlock node(64);
  node.InsertInt(5);
  node.InsertRow(Text("d"));
  node.InsertInt(6);
  node.InsertRow(Text("m"));
  node.InsertInt(7);
  EXPECT_EQ(node.GetNodeChildId(Text("a")), 5);
  EXPECT_EQ(node.GetNodeChildId(Text("d")), 5);
  EXPECT_EQ(node.GetNodeChildId(Text("e")), 6);
  EXPECT_EQ(node.GetNodeChildId(Text("m")), 6);
  EXPECT_EQ(node.GetNodeChildId(Text("z")), 7);
  EXPECT_EQ(CBlock(64).GetNodeChildId(Text("a")), -1);
}

}  // namespace
}  // namespace qm
