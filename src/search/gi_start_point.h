// CGiStartPoint: the search engine behind one search object. It owns at most
// one open result set and turns each call into operations on it: running
// statements (several into one result set), paging, SQL and key lists for
// the host's database, order values and groups, score adjustment, listing a
// findex's words, and the settings searches need (data path, group, cache
// size, score options).
//
// Every operation raises only the GiStartPoint family: other failures of the
// exception family are chained below a GiStartPoint error naming the
// operation, anything else becomes its unknown exception. Operations that
// need a result set fail with "No open result set" when none is open.
//
// One thread at a time.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "config/global_defs.h"

namespace qm {

class CGiTreeRowset;

class CGiStartPoint {
 public:
  // Group "PUBLIC"; writes the trace session banner.
  CGiStartPoint();
  ~CGiStartPoint();
  CGiStartPoint(const CGiStartPoint&) = delete;
  CGiStartPoint& operator=(const CGiStartPoint&) = delete;

  // --- statements ---
  // Runs a statement into a new result set, or with add as one more command
  // of the open one. Without add an open result set is refused.
  void ExecuteW(std::u16string_view statement, bool add);
  // The parsed tree of the statement as text; nothing is searched.
  std::u16string ValidateStatementW(std::u16string_view statement);
  void Close();
  bool IsOpen() const { return open_; }

  // --- results ---
  // The statement's SQL with the window's keys, one SELECT per command joined
  // by " UNION ALL ", with the order clause when an ordering asked for it.
  // count 0 keeps the window.
  std::u16string GetSql(int32_t start, int32_t count);
  std::u16string GetSqlOrderString();
  std::string GetSqlKeyName();
  // As of the last Execute, GetSql or raw key call.
  int32_t GetTotal();
  int32_t GetNum();
  // The truncated flag (1 when a read was cut by the cache size).
  int32_t GetTruncInfo();
  bool IsTruncated() const;
  void SetLimits(int32_t start, int32_t count);
  // "(k,k,...)", or "score;(k,...);score;(k,...);" while ordered by score.
  // command 0 is the last command.
  std::string GetRawKeyString(int32_t start, int32_t count, int32_t command = 0);
  // Writes the window's keys, one a line ending in CR LF ("score,key" while
  // ordered by score), and returns the file's full name.
  std::string GetRawKeyFile(int32_t start, int32_t count, int32_t command = 1);
  int32_t GetMaxScore();
  // "SCORE_GROUP_COUNT" or "SCORE_RETURN" (compared exactly).
  void SetNumericOption(std::string_view name, int32_t value);

  // --- orders and groups ---
  void OrderBy(std::string_view columns, bool add_order_clause);
  void CollectGroups();
  int32_t GetTotalGroups();
  int32_t GetNumGroups();
  void MoveNext();
  void MovePrev();
  bool IsEOB();
  int32_t GetValue(std::string_view column);
  int32_t GetCount(std::string_view column);
  std::string GetGroupString(std::string_view column);
  std::u16string GetGroupSql(int32_t start, int32_t count, std::string_view column);
  void AdjustScore(double start_value, double step_value, int32_t adjustment, int32_t stop_count,
                   bool stop_at_zero);

  // --- settings ---
  // Only while no result set is open.
  void SetGroup(std::string_view group);
  // Only while no result set is open; the folder must exist.
  void SetDataPath(std::string_view path);
  // Bytes of items a later search may read per word: megabytes x 1,000,000.
  void SetCacheSize(int32_t megabytes);
  const CGlobalDefs& Settings() const { return defs_; }

  // --- findex words ---
  // The words of a text findex and its add-on findexes matching filter (a
  // word pattern; empty matches every word), numbered from 1 in each findex;
  // those numbered start .. start + count, joined by separator.
  std::u16string GetFindexWords(std::string_view findex, int32_t start, int32_t count,
                                std::u16string_view filter, std::u16string_view separator);
  // The count argument of the last listing, and the matching words of the
  // last findex it listed.
  int32_t GetTotalWords() const { return total_words_; }
  int32_t GetNumWords() const { return listed_words_; }

 private:
  CGiTreeRowset& OpenRowset(const char* method);
  // The open result set after the checks of the raw key calls and their
  // window (count 0 keeps it).
  CGiTreeRowset& KeyWindow(const char* method, int32_t start, int32_t count, int32_t command);
  // Calls visit(key, score) for the window's rows of the command (0: the
  // last); the score is 0 unless the rows are ordered by score.
  template <class Visit>
  void ForEachWindowRow(int32_t command, Visit&& visit);
  // The key string of a command over the window (the rows of that command).
  std::string KeyString(int32_t command);
  // A score as written in key strings and key files.
  int32_t ShownScore(int32_t score, int32_t max_score) const;
  void RefreshCounts();

  int32_t listed_words_ = 0;
  int32_t total_words_ = 0;
  bool open_ = false;
  int32_t total_ = 0;
  int32_t num_ = 0;
  int32_t total_groups_ = 0;
  CGlobalDefs defs_;
  int32_t cache_size_ = 0;
  std::unique_ptr<CGiTreeRowset> rowset_;
  std::string key_file_;  // named once per result set
};

}  // namespace qm
