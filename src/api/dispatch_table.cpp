#include "api/dispatch_table.h"

#include <algorithm>

#include "quillmere/api_command.h"
#include "quillmere/api_search.h"

namespace qm {

namespace {

bool SameName(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) {
    const auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; };
    return lower(x) == lower(y);
  });
}

}  // namespace

DispatchTable::DispatchTable(std::string prog_id, std::string interface_name,
                             std::vector<DispatchMethod> methods)
    : prog_id_(std::move(prog_id)),
      interface_name_(std::move(interface_name)),
      methods_(std::move(methods)) {}

const DispatchMethod* DispatchTable::Find(int32_t dispid) const {
  // Identifiers run from 1 in method order.
  if (dispid < 1 || dispid > static_cast<int32_t>(methods_.size())) return nullptr;
  return &methods_[static_cast<std::size_t>(dispid - 1)];
}

const DispatchMethod* DispatchTable::Find(std::string_view name) const {
  for (const DispatchMethod& method : methods_) {
    if (SameName(method.name, name)) return &method;
  }
  return nullptr;
}

// The interfaces in method order; the parameter names are those of the
// public headers.
const DispatchTable& APICommandDispatch() {
  static const DispatchTable table("QuillmereAPI.APICommand.1", "IAPICommand", {
      MethodEntry(1, "Execute", &APICommand::Execute, {"Sql"}),
      MethodEntry(2, "ExecuteEx", &APICommand::ExecuteEx, {"Sql", "Blocking"}),
      MethodEntry(3, "ConnectToDatabase", &APICommand::ConnectToDatabase, {"Dsn", "Uid", "Pwd"}),
      MethodEntry(4, "SetGroup", &APICommand::SetGroup, {"Group"}),
      MethodEntry(5, "SetDataPath", &APICommand::SetDataPath, {"Path"}),
      MethodEntry(6, "ConnectToServer", &APICommand::ConnectToServer, {"ServerName"}),
      MethodEntry(7, "DisconnectFromServer", &APICommand::DisconnectFromServer, {}),
      MethodEntry(8, "SetProcessRights", &APICommand::SetProcessRights, {}),
      MethodEntry(9, "GetErrorNumber", &APICommand::GetErrorNumber, {"pVal"}),
      MethodEntry(10, "GetErrorMsg", &APICommand::GetErrorMsg, {"pVal"}),
      MethodEntry(11, "GetProgress", &APICommand::GetProgress, {"pVal"}),
      MethodEntry(12, "GetFindexInfo", &APICommand::GetFindexInfo, {"InfoType", "pVal"}),
      MethodEntry(13, "GetOrderInfo", &APICommand::GetOrderInfo, {"InfoType", "pVal"}),
      MethodEntry(14, "DropFindex", &APICommand::DropFindex, {"FindexName"}),
      MethodEntry(15, "FindexExist", &APICommand::FindexExist, {"FindexName", "Group", "pVal"}),
      MethodEntry(16, "TestDBConnection", &APICommand::TestDBConnection, {"pVal"}),
      MethodEntry(17, "DropOrder", &APICommand::DropOrder, {"OrderName"}),
      MethodEntry(18, "CreateFindex", &APICommand::CreateFindex, {"IndexName", "SQLSelect", "IndexColumns", "KeyColumn"}),
      MethodEntry(19, "CreateFindexEx", &APICommand::CreateFindexEx, {"IndexName", "SQLSelect", "IndexColumns", "KeyColumn", "Blocking", "DateTimeUpdateKey"}),
      MethodEntry(20, "CreateOrder", &APICommand::CreateOrder, {"OrderName", "SQLSelect", "OrderColumns", "KeyColumn"}),
      MethodEntry(21, "CreateOrderEx", &APICommand::CreateOrderEx, {"OrderName", "SQLSelect", "OrderColumns", "KeyColumn", "Blocking", "DateTimeUpdateKey"}),
      MethodEntry(22, "SetDBConnectionString", &APICommand::SetDBConnectionString, {"DBConnectionString"}),
      MethodEntry(23, "SetDBConnectionStringEx", &APICommand::SetDBConnectionStringEx, {"DBConnectionString", "DBDisplayName"}),
      MethodEntry(24, "GetVersion", &APICommand::GetVersion, {"pVal"}),
      MethodEntry(25, "SystemOverwrite", &APICommand::SystemOverwrite, {"SystemCode"}),
      MethodEntry(26, "PushIndex", &APICommand::PushIndex, {"IndexName"}),
      MethodEntry(27, "PushOrder", &APICommand::PushOrder, {"OrderName"}),
      MethodEntry(28, "SetIndexLanguageOptions", &APICommand::SetIndexLanguageOptions, {"Language", "UseStemming", "UsePhonetics", "UseStopWords", "StripAccents", "UseCharacterTranslation"}),
      MethodEntry(29, "SetIndexGeneralOptions", &APICommand::SetIndexGeneralOptions, {"SupportScore", "SupportPhrases", "RemoveHtml", "Separators", "AddDefaultSeparators", "SaveDatabaseConnection"}),
      MethodEntry(30, "SetIndexGeneralOptionsEx", &APICommand::SetIndexGeneralOptionsEx, {"SupportScore", "SupportPhrases", "RemoveHtml", "Separators", "AddDefaultSeparators", "SaveDatabaseConnection", "IndexMaxSize", "IndexStartValue"}),
      MethodEntry(31, "SetIndexUpdateOptions", &APICommand::SetIndexUpdateOptions, {"UpdateSupport", "UseDateTimeUpdateKey", "UseDateTimeFraction"}),
      MethodEntry(32, "SetOrderGeneralOptions", &APICommand::SetOrderGeneralOptions, {"SaveDatabaseConnection", "IgnoreCase", "IgnoreCharacters"}),
      MethodEntry(33, "SetOrderUpdateOptions", &APICommand::SetOrderUpdateOptions, {"UpdateSupport", "UseDateTimeUpdateKey", "UseDateTimeFraction"}),
      MethodEntry(34, "GetIndexLanguageOption", &APICommand::GetIndexLanguageOption, {"Option", "GetDefaultValue", "pVal"}),
      MethodEntry(35, "GetIndexGeneralOption", &APICommand::GetIndexGeneralOption, {"Option", "GetDefaultValue", "pVal"}),
      MethodEntry(36, "GetIndexUpdateOption", &APICommand::GetIndexUpdateOption, {"Option", "GetDefaultValue", "pVal"}),
      MethodEntry(37, "GetOrderGeneralOption", &APICommand::GetOrderGeneralOption, {"Option", "GetDefaultValue", "pVal"}),
      MethodEntry(38, "GetOrderUpdateOption", &APICommand::GetOrderUpdateOption, {"Option", "GetDefaultValue", "pVal"}),
      MethodEntry(39, "LoadDefaultOrderOptions", &APICommand::LoadDefaultOrderOptions, {}),
      MethodEntry(40, "SaveDefaultOrderOptions", &APICommand::SaveDefaultOrderOptions, {}),
      MethodEntry(41, "LoadDefaultIndexOptions", &APICommand::LoadDefaultIndexOptions, {}),
      MethodEntry(42, "SaveDefaultIndexOptions", &APICommand::SaveDefaultIndexOptions, {}),
      MethodEntry(43, "SetCurrentObjectName", &APICommand::SetCurrentObjectName, {"ObjectName"}),
  });
  return table;
}

const DispatchTable& APISearchDispatch() {
  static const DispatchTable table("QuillmereAPI.APISearch.1", "IAPISearch", {
      MethodEntry(1, "Execute", &APISearch::Execute, {"SqlStatement"}),
      MethodEntry(2, "ExecuteEx", &APISearch::ExecuteEx, {"SqlStatement", "AddNewResultSet"}),
      MethodEntry(3, "GetSql", &APISearch::GetSql, {"Start", "Count", "pVal"}),
      MethodEntry(4, "GetVersion", &APISearch::GetVersion, {"pVal"}),
      MethodEntry(5, "GetTotal", &APISearch::GetTotal, {"pVal"}),
      MethodEntry(6, "GetNum", &APISearch::GetNum, {"pVal"}),
      MethodEntry(7, "Close", &APISearch::Close, {}),
      MethodEntry(8, "GetTruncInfo", &APISearch::GetTruncInfo, {"pVal"}),
      MethodEntry(9, "MoveNext", &APISearch::MoveNext, {}),
      MethodEntry(10, "MovePrev", &APISearch::MovePrev, {}),
      MethodEntry(11, "GetCount", &APISearch::GetCount, {"ColumnName", "pVal"}),
      MethodEntry(12, "GetValue", &APISearch::GetValue, {"ColumnName", "pVal"}),
      MethodEntry(13, "SetGroup", &APISearch::SetGroup, {"GroupName"}),
      MethodEntry(14, "SetDataPath", &APISearch::SetDataPath, {"Path"}),
      MethodEntry(15, "GetGroupString", &APISearch::GetGroupString, {"ColumnName", "pVal"}),
      MethodEntry(16, "OrderBy", &APISearch::OrderBy, {"ColumnNames"}),
      MethodEntry(17, "OrderByEx", &APISearch::OrderByEx, {"ColumnNames", "AddOrderClause"}),
      MethodEntry(18, "CollectGroups", &APISearch::CollectGroups, {}),
      MethodEntry(19, "IsEOB", &APISearch::IsEOB, {"pVal"}),
      MethodEntry(20, "GetRawKeyString", &APISearch::GetRawKeyString, {"Start", "Count", "pVal"}),
      MethodEntry(21, "GetRawKeyStringEx", &APISearch::GetRawKeyStringEx, {"Start", "Count", "CmdNumber", "pVal"}),
      MethodEntry(22, "ConnectToServer", &APISearch::ConnectToServer, {"ServerName"}),
      MethodEntry(23, "DisconnectFromServer", &APISearch::DisconnectFromServer, {}),
      MethodEntry(24, "SetLimits", &APISearch::SetLimits, {"Start", "Count"}),
      MethodEntry(25, "GetTotalGroups", &APISearch::GetTotalGroups, {"pVal"}),
      MethodEntry(26, "GetNumGroups", &APISearch::GetNumGroups, {"pVal"}),
      MethodEntry(27, "GetGroupSql", &APISearch::GetGroupSql, {"Start", "Count", "ColumnName", "pVal"}),
      MethodEntry(28, "GetFindexWords", &APISearch::GetFindexWords, {"FindexName", "Start", "Count", "pVal"}),
      MethodEntry(29, "GetFindexWordsEx", &APISearch::GetFindexWordsEx, {"FindexName", "Start", "Count", "Filter", "Separator", "pVal"}),
      MethodEntry(30, "GetTotalWords", &APISearch::GetTotalWords, {"pVal"}),
      MethodEntry(31, "GetNumWords", &APISearch::GetNumWords, {"pVal"}),
      MethodEntry(32, "ValidateStatement", &APISearch::ValidateStatement, {"SqlStatement", "pVal"}),
      MethodEntry(33, "GetMaxScore", &APISearch::GetMaxScore, {"pVal"}),
      MethodEntry(34, "AdjustScore", &APISearch::AdjustScore, {"StartValue", "StepValue"}),
      MethodEntry(35, "AdjustScoreEx", &APISearch::AdjustScoreEx, {"StartValue", "StepValue", "AdjustmentType", "StopCount", "StopAtZero"}),
      MethodEntry(36, "SetCacheSize", &APISearch::SetCacheSize, {"CacheSize"}),
      MethodEntry(37, "IsTruncated", &APISearch::IsTruncated, {"pVal"}),
      MethodEntry(38, "GetRawKeyFile", &APISearch::GetRawKeyFile, {"Start", "Count", "pVal"}),
      MethodEntry(39, "GetRawKeyFileEx", &APISearch::GetRawKeyFileEx, {"Start", "Count", "CmdNumber", "pVal"}),
      MethodEntry(40, "SetNumericOption", &APISearch::SetNumericOption, {"Name", "Value"}),
      MethodEntry(41, "GetSqlOrderString", &APISearch::GetSqlOrderString, {"pVal"}),
      MethodEntry(42, "GetSqlKeyName", &APISearch::GetSqlKeyName, {"pVal"}),
      MethodEntry(43, "NetworkStartup", &APISearch::NetworkStartup, {}),
      MethodEntry(44, "NetworkCleanup", &APISearch::NetworkCleanup, {}),
  });
  return table;
}

}  // namespace qm
