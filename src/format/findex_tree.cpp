#include "format/findex_tree.h"

#include <algorithm>

#include "base/error_numbers.h"
#include "format/bfile.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr const char* kMethod = "BuildRowFindex";
constexpr const char* kErrorTag = "PILIB_ERROR.PiFindex.BuildRowFindex";
constexpr int32_t kRootBlock = 1;
constexpr int32_t kChildBytes = 4;

}  // namespace

CFindexTreeWriter::CFindexTreeWriter(BFile& file, int32_t max_block_number)
    : file_(file), max_block_number_(std::min(max_block_number, kMaxBlockNumber)) {}

int32_t CFindexTreeWriter::NextBlockNumber() {
  if (next_block_ > max_block_number_) {
    throw CPiFIndexException::Text(
        "Findex too large: its word tree would need more than %i blocks, the most that 16-bit "
        "block numbers address. Split the data into smaller findexes",
        kMethod, nullptr, static_cast<int64_t>(max_block_number_) + 1);
  }
  return next_block_++;
}

void CFindexTreeWriter::WriteAt(CBlock& block, int32_t number) {
  file_.SeekToBlock(number);
  file_.WriteBlock(block);
}

bool CFindexTreeWriter::NodeTakes(const Node& node, const CValue& separator) {
  // The pair, and room kept for the child that ends the last node of a level.
  return node.block.GetUsed() + kChildBytes + CBlock::ValueBytes(separator) + kChildBytes <
         node.block.Size();
}

void CFindexTreeWriter::AddWord(const CValue& value, int32_t position) {
  if (!started_) {
    nodes_[kRoot].number = kRootBlock;
    for (int level = kRoot + 1; level <= kLevel3; ++level) nodes_[level].number = NextBlockNumber();
    started_ = true;
  }
  if (!leaf_empty_ && !leaf_.IsFreeRowLeaf(value)) CloseLeaf();
  // Values come in ascending order, so each row goes behind the last one.
  try {
    leaf_.SetCursor(leaf_.GetUsed());
    leaf_.InsertValue(value);
    leaf_.InsertInt(position);
  } catch (const CException& e) {
    Trace(true, kErrorTag, "Error inserting row leaf");
    throw CPiFIndexException::Text("Error inserting row leaf", "buildrowfindex", &e);
  }
  leaf_last_ = value;
  leaf_empty_ = false;
  ++words_;
}

void CFindexTreeWriter::CloseLeaf() {
  const int32_t number = NextBlockNumber();
  WriteAt(leaf_, number);
  if (previous_leaf_ != 0) {
    file_.SetLinkWord1(previous_leaf_, static_cast<uint16_t>(number));
    file_.SetLinkWord2(number, static_cast<uint16_t>(previous_leaf_));
  }
  previous_leaf_ = number;
  AddChild(kLevel3, number, leaf_last_);
  leaf_.Reset();
  leaf_empty_ = true;
}

void CFindexTreeWriter::AddChild(int level, int32_t child, const CValue& separator) {
  Node& node = nodes_[static_cast<std::size_t>(level)];
  if (!NodeTakes(node, separator)) {
    if (level == kRoot || node.empty) {
      Trace(true, kErrorTag, "Block size too small, aborting");
      throw CPiFIndexException::Numbered(kErrWordTreeFull, kMethod, nullptr);
    }
    WriteAt(node.block, node.number);
    AddChild(level - 1, node.number, node.last);
    node.block.Reset();
    node.empty = true;
    node.number = NextBlockNumber();
  }
  node.block.InsertInt(child);
  node.block.InsertRow(separator);
  node.last = separator;
  node.empty = false;
}

int32_t CFindexTreeWriter::Finish() {
  if (!started_) return 1;
  CloseLeaf();
  const int32_t end_leaf = NextBlockNumber();
  CBlock empty(kBlockUnits);
  WriteAt(empty, end_leaf);
  // From the bottom up, each last node takes the end leaf as its last child;
  // handing it to the level above may start one more node there.
  for (int level = kLevel3; level >= kRoot; --level) {
    Node& node = nodes_[static_cast<std::size_t>(level)];
    node.block.InsertInt(end_leaf);
    WriteAt(node.block, node.number);
    if (level > kRoot) AddChild(level - 1, node.number, node.last);
  }
  return next_block_;
}

}  // namespace qm
