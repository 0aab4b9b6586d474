// APISearch: the search object ("QuillmereAPI.APISearch.1"), through which a
// host runs search statements and walks their results: totals, paging
// windows, SQL for its own database with the keys filled in, key strings and
// key files, orders, groups and scores. The 44 methods of IAPISearch follow
// in interface order (dispatch identifiers 1 to 44).
//
// Error model: every method returns S_OK, or DISP_E_EXCEPTION with the failure
// as text in the calling thread's error information (GetErrorInfo); the
// result parameter is then untouched.
//
// VARIANT_BOOL arguments: ExecuteEx adds to the open result set only for -1
// (Execute passes 1, so it never adds); every other method takes any non-zero
// value as true. The properties IsEOB and IsTruncated give the low 16 bits of
// the engine's answer: 1 for true, not VARIANT_TRUE. Test them for non-zero.
//
// Text arguments are const BSTR* (see quillmere/automation.h): a null pointer
// is a null text. Result pointers must not be null.
//
// This build searches locally only: ConnectToServer and DisconnectFromServer
// fail with a text saying that remote servers are not available in it.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "quillmere/automation.h"

namespace qm {

class CExceptionBase;

class APISearch {
 public:
  static constexpr const char16_t* kProgId = u"QuillmereAPI.APISearch.1";

  APISearch();
  virtual ~APISearch();
  APISearch(const APISearch&) = delete;
  APISearch& operator=(const APISearch&) = delete;

  // 1-2. Runs a search statement into a new result set; ExecuteEx with -1
  // adds it as one more command to the open result set.
  HRESULT Execute(const BSTR* SqlStatement);
  HRESULT ExecuteEx(const BSTR* SqlStatement, VARIANT_BOOL AddNewResultSet);
  // 3. The statement's SQL with the keys of the window (rows Start ..
  // Start + Count - 1; Count 0 keeps the window).
  HRESULT GetSql(int32_t Start, int32_t Count, BSTR* pVal);
  // 4. "6.14".
  HRESULT GetVersion(BSTR* pVal);
  // 5-8. Rows in the result and in the window; closing the result set; the
  // truncated flag (1 when the cache size cut a read).
  HRESULT GetTotal(int32_t* pVal);
  HRESULT GetNum(int32_t* pVal);
  HRESULT Close();
  HRESULT GetTruncInfo(int32_t* pVal);
  // 9-12. The group cursor, and the current group's count and value.
  HRESULT MoveNext();
  HRESULT MovePrev();
  HRESULT GetCount(const BSTR* ColumnName, int32_t* pVal);
  HRESULT GetValue(const BSTR* ColumnName, int32_t* pVal);
  // 13-14. Only while no result set is open.
  HRESULT SetGroup(const BSTR* GroupName);
  HRESULT SetDataPath(const BSTR* Path);
  // 15. "(v,v,...)": the column's values of the window's groups.
  HRESULT GetGroupString(const BSTR* ColumnName, BSTR* pVal);
  // 16-17. Orders the result: "SCORE DESC", "KEY", "ORDER.COLUMN ASC", ...,
  // or "REVERSE". OrderBy adds the order clause to the SQL.
  HRESULT OrderBy(const BSTR* ColumnNames);
  HRESULT OrderByEx(const BSTR* ColumnNames, VARIANT_BOOL AddOrderClause);
  // 18-19.
  HRESULT CollectGroups();
  HRESULT IsEOB(VARIANT_BOOL* pVal);
  // 20-21. The window's keys: "(k,k,...)", or "score;(k,...);..." while
  // ordered by score. CmdNumber 0 (GetRawKeyString) is the last command.
  HRESULT GetRawKeyString(int32_t Start, int32_t Count, BSTR* pVal);
  HRESULT GetRawKeyStringEx(int32_t Start, int32_t Count, int32_t CmdNumber, BSTR* pVal);
  // 22-23. Remote servers: not available in this build.
  HRESULT ConnectToServer(const BSTR* ServerName);
  HRESULT DisconnectFromServer();
  // 24-27.
  HRESULT SetLimits(int32_t Start, int32_t Count);
  HRESULT GetTotalGroups(int32_t* pVal);
  HRESULT GetNumGroups(int32_t* pVal);
  HRESULT GetGroupSql(int32_t Start, int32_t Count, const BSTR* ColumnName, BSTR* pVal);
  // 28-31. The words of a text findex (and its add-on findexes) numbered
  // Start .. Start + Count; GetFindexWords matches every word and joins by ";".
  HRESULT GetFindexWords(const BSTR* FindexName, int32_t Start, int32_t Count, BSTR* pVal);
  HRESULT GetFindexWordsEx(const BSTR* FindexName, int32_t Start, int32_t Count,
                           const BSTR* Filter, const BSTR* Separator, BSTR* pVal);
  HRESULT GetTotalWords(int32_t* pVal);
  HRESULT GetNumWords(int32_t* pVal);
  // 32. The parsed condition tree of the statement; nothing is searched.
  HRESULT ValidateStatement(const BSTR* SqlStatement, BSTR* pVal);
  // 33-35. The highest score; adding StartValue, StartValue - StepValue, ...
  // (AdjustmentType 0) or the score times them (1) to the rows in order.
  HRESULT GetMaxScore(int32_t* pVal);
  HRESULT AdjustScore(double StartValue, double StepValue);
  HRESULT AdjustScoreEx(double StartValue, double StepValue, int32_t AdjustmentType,
                        int32_t StopCount, VARIANT_BOOL StopAtZero);
  // 36. Megabytes of items a later search may read per word; 0 no limit.
  HRESULT SetCacheSize(int32_t CacheSize);
  // 37.
  HRESULT IsTruncated(VARIANT_BOOL* pVal);
  // 38-39. The window's keys written to a file, one a line; the result is the
  // file's name. CmdNumber 1 for GetRawKeyFile.
  HRESULT GetRawKeyFile(int32_t Start, int32_t Count, BSTR* pVal);
  HRESULT GetRawKeyFileEx(int32_t Start, int32_t Count, int32_t CmdNumber, BSTR* pVal);
  // 40. "SCORE_GROUP_COUNT" or "SCORE_RETURN" (names compared exactly).
  HRESULT SetNumericOption(const BSTR* Name, int32_t Value);
  // 41-42. The SQL order list, and the key column of the first findex searched.
  HRESULT GetSqlOrderString(BSTR* pVal);
  HRESULT GetSqlKeyName(BSTR* pVal);
  // 43-44. The socket library needs no start or release here; both keep the
  // rule that they are called while not connected.
  HRESULT NetworkStartup();
  HRESULT NetworkCleanup();

  // Trace the text (always written, tag "APISearch"), install it as the
  // thread's error information with this class's ProgID, return
  // DISP_E_EXCEPTION. The exception form reports its message chain.
  virtual HRESULT ReportError(const CExceptionBase& error);
  virtual HRESULT ReportError(const std::u16string& text);

 private:
  struct Engine;
  template <class Body>
  HRESULT Invoke(Body&& body);
  // The answer of a method that a search server does not offer, while
  // connected: the text goes to the thread's error information and the
  // method returns S_OK with its result untouched.
  HRESULT Refuse(const char16_t* text);

  std::unique_ptr<Engine> engine_;
};

}  // namespace qm
