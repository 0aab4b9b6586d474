// CGiFIndex: one findex opened for searching: its word tree (N.sdx, read as
// blocks, header in block 0) and its item file (N.fst, opened afresh for
// every read, so no handle stays on it between reads).
//
// Item positions are byte offsets in the .fst file. Each word owns one run
// there: a count row (key column = rows of the run, itself included) and its
// item rows, the runs in word order. Anything read from the files (child
// block numbers, leaf links, positions, counts) is checked against the files
// before it is followed or sizes a read: a damaged findex raises an error
// naming the findex, never a crash, a hang or "nothing found".
//
// REQUIRES: the caller holds a reader unit of the findex's kind 2 lock (the
// owner's, for an add-on) while the findex is open; CGiRepository does.
#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "base/value.h"
#include "format/bfile.h"
#include "format/block.h"
#include "format/block_value.h"
#include "format/index_header.h"

namespace qm {

class CExceptionBase;
class CGlobalDefs;
class CItems;
class CWordPattern;
struct CWordSearch;

// Comparison flags of a search condition, as the lookup reads them.
namespace compare_flags {
inline constexpr int32_t kEqual = 1;
inline constexpr int32_t kSimilarPercent = 4;   // "=~": distance as a percentage of the length
inline constexpr int32_t kSimilarDistance = 8;  // "=^": distance as a number
inline constexpr int32_t kProximity = 16;
inline constexpr int32_t kGreater = 64;
inline constexpr int32_t kLess = 128;
}  // namespace compare_flags

// What one GetItems call did.
struct CLookupResult {
  bool found = false;      // at least one word matched
  bool truncated = false;  // the read limit cut the items
  int32_t runs = 0;        // runs appended to the array
  int32_t rows = 0;        // rows appended, count rows included
};

class CGiFIndex {
 public:
  // Results of FindStartStop.
  static constexpr int32_t kFound = 0;
  static constexpr int32_t kNothingFound = 60;
  static constexpr int32_t kStopBeyondEnd = 61;

  explicit CGiFIndex(const CGlobalDefs& defs);
  ~CGiFIndex();
  CGiFIndex(const CGiFIndex&) = delete;
  CGiFIndex& operator=(const CGiFIndex&) = delete;

  // Opens name (a plain name, else refused before any file is touched): the
  // .sdx read-only, its header read and checked (version, block count).
  void Open(std::string_view name);
  // As Open, but false (nothing open) when the findex's .sdx does not exist
  // or the name is no plain name: the end of the add-on findexes.
  bool TryOpen(std::string_view name);
  void Close();
  bool IsOpen() const { return open_; }

  const std::string& Name() const { return name_; }
  const std::string& SdxPath() const { return sdx_path_; }
  const std::string& FstPath() const { return fst_path_; }
  const std::string& DelPath() const { return del_path_; }
  const CIndexHeader& Header() const { return header_; }
  // The VALUE_TYPE code of the words.
  int32_t FindexType() const { return header_.FindexType; }
  // Bytes of one item row, by the header's general flags.
  int32_t RowSize() const;

  // The items of one query word, read into items (replacing its rows, or
  // appended after them with append). flags: compare_flags; modifier: the
  // condition's number, -1 when none was given. limit: bytes of items the
  // word may fill in items (0 = no limit), rounded down to whole rows.
  // Exact words and values, ranges (> >= < <=, and a date/time's period),
  // patterns and similar words (text findexes). Each word read is one run.
  CLookupResult GetItems(CItems& items, const CWordSearch& word, int32_t flags, int32_t modifier,
                         int64_t limit, bool append);

  // The item positions of the words from start to stop, both included:
  // start_pos the first such word's run, stop_pos the end of the last one.
  // kFound, kNothingFound (no word in the range, or an empty tree), or
  // kStopBeyondEnd (stop lies beyond the last word; stop_pos = the file's
  // size). single: only the word equal to start.
  int32_t FindStartStop(const CValue& start, const CValue& stop, int64_t& start_pos,
                        int64_t& stop_pos, bool single, int32_t flags);
  // The leaf where value stands or would stand; kNothingFound for an empty tree.
  int32_t FindLeaf(const CValue& value, int32_t& block);
  // The end of the run at position (its count row checked against the file).
  int64_t RunEnd(int64_t position);
  int64_t ItemFileSize() const;

  // Replaces items' rows with those of [start, stop). With a non-zero limit
  // (bytes) a longer range is cut to the limit and truncated set. The last
  // run's count row then holds the rows actually read.
  void ReadItems(CItems& items, int64_t start, int64_t stop, int64_t limit, bool& truncated);
  // Appends the rows of [start, stop) after filled bytes of items (its
  // count); the limit covers filled + the new rows. Reads nothing when the
  // cut leaves no room. Returns the rows appended.
  int32_t ReadMoreItems(CItems& items, int64_t filled, int64_t start, int64_t stop, int64_t limit,
                        bool& truncated);

  // Lists the words that match filter (an empty filter matches all), in
  // word order from the filter's literal prefix on. The words numbered
  // first..last (1-based, both included) go to words; total is every
  // matching word. Text findexes only (type 2 or 4), else a general error.
  void GetFindexWordsW(const CWordPattern& filter, int32_t first, int32_t last,
                       std::vector<std::u16string>& words, int32_t& total);

  // --- The files piece by piece: the reads every lookup is made of, for a
  // caller that walks the whole findex (the findex check). Tree levels are
  // numbered 0 (root) to 3 (leaf). Damage raises as in a lookup.

  // As Open, but what a walk can still read past stays open: a word tree
  // with more or fewer blocks than its header counts (BlockCount against
  // Header().BlockNum), and an item file that cannot be opened
  // (ItemFileSize() -1). The item file is sized even when there are no words.
  void OpenAsIs(std::string_view name);
  // Blocks of the .sdx, the header's block 0 included.
  int64_t BlockCount() const { return block_count_; }

  // Reads tree block number for a level unless that level holds it already;
  // a block that cannot be read raises here, before its entries are decoded.
  void ReadTreeBlock(int level, int32_t number);

  // A node block (levels 0 to 2) as written: a leading child, then pairs of
  // separator and child. A node that ends after a separator holds as many
  // separators as children; an empty one holds neither.
  struct Node {
    std::vector<int32_t> children;
    std::vector<CValue> separators;
  };
  Node ReadNode(int level, int32_t number);

  // One leaf row: a word and the position of its run in the .fst.
  struct LeafRow {
    BlockValue value;
    int64_t position = 0;
  };
  // A leaf's links to the next and the previous leaf, 0 for none.
  struct LeafLinks {
    int32_t next = 0;
    int32_t previous = 0;
  };
  LeafLinks ReadLeafLinks(int32_t number);
  // Calls visit for each row of the leaf in order until it returns false;
  // visit reads no other leaf, and a row's value lives as long as the leaf
  // stays read. Returns whether every row was visited.
  bool ReadLeafRows(int32_t number, const std::function<bool(const LeafRow&)>& visit);

  // The rows of the run at position, its count row included, as the count
  // row says (not checked against the file beyond the count row itself).
  int32_t RunRows(int64_t position);

 private:
  static constexpr int32_t kBlockUnits = 64;  // 4,096-byte tree blocks
  // Where the first word at or after a value stands.
  struct Boundary {
    int64_t position = 0;  // its run, or the item file's size when there is none
    bool found = false;
    bool equal = false;    // the word equals the value
  };

  void OpenFiles(std::string_view name, bool as_is);
  void RequireOpen(const char* method) const;
  // The tree block at a level (0 root .. 3 leaf), read unless that level
  // already holds it.
  CBlock& TreeBlock(int level, int32_t number);
  // Reads the node block at a level entry by entry: on_child(child) for the
  // leading child and each child after a separator, on_separator(value)
  // for each separator, the read ending when it returns false. False for a
  // block without entries.
  template <class OnChild, class OnSeparator>
  bool ReadNodeEntries(int level, int32_t number, OnChild on_child, OnSeparator on_separator);
  // The rows of a leaf, as ReadLeafRows.
  template <class Visit>
  bool VisitLeafRows(int32_t number, Visit&& visit);
  // The leaf block where value stands or would stand; 0 for an empty tree.
  int32_t Descend(const CValue& value);
  // The first word not below value, or above it with after.
  Boundary FindBoundary(const CValue& value, bool after);
  // Walks the leaf chain from block, calling visit for every row until it
  // returns false.
  void WalkLeaves(int32_t block, const std::function<bool(const LeafRow&)>& visit);
  template <class Match>
  CLookupResult ReadMatchingRuns(CItems& items, int32_t leaf, int64_t limit, Match match);
  CLookupResult ScanPattern(CItems& items, const CWordSearch& word, int64_t limit);
  CLookupResult ScanSimilar(CItems& items, const CWordSearch& word, int32_t flags,
                            int32_t modifier, int64_t limit);
  int32_t RunRowsAt(int64_t position);
  int64_t RunEndAt(int64_t position);
  void ReadFst(int64_t position, uint8_t* data, std::size_t n, const char* method);
  // Appends the rows of [start, stop) under the limit; runs counts the runs
  // among them. Returns the rows appended.
  int32_t ReadRange(CItems& items, int64_t start, int64_t stop, int64_t limit, bool& truncated,
                    int32_t& runs);
  [[noreturn]] void Damaged(const char* method, const std::string& what,
                            const CExceptionBase* inner = nullptr) const;

  const CGlobalDefs& defs_;
  BFile sdx_;
  bool open_ = false;
  std::string name_;
  std::string sdx_path_;
  std::string fst_path_;
  std::string del_path_;
  CIndexHeader header_;
  int64_t block_count_ = 0;
  int64_t fst_size_ = 0;
  std::array<int32_t, 4> levels_{};  // block number each level holds, 0 none
  std::array<CBlock, 4> blocks_{CBlock(kBlockUnits), CBlock(kBlockUnits), CBlock(kBlockUnits),
                                CBlock(kBlockUnits)};
};

}  // namespace qm
