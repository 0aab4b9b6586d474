#include "search/findex_check.h"

#include <algorithm>
#include <cstdint>
#include <optional>

#include "base/exception.h"
#include "base/value.h"
#include "config/global_defs.h"
#include "format/column_set.h"
#include "format/index_header.h"
#include "format/items.h"
#include "index/damage_text.h"
#include "index/deleted_keys.h"
#include "index/findex_file_set.h"
#include "locks/lock_manager.h"
#include "platform/file_io.h"
#include "search/gi_findex.h"

namespace qm {

namespace {

constexpr int kLeafLevel = 4;
constexpr int32_t kRootBlock = 1;
// A wholly damaged file would list every block: the first ones tell enough.
constexpr std::size_t kMostProblems = 50;

std::string FileName(const std::string& path) { return path.substr(path.find_last_of('/') + 1); }


std::string LevelName(int level) {
  switch (level) {
    case 1: return "root";
    case kLeafLevel: return "leaf";
    default: return "node, level " + std::to_string(level);
  }
}

// The walk of one findex's pair of files.
class PairCheck {
 public:
  PairCheck(const CGlobalDefs& defs, std::string_view name, std::vector<std::string>& problems)
      : name_(name), paths_(findex::PathsOf(defs, name)), problems_(problems),
        problems_at_start_(problems.size()), sdx_name_(FileName(paths_.sdx)),
        fst_name_(FileName(paths_.fst)), findex_(defs) {}

  void Run() {
    if (!platform::FileExists(paths_.sdx)) return Problem(sdx_name_ + ": missing");
    try {
      findex_.OpenAsIs(name_);
    } catch (const CExceptionBase& e) {
      return Problem(sdx_name_ + " header (block 0): does not read: " + DamageText(e));
    }
    const CIndexHeader& header = findex_.Header();
    fst_size_ = findex_.ItemFileSize();
    if (fst_size_ < 0) return Problem(fst_name_ + ": missing or unreadable");
    run_.emplace(CColumnSet::FromGeneralFlags(header.GeneralFlags));
    positions_ = (header.GeneralFlags & 2) != 0;
    const int64_t blocks = findex_.BlockCount();
    if (header.BlockNum < 2) {
      // A findex without words: the header alone, no postings.
      if (fst_size_ != 0) Problem(fst_name_ + ": holds " + std::to_string(fst_size_) +
                                  " bytes, but the findex has no words");
      return;
    }
    if (blocks < header.BlockNum) {
      Problem(sdx_name_ + ": truncated: " + std::to_string(blocks) + " blocks of the " +
              std::to_string(header.BlockNum) + " the header counts");
    } else if (blocks > header.BlockNum) {
      Problem(sdx_name_ + ": " + std::to_string(blocks - header.BlockNum) +
              " blocks past the " + std::to_string(header.BlockNum) + " the header counts");
    }
    const int32_t usable = static_cast<int32_t>(std::min<int64_t>(blocks, header.BlockNum));
    visited_.assign(static_cast<std::size_t>(std::max(usable, 0)), false);
    if (usable > kRootBlock) {
      visited_[kRootBlock] = true;
      Node(kRootBlock, 1, std::nullopt, std::nullopt);
    }
    // What follows counts what the walk reached: after a problem, it would
    // only repeat it.
    if (problems_.size() != problems_at_start_) return;
    for (int32_t b = 2; b < usable; ++b) {
      if (!visited_[static_cast<std::size_t>(b)]) {
        Problem(sdx_name_ + " block " + std::to_string(b) + ": reached from no node");
      }
    }
    if (last_leaf_ != 0 && last_leaf_next_ != 0) {
      Problem(sdx_name_ + " block " + std::to_string(last_leaf_) +
              " (leaf): the last leaf links on to block " + std::to_string(last_leaf_next_));
    }
    if (problems_.size() == problems_at_start_ && fst_cursor_ != fst_size_) {
      Problem(fst_name_ + ": " + std::to_string(fst_size_ - fst_cursor_) +
              " bytes after the last posting list");
    }
    if (problems_.size() == problems_at_start_ && words_ != header.DistinctWordCount) {
      Problem(sdx_name_ + ": " + std::to_string(words_) + " leaf rows, but the header counts " +
              std::to_string(header.DistinctWordCount) + " distinct words");
    }
  }

 private:
  bool Full() const { return problems_.size() >= kMostProblems; }

  void Problem(std::string text) {
    if (problems_.size() < kMostProblems) problems_.push_back(std::move(text));
  }

  std::string Place(int32_t block, int level) const {
    return sdx_name_ + " block " + std::to_string(block) + " (" + LevelName(level) + ")";
  }

  // Reads a block of the walk's level (1 root .. 4 leaf); false (after the
  // problem) when it does not read.
  bool Read(int32_t number, int level) {
    try {
      findex_.ReadTreeBlock(level - 1, number);
    } catch (const CExceptionBase& e) {
      Problem(Place(number, level) + ": does not read: " + DamageText(e));
      return false;
    }
    return true;
  }

  // Whether value lies within (low, high]: the values a child holds.
  template <class Value>
  static bool Within(const Value& value, const std::optional<CValue>& low,
                     const std::optional<CValue>& high) {
    if (low && value.Compare(*low) == -1) return false;
    if (low && value.Compare(*low) == 0) return false;
    return !high || value.Compare(*high) != 1;
  }

  // Marks a child block; false (after the problem) when it cannot be one.
  bool Claim(int32_t parent, int level, int32_t child) {
    if (child < 2 || child >= static_cast<int32_t>(visited_.size())) {
      Problem(Place(parent, level) + ": child block " + std::to_string(child) +
              " is outside the file");
      return false;
    }
    if (visited_[static_cast<std::size_t>(child)]) {
      // The end leaf closes the last node of every level.
      if (child == end_leaf_) return false;
      Problem(Place(parent, level) + ": child block " + std::to_string(child) +
              " is used twice");
      return false;
    }
    visited_[static_cast<std::size_t>(child)] = true;
    return true;
  }

  void Node(int32_t number, int level, const std::optional<CValue>& low,
            const std::optional<CValue>& high) {
    if (Full() || !Read(number, level)) return;
    CGiFIndex::Node node;
    try {
      node = findex_.ReadNode(level - 1, number);
    } catch (const CExceptionBase& e) {
      Problem(Place(number, level) + ": does not decode: " + DamageText(e));
      return;
    }
    if (node.children.empty()) {
      return Problem(Place(number, level) + ": does not decode: the node holds no entries");
    }
    const std::vector<CValue>& separators = node.separators;
    for (std::size_t i = 0; i < separators.size(); ++i) {
      if (!Within(separators[i], low, high) && !(i + 1 == separators.size() && high &&
                                                 separators[i].Compare(*high) == 0)) {
        Problem(Place(number, level) + ": separator " + std::to_string(i + 1) +
                " lies outside the range of its parent");
      }
      if (i > 0 && separators[i].Compare(separators[i - 1]) == -1) {
        Problem(Place(number, level) + ": separators out of order at " + std::to_string(i + 1));
      }
    }
    for (std::size_t i = 0; i < node.children.size() && !Full(); ++i) {
      const std::optional<CValue> child_low = i == 0 ? low : std::optional<CValue>(separators[i - 1]);
      const std::optional<CValue> child_high =
          i < separators.size() ? std::optional<CValue>(separators[i]) : high;
      const int32_t child = node.children[i];
      // Past the last separator: the empty end leaf, at any level.
      const bool trailing = i == separators.size();
      if (!Claim(number, level, child)) continue;
      if (trailing) {
        EndLeaf(child, number, level);
      } else if (level + 1 == kLeafLevel) {
        Leaf(child, child_low, child_high);
      } else {
        Node(child, level + 1, child_low, child_high);
      }
    }
  }

  void EndLeaf(int32_t number, int32_t parent, int level) {
    if (!Read(number, kLeafLevel)) return;
    if (end_leaf_ != 0 && end_leaf_ != number) {
      Problem(Place(parent, level) + ": ends in block " + std::to_string(number) +
              ", where the other levels end in block " + std::to_string(end_leaf_));
    }
    end_leaf_ = number;
    bool empty = true;
    try {
      empty = findex_.ReadLeafRows(number, [](const CGiFIndex::LeafRow&) { return false; });
    } catch (const CExceptionBase&) {
      empty = false;
    }
    if (!empty) Problem(Place(number, kLeafLevel) + ": the end leaf is not empty");
  }

  void Leaf(int32_t number, const std::optional<CValue>& low, const std::optional<CValue>& high) {
    if (!Read(number, kLeafLevel)) return;
    // The chain: this leaf follows the one before it in tree order.
    const CGiFIndex::LeafLinks links = findex_.ReadLeafLinks(number);
    if (links.previous != last_leaf_) {
      Problem(Place(number, kLeafLevel) + ": links back to block " +
              std::to_string(links.previous) + ", but follows block " +
              std::to_string(last_leaf_));
    }
    if (last_leaf_ != 0 && last_leaf_next_ != number) {
      Problem(Place(last_leaf_, kLeafLevel) + ": links on to block " +
              std::to_string(last_leaf_next_) + ", but block " + std::to_string(number) +
              " follows it");
    }
    last_leaf_ = number;
    last_leaf_next_ = links.next;
    int32_t row = 0;
    try {
      findex_.ReadLeafRows(number, [&](const CGiFIndex::LeafRow& leaf_row) {
        ++row;
        if (!Within(leaf_row.value, low, high)) {
          Problem(Place(number, kLeafLevel) + ": row " + std::to_string(row) +
                  " lies outside the range of its parent");
        }
        if (previous_ && leaf_row.value.Compare(*previous_) != 1 &&
            leaf_row.value.Compare(*previous_) != kNotComparable) {
          Problem(Place(number, kLeafLevel) + ": row " + std::to_string(row) +
                  " is not above the value before it");
        }
        leaf_row.value.CopyTo(previous_.emplace());
        ++words_;
        Postings(number, row, leaf_row.position);
        return !Full();
      });
    } catch (const CExceptionBase& e) {
      Problem(Place(number, kLeafLevel) + ": row " + std::to_string(row + 1) +
              " does not decode: " + DamageText(e));
    }
    if (row == 0) Problem(Place(number, kLeafLevel) + ": holds no rows");
  }

  // The posting list of a leaf row at position of the .fst.
  void Postings(int32_t block, int32_t row, int64_t position) {
    const std::string place = fst_name_ + " list of " + sdx_name_ + " block " +
                              std::to_string(block) + " row " + std::to_string(row) +
                              " at byte " + std::to_string(position);
    const int64_t row_bytes = run_->RowSize();
    if (position < 0 || position + row_bytes > fst_size_) {
      fst_cursor_ = fst_size_;
      return Problem(place + ": the count row lies past the end of the file (" +
                     std::to_string(fst_size_) + " bytes)");
    }
    if (position != fst_cursor_) {
      Problem(place + ": the lists are not back to back (the one before ends at byte " +
              std::to_string(fst_cursor_) + ")");
    }
    int32_t count = 0;
    try {
      count = findex_.RunRows(position);
    } catch (const CExceptionBase& e) {
      return Problem(place + ": does not read: " + DamageText(e));
    }
    const int64_t end = position + row_bytes * std::max<int64_t>(count, 1);
    if (count < 2) {
      fst_cursor_ = position + row_bytes;
      return Problem(place + ": the count row holds " + std::to_string(count) +
                     ", not a number of postings + 1");
    }
    if (end > fst_size_) {
      fst_cursor_ = fst_size_;
      return Problem(place + ": its " + std::to_string(count - 1) +
                     " postings run past the end of the file (" + std::to_string(fst_size_) +
                     " bytes)");
    }
    fst_cursor_ = end;
    CItems& run = *run_;
    try {
      bool truncated = false;
      findex_.ReadItems(run, position, end, 0, truncated);
    } catch (const CExceptionBase& e) {
      return Problem(place + ": does not read: " + DamageText(e));
    }
    for (int32_t i = 2; i < run.Count(); ++i) {
      const int32_t before = run.Key(i - 1);
      const int32_t key = run.Key(i);
      // Positions repeat a key; without them each key is one posting.
      if (key < before || (!positions_ && key == before)) {
        return Problem(place + ": keys out of order at posting " + std::to_string(i) +
                       " (key " + std::to_string(key) + " after " + std::to_string(before) + ")");
      }
    }
  }

  std::string name_;
  findex::FilePaths paths_;
  std::vector<std::string>& problems_;
  std::size_t problems_at_start_;
  std::string sdx_name_;
  std::string fst_name_;
  CGiFIndex findex_;
  std::optional<CItems> run_;  // the rows of one posting list, count row first
  int64_t fst_size_ = 0;
  int64_t fst_cursor_ = 0;
  bool positions_ = false;
  std::vector<bool> visited_;
  int32_t end_leaf_ = 0;
  int32_t last_leaf_ = 0;
  int32_t last_leaf_next_ = 0;
  std::optional<CValue> previous_;
  int32_t words_ = 0;
};

}  // namespace

std::vector<std::string> CheckFindexFiles(const CGlobalDefs& defs, std::string_view name) {
  std::vector<std::string> problems;
  CLockManager lock(defs.GetLockScope(), defs.GetGroup(), findex::OwnerName(name), kLockFindex);
  lock.LockReader();
  PairCheck(defs, name, problems).Run();
  for (int32_t n = 1; problems.size() < kMostProblems; ++n) {
    const std::string add_on = findex::AddOnName(name, n);
    const findex::FilePaths paths = findex::PathsOf(defs, add_on);
    if (!platform::FileExists(paths.sdx) && !platform::FileExists(paths.fst)) break;
    PairCheck(defs, add_on, problems).Run();
  }
  const std::string del = findex::PathsOf(defs, name).del;
  if (problems.size() < kMostProblems && platform::FileExists(del)) {
    try {
      ReadDeletedKeys(defs, name);
    } catch (const CExceptionBase& e) {
      problems.push_back(FileName(del) + ": " + DamageText(e));
    }
  }
  return problems;
}

}  // namespace qm
