#include "quillmere/api_search.h"

#include <utility>

#include "api/api_arguments.h"
#include "api/api_invoke.h"
#include "api/component_load.h"
#include "api/error_report.h"
#include "base/exception_family.h"
#include "config/global_defs.h"
#include "platform/text_encoding.h"
#include "search/gi_start_point.h"

namespace qm {

namespace {

constexpr std::string_view kTraceTag = "APISearch";

// Remote servers come with remote access; until then these calls fail and
// the object stays unconnected, so every other call keeps searching locally.
[[noreturn]] void NoRemoteServers(std::string_view what, const char* method,
                                  const BSTR* name = nullptr) {
  throw CPiComException::Text(
      "Remote Quillmere Search servers are not available in this build: %s%S", method, nullptr,
      what, WideArgument(name));
}

// A property's answer: the low 16 bits of the engine's 0 or 1.
VARIANT_BOOL LowBits(int32_t answer) { return static_cast<VARIANT_BOOL>(answer & 0xFFFF); }

}  // namespace

struct APISearch::Engine {
  std::string server_name = "LOCALHOST";
  bool connected = false;
  CGiStartPoint engine;
};

APISearch::APISearch() {
  EnsureComponentLoaded();
  engine_ = std::make_unique<Engine>();
}

APISearch::~APISearch() = default;

template <class Body>
HRESULT APISearch::Invoke(Body&& body) {
  return InvokeMethod(*this, std::forward<Body>(body));
}

HRESULT APISearch::ReportError(const CExceptionBase& error) {
  return ReportError(FailureText(error));
}

HRESULT APISearch::ReportError(const std::u16string& text) {
  return ReportErrorText(text, kTraceTag, kProgId);
}

HRESULT APISearch::Refuse(const char16_t* text) {
  ErrorInfo info;
  info.Description = text;
  info.Source = kProgId;
  SetErrorInfo(info);
  return S_OK;
}

// --- 1-12 ---

HRESULT APISearch::Execute(const BSTR* SqlStatement) { return ExecuteEx(SqlStatement, 1); }

HRESULT APISearch::ExecuteEx(const BSTR* SqlStatement, VARIANT_BOOL AddNewResultSet) {
  return Invoke([&] {
    engine_->engine.ExecuteW(WideArgument(SqlStatement), IsVariantTrue(AddNewResultSet));
  });
}

HRESULT APISearch::GetSql(int32_t Start, int32_t Count, BSTR* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetSql") = engine_->engine.GetSql(Start, Count); });
}

HRESULT APISearch::GetVersion(BSTR* pVal) {
  return Invoke(
      [&] { ResultArgument(pVal, "GetVersion") = Utf8ToUtf16(CGlobalDefs::kVersionText); });
}

HRESULT APISearch::GetTotal(int32_t* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetTotal") = engine_->engine.GetTotal(); });
}

HRESULT APISearch::GetNum(int32_t* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetNum") = engine_->engine.GetNum(); });
}

HRESULT APISearch::Close() {
  return Invoke([&] { engine_->engine.Close(); });
}

HRESULT APISearch::GetTruncInfo(int32_t* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetTruncInfo") = engine_->engine.GetTruncInfo(); });
}

HRESULT APISearch::MoveNext() {
  return Invoke([&] { engine_->engine.MoveNext(); });
}

HRESULT APISearch::MovePrev() {
  return Invoke([&] { engine_->engine.MovePrev(); });
}

HRESULT APISearch::GetCount(const BSTR* ColumnName, int32_t* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "GetCount") = engine_->engine.GetCount(NarrowArgument(ColumnName));
  });
}

HRESULT APISearch::GetValue(const BSTR* ColumnName, int32_t* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "GetValue") = engine_->engine.GetValue(NarrowArgument(ColumnName));
  });
}

// --- 13-21 ---

HRESULT APISearch::SetGroup(const BSTR* GroupName) {
  return Invoke([&] { engine_->engine.SetGroup(NarrowArgument(GroupName)); });
}

HRESULT APISearch::SetDataPath(const BSTR* Path) {
  return Invoke([&] { engine_->engine.SetDataPath(NarrowArgument(Path)); });
}

HRESULT APISearch::GetGroupString(const BSTR* ColumnName, BSTR* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "GetGroupString") =
        Utf8ToUtf16(engine_->engine.GetGroupString(NarrowArgument(ColumnName)));
  });
}

HRESULT APISearch::OrderBy(const BSTR* ColumnNames) { return OrderByEx(ColumnNames, 1); }

HRESULT APISearch::OrderByEx(const BSTR* ColumnNames, VARIANT_BOOL AddOrderClause) {
  return Invoke([&] {
    engine_->engine.OrderBy(NarrowArgument(ColumnNames), IsNonZero(AddOrderClause));
  });
}

HRESULT APISearch::CollectGroups() {
  return Invoke([&] { engine_->engine.CollectGroups(); });
}

HRESULT APISearch::IsEOB(VARIANT_BOOL* pVal) {
  return Invoke(
      [&] { ResultArgument(pVal, "IsEOB") = LowBits(engine_->engine.IsEOB() ? 1 : 0); });
}

HRESULT APISearch::GetRawKeyString(int32_t Start, int32_t Count, BSTR* pVal) {
  return GetRawKeyStringEx(Start, Count, 0, pVal);
}

HRESULT APISearch::GetRawKeyStringEx(int32_t Start, int32_t Count, int32_t CmdNumber,
                                     BSTR* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "GetRawKeyStringEx") =
        Utf8ToUtf16(engine_->engine.GetRawKeyString(Start, Count, CmdNumber));
  });
}

// --- 22-27 ---

HRESULT APISearch::ConnectToServer(const BSTR* ServerName) {
  return Invoke([&] { NoRemoteServers("cannot connect to ", "ConnectToServer", ServerName); });
}

HRESULT APISearch::DisconnectFromServer() {
  return Invoke(
      [&] { NoRemoteServers("there is no server connection to close", "DisconnectToServer"); });
}

HRESULT APISearch::SetLimits(int32_t Start, int32_t Count) {
  return Invoke([&] { engine_->engine.SetLimits(Start, Count); });
}

HRESULT APISearch::GetTotalGroups(int32_t* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetTotalGroups") = engine_->engine.GetTotalGroups(); });
}

HRESULT APISearch::GetNumGroups(int32_t* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetNumGroups") = engine_->engine.GetNumGroups(); });
}

HRESULT APISearch::GetGroupSql(int32_t Start, int32_t Count, const BSTR* ColumnName, BSTR* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "GetGroupSql") =
        engine_->engine.GetGroupSql(Start, Count, NarrowArgument(ColumnName));
  });
}

// --- 28-32: local only ---

HRESULT APISearch::GetFindexWords(const BSTR* FindexName, int32_t Start, int32_t Count,
                                  BSTR* pVal) {
  const BSTR every = u"*";
  const BSTR separator = u";";
  return GetFindexWordsEx(FindexName, Start, Count, &every, &separator, pVal);
}

HRESULT APISearch::GetFindexWordsEx(const BSTR* FindexName, int32_t Start, int32_t Count,
                                    const BSTR* Filter, const BSTR* Separator, BSTR* pVal) {
  if (engine_->connected) return Refuse(u"GetFindexWords not supported in Quillmere Search Server.");
  return Invoke([&] {
    ResultArgument(pVal, "GetFindexWordsEx") = engine_->engine.GetFindexWords(
        NarrowArgument(FindexName), Start, Count, WideArgument(Filter), WideArgument(Separator));
  });
}

HRESULT APISearch::GetTotalWords(int32_t* pVal) {
  if (engine_->connected) return Refuse(u"GetTotalWords not supported in Quillmere Search Server.");
  return Invoke([&] { ResultArgument(pVal, "GetTotalWords") = engine_->engine.GetTotalWords(); });
}

HRESULT APISearch::GetNumWords(int32_t* pVal) {
  if (engine_->connected) return Refuse(u"GetNumWords not supported in Quillmere Search Server.");
  return Invoke([&] { ResultArgument(pVal, "GetNumWords") = engine_->engine.GetNumWords(); });
}

HRESULT APISearch::ValidateStatement(const BSTR* SqlStatement, BSTR* pVal) {
  if (engine_->connected) {
    return Refuse(u"ValidateStatement not supported in Quillmere Search Server.");
  }
  return Invoke([&] {
    ResultArgument(pVal, "ValidateStatement") =
        engine_->engine.ValidateStatementW(WideArgument(SqlStatement));
  });
}

// --- 33-40 ---

HRESULT APISearch::GetMaxScore(int32_t* pVal) {
  return Invoke([&] { ResultArgument(pVal, "GetMaxScore") = engine_->engine.GetMaxScore(); });
}

HRESULT APISearch::AdjustScore(double StartValue, double StepValue) {
  return AdjustScoreEx(StartValue, StepValue, 0, 0, 1);
}

HRESULT APISearch::AdjustScoreEx(double StartValue, double StepValue, int32_t AdjustmentType,
                                 int32_t StopCount, VARIANT_BOOL StopAtZero) {
  return Invoke([&] {
    engine_->engine.AdjustScore(StartValue, StepValue, AdjustmentType, StopCount,
                                IsNonZero(StopAtZero));
  });
}

HRESULT APISearch::SetCacheSize(int32_t CacheSize) {
  return Invoke([&] { engine_->engine.SetCacheSize(CacheSize); });
}

HRESULT APISearch::IsTruncated(VARIANT_BOOL* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "IsTruncated") = LowBits(engine_->engine.IsTruncated() ? 1 : 0);
  });
}

HRESULT APISearch::GetRawKeyFile(int32_t Start, int32_t Count, BSTR* pVal) {
  return GetRawKeyFileEx(Start, Count, 1, pVal);
}

HRESULT APISearch::GetRawKeyFileEx(int32_t Start, int32_t Count, int32_t CmdNumber, BSTR* pVal) {
  return Invoke([&] {
    ResultArgument(pVal, "GetRawKeyFileEx") =
        Utf8ToUtf16(engine_->engine.GetRawKeyFile(Start, Count, CmdNumber));
  });
}

HRESULT APISearch::SetNumericOption(const BSTR* Name, int32_t Value) {
  return Invoke([&] { engine_->engine.SetNumericOption(NarrowArgument(Name), Value); });
}

// --- 41-44 ---

HRESULT APISearch::GetSqlOrderString(BSTR* pVal) {
  if (engine_->connected) {
    return Refuse(u"GetSqlOrderString not supported in Quillmere Search Server.");
  }
  return Invoke(
      [&] { ResultArgument(pVal, "GetSqlOrderString") = engine_->engine.GetSqlOrderString(); });
}

HRESULT APISearch::GetSqlKeyName(BSTR* pVal) {
  if (engine_->connected) return Refuse(u"GetSqlKeyName not supported in Quillmere Search Server.");
  return Invoke([&] {
    ResultArgument(pVal, "GetSqlKeyName") = Utf8ToUtf16(engine_->engine.GetSqlKeyName());
  });
}

HRESULT APISearch::NetworkStartup() {
  if (engine_->connected) {
    return Refuse(u"NetworkStartup have to be called before connecting to a server.");
  }
  // POSIX sockets need no library start.
  return S_OK;
}

HRESULT APISearch::NetworkCleanup() {
  if (engine_->connected) {
    return Refuse(u"NetworkCleanup have to be called after disconnecting from a server.");
  }
  return S_OK;
}

}  // namespace qm
