// CGiTreeRowset: the result set of a search. Walks the condition tree of a
// search command, looks every word up in its findex and the findex's add-on
// findexes, removes deleted keys, combines the partial results by the
// operators of the tree, and keeps the result (one row per key, sorted by
// key, with a score when the findex keeps scores), its paging window and
// whether any read or merge was cut by the cache size.
//
// Rows: key, [score], [position], and in a result set of several commands a
// last column with the command number. Row 0 is the count row.
//
// One thread at a time; the findex files are read under the catalogue view's
// reader locks, the deleted keys under the findex's kind 1 reader lock.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "format/items.h"
#include "search/cmd_list.h"
#include "search/rowset_order.h"

namespace qm {

class CGiFIndex;
class CGiRepository;
class CGlobalDefs;
class CLanguage;
struct CGiNode;

class CGiTreeRowset {
 public:
  // defs must outlive the result set.
  explicit CGiTreeRowset(const CGlobalDefs& defs);
  ~CGiTreeRowset();
  CGiTreeRowset(const CGiTreeRowset&) = delete;
  CGiTreeRowset& operator=(const CGiTreeRowset&) = delete;

  CGiCmdList& Commands() { return commands_; }
  const CGiCmdList& Commands() const { return commands_; }

  // Evaluates the tree of the command (1-based in the command list) into the
  // result: the result itself, or with append its rows after those already
  // standing, each row then carrying its command number in a last column.
  void StartRowset(int32_t command_number, bool append);
  // Frees the result; the commands, the cache size and the score options stay.
  void Close();

  // Window = rows start .. start + count - 1 (1-based), cut at the total.
  void SetLimits(int32_t start, int32_t count);
  // Bytes of items one word may read and an OR, NEAR or proximity merge may
  // produce; 0 (also for a negative value) = no limit.
  void SetCacheSize(int32_t bytes) { cache_size_ = bytes > 0 ? bytes : 0; }
  int32_t GetCacheSize() const { return cache_size_; }

  bool IsOpen() const { return open_; }
  int32_t GetCommandCount() const { return command_count_; }
  int32_t GetTotal() const { return total_; }
  int32_t GetFirst() const { return first_; }
  int32_t GetNum() const { return num_; }
  bool IsTruncated() const { return truncated_; }
  // The result rows, count row first. REQUIRES: IsOpen().
  const CItems& Result() const { return *result_; }
  // The order string of the SQL side: the first findex's key column + " ASC"
  // after each evaluation, then the last order list applied. without_score
  // drops its SCORE items.
  std::string SqlOrder(bool without_score = false) const;
  // Whether the SQL gets " order by " and the order string.
  bool AddOrderClause() const;
  // Whether the rows were last ordered by SCORE: key strings then group by score.
  bool ScoreActive() const;
  // Whether the result rows carry a score column.
  bool HasScores() const;
  // The command number of the row: its last column in a result set of
  // several commands, else the one command evaluated.
  int32_t CommandOfRow(int32_t row) const;

  // --- ordering, groups and scores of the result rows (rowset_order.h) ---
  // Applies an order list (rounding scores first while a score group count
  // is set), then sorts. A failing list leaves the rows and order as they were.
  void OrderBy(std::string_view list, bool add_order_clause);
  void CollectGroups();
  void MoveNext();
  void MovePrev();
  bool IsEOB() const;
  int32_t GetTotalGroups() const;
  int32_t GetNumGroups() const;
  // The current group's value and count of the column, and the group string
  // of the window's groups.
  int32_t GetValue(std::string_view column) const;
  int32_t GetCount(std::string_view column) const;
  std::string GetGroupString(std::string_view column) const;
  // Sets the window, then the SQL of command 1 for the window's groups.
  std::u16string GetGroupSql(int32_t start, int32_t count, std::string_view column);
  int32_t GetMaxScore();
  void AdjustScore(double start_value, double step_value, int32_t adjustment,
                   int32_t stop_count, bool stop_at_zero);

  // Combines two key-sorted arrays by an operator code with the scoring
  // rules of the codes; the result has the left array's columns. flags: the
  // comparison flags of the enclosing condition (16 turns AND, OR,
  // adjacency, AND NOT and NEAR into proximity). Arrays of different columns
  // raise error 10 for the codes that compare rows; adjacency, proximity and
  // NEAR without positions raise error 57.
  CItems MergeTwoResultset(const CItems& left, const CItems& right, int32_t code, int32_t flags,
                           int32_t distance, int32_t word_count);
  // Removes the keys in the findex's deleted-key file from items.
  void Exclude(const CGiFIndex& findex, CItems& items);
  // One row per key after a condition whose rows carry positions.
  void ReduceItems(CItems& items, int32_t word_count);
  // The rows of current followed by those of added, every row ending with
  // its command number (current's rows get 1 when the column is new).
  CItems AddResultset(const CItems& current, bool has_command_column, const CItems& added,
                      int32_t command_number);

 private:
  struct Context;
  CItems Evaluate(const CGiNode& node, const Context& context);
  // reduce: one row per key when the rows carry positions.
  CItems EvaluateCondition(const CGiNode& node, bool reduce);
  CItems SearchWord(const CGiNode& node, const Context& context);
  // The word as the indexer wrote it: the findex's language steps applied.
  std::u16string NormaliseWord(const std::u16string& word, const CIndexHeader& header);
  int32_t LimitRows(const CColumnSet& columns) const;

  RowsetOrderContext OrderContext() const;
  // The result rows; raises "No open result set" naming method when none.
  CItems& Rows(const char* method) const;

  const CGlobalDefs& defs_;
  int32_t command_count_ = 0;
  bool open_ = false;
  CGiCmdList commands_;
  std::unique_ptr<CItems> result_;
  bool command_column_ = false;
  int32_t single_command_ = 1;  // the command of the rows while there is no command column
  int32_t first_ = 1;
  int32_t num_ = 0;
  int32_t total_ = 0;
  int32_t cache_size_ = 0;
  bool truncated_ = false;
  // The width of the rows as evaluated, before order columns were attached.
  int32_t base_width_ = 0;
  std::unique_ptr<CGiRowsetOrder> order_;
  std::unique_ptr<CLanguage> language_;
};

}  // namespace qm
