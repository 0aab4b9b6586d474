// CGiRowsetOrder: the order and group state of a result set, and the
// operations on its rows that use it: ordering by score, by key or by the
// columns of orders attached to the rows, reversing, grouping into runs of
// equal sort values and reading them group by group, and adjusting or
// rounding the scores. The result set owns one and hands it its rows.
//
// Rows: a result array whose row 0 is the count row; the result rows are
// rows 1 .. Count() - 1 (key, [score], [position], [command number], then
// the columns of attached orders). Column 1 is the score when the rows carry
// scores.
//
// Sort keys compare signed 32-bit columns; a double or date/time order
// column takes two (attached_value.h). Rows of equal sort values come out in
// the reverse of their order before the sort: the later run's row is taken
// first on a tie, so rows of equal score follow in descending key order.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "format/items.h"
#include "search/order_column_registry.h"

namespace qm {

class CGlobalDefs;
class CGiOrder;

// What ordering needs to know of the search behind the rows.
struct RowsetOrderContext {
  bool score_support = false;     // general option bit 1 of the first findex searched
  std::string key_column;         // the key column of that findex
  int32_t part_count = 0;         // the condition parts of search command 1
  int32_t score_group_count = 0;  // keys per score group; above 0 rounds scores first
};

class CGiRowsetOrder {
 public:
  // The first result row of an array (row 0 is the count row).
  static constexpr int32_t kFirstRow = 1;

  // REQUIRES: defs outlives this object.
  explicit CGiRowsetOrder(const CGlobalDefs& defs);
  ~CGiRowsetOrder();
  CGiRowsetOrder(const CGiRowsetOrder&) = delete;
  CGiRowsetOrder& operator=(const CGiRowsetOrder&) = delete;

  // For new result rows: detaches every order (their locks go back) and
  // forgets sort keys, groups, score state and the order clause; the SQL
  // order string becomes key_column + " ASC".
  void Reset(std::string_view key_column);

  // Applies an order list: "REVERSE", or items "COLUMN [ASC|DESC]" separated
  // by ",", a column being SCORE, KEY or ORDER.COLUMN. Error 59 for another
  // direction, 60 for SCORE without score support, 61 when an order column
  // cannot be attached. The caller sorts next (SortItems).
  void SetOrder(CItems& rows, std::string_view list, bool add_order_clause,
                const RowsetOrderContext& context);
  // Opens the order of "ORDER.COLUMN" (or the repository's "_R_" order), and
  // adds the values of every column of that order, for each row's key, as
  // further columns of the rows. An order already attached is reused.
  const AttachedColumn& AttachOrder(CItems& rows, std::string_view order_column);

  // Sorts by the sort keys, or only reverses after a "REVERSE" list; keeps
  // the maximum score. Groups collected before are dropped.
  void SortItems(CItems& rows, const RowsetOrderContext& context);
  void ReverseItems(CItems& rows);

  // Groups the sorted rows into runs of equal sort values (CollectGroups).
  void CollectItems(const CItems& rows);
  int32_t GetTotalGroups() const { return static_cast<int32_t>(representatives_.size()); }
  // The groups taken by the last GetGroupKeyString.
  int32_t GetNumGroups() const { return num_groups_; }
  void MoveNext();
  void MovePrev();
  bool IsEOB() const { return end_of_groups_; }

  // The current group: the column's value and its number of rows at the
  // column's sort level. column: SCORE, KEY, the key column or ORDER.COLUMN.
  int32_t GetValue(const CItems& rows, std::string_view column,
                   const RowsetOrderContext& context) const;
  int32_t GetCount(const CItems& rows, std::string_view column,
                   const RowsetOrderContext& context) const;
  // "(" + the column's values of the groups in the window, one per distinct
  // value at its sort level, + ")". first is 1-based; num 0 means every
  // group from first.
  std::string GetGroupString(const CItems& rows, std::string_view column,
                             const RowsetOrderContext& context, int32_t first, int32_t num) const;
  // The key string "(k,k,...)" of the rows of those groups; their number
  // becomes GetNumGroups.
  std::string GetGroupKeyString(const CItems& rows, std::string_view column,
                                const RowsetOrderContext& context, int32_t first, int32_t num);
  // The SQL of search command 1 for those groups: rebuild turns a key string
  // into that SQL. With the order clause, " order by " and the SQL order
  // string without SCORE items follow. Empty when no group is taken.
  std::string GetGroupSql(const CItems& rows, std::string_view column,
                          const RowsetOrderContext& context, int32_t first, int32_t num,
                          const std::function<std::string(const std::string&)>& rebuild);

  // The highest score kept by the last SortItems (computed from the rows
  // when they have not been sorted yet).
  int32_t GetMaxScore(const CItems& rows, const RowsetOrderContext& context);
  // Every score down to a multiple of 100.
  void RoundScore(CItems& rows, const RowsetOrderContext& context);
  // Adds v (adjustment 0) or score x v (adjustment 1) to the rows in their
  // order, v starting at start_value and falling by step_value a row; scores
  // stay at or above 0. Stops after stop_count rows (0: never); with
  // stop_at_zero v stops at 0 instead of crossing it.
  void AdjustWeight(CItems& rows, const RowsetOrderContext& context, double start_value,
                    double step_value, int32_t adjustment, int32_t stop_count, bool stop_at_zero);

  // The order list for the host's SQL ("COL ASC,COL DESC"); without_score
  // drops the SCORE items.
  std::string SqlOrderString(bool without_score = false) const;
  bool AddOrderClause() const { return add_order_clause_; }
  // Whether the last order list ordered by SCORE (key strings then group by score).
  bool ScoreActive() const { return score_active_; }
  const std::vector<SortColumn>& SortKeys() const { return sort_keys_; }
  const COrderColumnRegistry& OrderColumns() const { return registry_; }

 private:
  struct Target {
    int32_t column = 0;  // the row column read for the value
    int32_t level = -1;  // its sort level, -1 when it is not ordered
    const AttachedColumn* attached = nullptr;
  };
  Target Resolve(const CItems& rows, std::string_view column, const RowsetOrderContext& context,
                 const char* method) const;
  // The current group's representative row, after the checks every group read makes.
  int32_t CurrentRow(const char* method) const;
  int32_t RequireLevel(const Target& target, std::string_view column, const char* method) const;
  // The window's groups that close a run at level.
  std::vector<int32_t> WindowGroups(int32_t level, int32_t first, int32_t num) const;
  void RequireScores(const CItems& rows, const RowsetOrderContext& context, const char* method,
                     const char* text) const;
  void DropGroups();
  // Sort keys that point past the rows (rows replaced after ordering) raise.
  void RequireSortColumns(const CItems& rows, const char* method) const;
  // Every score seen, and at least 200 per condition part when there are rows.
  void KeepMaxScore(const CItems& rows, const RowsetOrderContext& context);

  const CGlobalDefs& defs_;
  std::vector<SortColumn> sort_keys_;
  std::string sql_order_;
  bool add_order_clause_ = false;
  bool score_active_ = false;
  bool reverse_ = false;
  // The maximum score, once a sort (or GetMaxScore) has computed it.
  bool max_known_ = false;
  int32_t max_score_ = 0;

  COrderColumnRegistry registry_;
  std::map<std::string, std::unique_ptr<CGiOrder>> attached_;  // by upper-case requested name
  int32_t attached_width_ = 0;  // the width of the rows they were attached to

  // Groups: the last row of each group, and per group and sort level the
  // rows of the run that closes there (0 where no run of that level closes).
  bool collected_ = false;
  std::vector<int32_t> representatives_;
  std::vector<int32_t> counts_;
  int32_t cursor_ = 0;
  bool end_of_groups_ = true;
  int32_t num_groups_ = 0;
};

}  // namespace qm
