// CFindexTreeWriter: the word tree (.sdx) of a findex being built, written in
// one pass over the distinct values in ascending order.
//
// The tree has four levels of 4,096-byte blocks: the root (block 1), two
// levels of inner nodes, and the leaves; block 0 is left to the header. A
// leaf holds rows (value, position of the value's posting list); an inner
// node a child block number, then pairs (separator, child), the separator
// being the highest value under the child before it. The last node of each
// level ends with one more child, after the last value as separator: an
// empty leaf, so a search past the last value ends in it.
//
// Block numbers are handed out in increasing order from 2 and every block is
// written at its own number: a node's number is reserved when the node
// starts and the node is written there once it is full or at the end; a leaf
// takes the next number when it is full. Leaves are chained through their
// 16-bit link words (next at byte 2, previous at byte 4), so no block number
// may pass max_block_number (65,535 at most): such a tree raises instead.
#pragma once

#include <array>
#include <cstdint>

#include "format/block.h"
#include "base/value.h"

namespace qm {

class BFile;

class CFindexTreeWriter {
 public:
  static constexpr int32_t kBlockUnits = 64;
  static constexpr int32_t kMaxBlockNumber = 65535;

  // file: open for writing with blocks of kBlockUnits.
  CFindexTreeWriter(BFile& file, int32_t max_block_number);
  CFindexTreeWriter(const CFindexTreeWriter&) = delete;
  CFindexTreeWriter& operator=(const CFindexTreeWriter&) = delete;

  // The next value, greater than every value before it, and the position of
  // its posting list. A value that no block can hold raises "Error inserting
  // row leaf"; a tree whose root is full raises error 29.
  void AddWord(const CValue& value, int32_t position);
  // Writes the open leaf and nodes and the empty end leaf; returns the
  // number of blocks of the file (1, the header alone, without words).
  int32_t Finish();

  int32_t DistinctWords() const { return words_; }

 private:
  struct Node {
    CBlock block{kBlockUnits};
    int32_t number = 0;
    CValue last;  // separator of its last child
    bool empty = true;
  };
  static constexpr int kRoot = 0;
  static constexpr int kLevel3 = 2;

  int32_t NextBlockNumber();
  void WriteAt(CBlock& block, int32_t number);
  void CloseLeaf();
  // Adds (child, separator) to the node of a level, first closing the node
  // when it is full.
  void AddChild(int level, int32_t child, const CValue& separator);
  static bool NodeTakes(const Node& node, const CValue& separator);

  BFile& file_;
  int32_t max_block_number_;
  int32_t next_block_ = 2;
  bool started_ = false;
  std::array<Node, 3> nodes_;
  CBlock leaf_{kBlockUnits};
  CValue leaf_last_;
  bool leaf_empty_ = true;
  int32_t previous_leaf_ = 0;
  int32_t words_ = 0;
};

}  // namespace qm
