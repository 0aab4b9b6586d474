#include "quillmere/api_command.h"

#include <utility>

#include "api/api_arguments.h"
#include "api/api_invoke.h"
#include "api/component_load.h"
#include "api/error_report.h"
#include "command/pi_start_point.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "config/global_defs.h"

namespace qm {

namespace {

constexpr std::string_view kTraceTag = "APICommand";

// Remote servers (and the synchronisation servers) come with remote access;
// until then these calls fail and the object stays unconnected, so every
// other call keeps working locally.
[[noreturn]] void NoRemoteServers(std::string_view what, const char* method,
                                  const BSTR* name = nullptr) {
  throw CPiComException::Text(
      "Remote Quillmere Search servers are not available in this build: %s%S", method, nullptr,
      what, WideArgument(name));
}

}  // namespace

struct APICommand::Engine {
  CPiStartPoint engine;
};

APICommand::APICommand() {
  EnsureComponentLoaded();
  engine_ = std::make_unique<Engine>();
}

APICommand::~APICommand() = default;

template <class Body>
HRESULT APICommand::Invoke(Body&& body) {
  return InvokeMethod(*this, std::forward<Body>(body));
}

HRESULT APICommand::ReportError(const CExceptionBase& error) {
  return ReportError(FailureText(error));
}

HRESULT APICommand::ReportError(const std::u16string& text) {
  return ReportErrorText(text, kTraceTag, kProgId);
}

// --- 1-11 ---

HRESULT APICommand::Execute(const BSTR* Sql) { return ExecuteEx(Sql, 1); }

HRESULT APICommand::ExecuteEx(const BSTR* Sql, VARIANT_BOOL Blocking) {
  return Invoke([&] { engine_->engine.ExecuteW(WideArgument(Sql), IsVariantTrue(Blocking)); });
}

HRESULT APICommand::ConnectToDatabase(const BSTR* Dsn, const BSTR* Uid, const BSTR* Pwd) {
  return Invoke([&] {
    engine_->engine.ConnectToDatabase(NarrowArgument(Dsn), NarrowArgument(Uid),
                                      NarrowArgument(Pwd));
  });
}

HRESULT APICommand::SetGroup(const BSTR* Group) {
  return Invoke([&] { engine_->engine.SetGroup(NarrowArgument(Group)); });
}

HRESULT APICommand::SetDataPath(const BSTR* Path) {
  return Invoke([&] { engine_->engine.SetDataPath(NarrowArgument(Path)); });
}

HRESULT APICommand::ConnectToServer(const BSTR* ServerName) {
  return Invoke([&] { NoRemoteServers("cannot connect to ", "ConnectToServer", ServerName); });
}

HRESULT APICommand::DisconnectFromServer() {
  return Invoke(
      [&] { NoRemoteServers("there is no server connection to close", "DisconnectFromServer"); });
}

HRESULT APICommand::SetProcessRights() {
  // No impersonation exists to end on this platform.
  return S_OK;
}

HRESULT APICommand::GetErrorNumber(int32_t* pVal) {
  return Invoke([&] {
    int32_t& result = ResultArgument(pVal, "GetErrorNumber");
    result = engine_->engine.GetErrorNumber();
  });
}

HRESULT APICommand::GetErrorMsg(BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetErrorMsg");
    result = engine_->engine.TakeErrorMsg();
  });
}

HRESULT APICommand::GetProgress(int32_t* pVal) {
  return Invoke([&] {
    int32_t& result = ResultArgument(pVal, "GetProgress");
    result = engine_->engine.GetProgress();
  });
}

// --- 12-17 ---

HRESULT APICommand::GetFindexInfo(int32_t InfoType, BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetFindexInfo");
    result = Utf8ToUtf16(engine_->engine.GetFindexInfo(InfoType));
  });
}

HRESULT APICommand::GetOrderInfo(int32_t InfoType, BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetOrderInfo");
    result = Utf8ToUtf16(engine_->engine.GetOrderInfo(InfoType));
  });
}

HRESULT APICommand::DropFindex(const BSTR* FindexName) {
  return Invoke([&] { engine_->engine.DropFindexW(WideArgument(FindexName)); });
}

HRESULT APICommand::FindexExist(const BSTR* FindexName, const BSTR* Group, VARIANT_BOOL* pVal) {
  return Invoke([&] {
    VARIANT_BOOL& result = ResultArgument(pVal, "FindexExist");
    result = ToVariantBool(
        engine_->engine.FindexExist(NarrowArgument(FindexName), NarrowArgument(Group)));
  });
}

HRESULT APICommand::TestDBConnection(VARIANT_BOOL* pVal) {
  return Invoke([&] {
    VARIANT_BOOL& result = ResultArgument(pVal, "TestDBConnection");
    result = ToVariantBool(engine_->engine.TestDBConnection() == 0);
  });
}

HRESULT APICommand::DropOrder(const BSTR* OrderName) {
  return Invoke([&] { engine_->engine.DropOrderW(WideArgument(OrderName)); });
}

// --- 18-27 ---

HRESULT APICommand::CreateFindex(const BSTR* IndexName, const BSTR* SQLSelect,
                                 const BSTR* IndexColumns, const BSTR* KeyColumn) {
  return CreateFindexEx(IndexName, SQLSelect, IndexColumns, KeyColumn, 1, nullptr);
}

HRESULT APICommand::CreateFindexEx(const BSTR* IndexName, const BSTR* SQLSelect,
                                   const BSTR* IndexColumns, const BSTR* KeyColumn,
                                   VARIANT_BOOL Blocking, const BSTR* DateTimeUpdateKey) {
  return Invoke([&] {
    engine_->engine.CreateFindex(NarrowArgument(IndexName), NarrowArgument(SQLSelect),
                                 NarrowArgument(IndexColumns), NarrowArgument(KeyColumn),
                                 IsNonZero(Blocking), NarrowArgument(DateTimeUpdateKey));
  });
}

HRESULT APICommand::CreateOrder(const BSTR* OrderName, const BSTR* SQLSelect,
                                const BSTR* OrderColumns, const BSTR* KeyColumn) {
  return CreateOrderEx(OrderName, SQLSelect, OrderColumns, KeyColumn, 1, nullptr);
}

HRESULT APICommand::CreateOrderEx(const BSTR* OrderName, const BSTR* SQLSelect,
                                  const BSTR* OrderColumns, const BSTR* KeyColumn,
                                  VARIANT_BOOL Blocking, const BSTR* DateTimeUpdateKey) {
  return Invoke([&] {
    engine_->engine.CreateOrder(NarrowArgument(OrderName), NarrowArgument(SQLSelect),
                                NarrowArgument(OrderColumns), NarrowArgument(KeyColumn),
                                IsNonZero(Blocking), NarrowArgument(DateTimeUpdateKey));
  });
}

HRESULT APICommand::SetDBConnectionString(const BSTR* DBConnectionString) {
  return SetDBConnectionStringEx(DBConnectionString, nullptr);
}

HRESULT APICommand::SetDBConnectionStringEx(const BSTR* DBConnectionString,
                                            const BSTR* DBDisplayName) {
  return Invoke([&] {
    engine_->engine.SetDBConnectionString(NarrowArgument(DBConnectionString),
                                          NarrowArgument(DBDisplayName));
  });
}

HRESULT APICommand::GetVersion(BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetVersion");
    result = Utf8ToUtf16(CGlobalDefs::kVersionText);
  });
}

HRESULT APICommand::SystemOverwrite(const BSTR* /*SystemCode*/) { return S_OK; }

HRESULT APICommand::PushIndex(const BSTR* IndexName) {
  return Invoke([&] {
    NoRemoteServers("cannot push to the synchronisation servers the findex ", "PushIndex",
                    IndexName);
  });
}

HRESULT APICommand::PushOrder(const BSTR* OrderName) {
  return Invoke([&] {
    NoRemoteServers("cannot push to the synchronisation servers the order ", "PushOrder",
                    OrderName);
  });
}

// --- 28-43 ---

HRESULT APICommand::SetIndexLanguageOptions(int32_t Language, VARIANT_BOOL UseStemming,
                                            VARIANT_BOOL UsePhonetics, VARIANT_BOOL UseStopWords,
                                            VARIANT_BOOL StripAccents,
                                            VARIANT_BOOL UseCharacterTranslation) {
  return Invoke([&] {
    engine_->engine.SetIndexLanguageOptions(
        Language, IsNonZero(UseStemming), IsNonZero(UsePhonetics), IsNonZero(UseStopWords),
        IsNonZero(StripAccents), IsNonZero(UseCharacterTranslation));
  });
}

HRESULT APICommand::SetIndexGeneralOptions(VARIANT_BOOL SupportScore, VARIANT_BOOL SupportPhrases,
                                           VARIANT_BOOL RemoveHtml, const BSTR* Separators,
                                           VARIANT_BOOL AddDefaultSeparators,
                                           VARIANT_BOOL SaveDatabaseConnection) {
  return SetIndexGeneralOptionsEx(SupportScore, SupportPhrases, RemoveHtml, Separators,
                                  AddDefaultSeparators, SaveDatabaseConnection, 0, 0);
}

HRESULT APICommand::SetIndexGeneralOptionsEx(VARIANT_BOOL SupportScore, VARIANT_BOOL SupportPhrases,
                                             VARIANT_BOOL RemoveHtml, const BSTR* Separators,
                                             VARIANT_BOOL AddDefaultSeparators,
                                             VARIANT_BOOL SaveDatabaseConnection,
                                             int32_t IndexMaxSize, int32_t IndexStartValue) {
  return Invoke([&] {
    engine_->engine.SetIndexGeneralOptions(
        IsNonZero(SupportScore), IsNonZero(SupportPhrases), IsNonZero(RemoveHtml),
        OptionalArgument(Separators), IsNonZero(AddDefaultSeparators),
        IsNonZero(SaveDatabaseConnection), IndexMaxSize, IndexStartValue);
  });
}

HRESULT APICommand::SetIndexUpdateOptions(int32_t UpdateSupport, VARIANT_BOOL UseDateTimeUpdateKey,
                                          VARIANT_BOOL UseDateTimeFraction) {
  return Invoke([&] {
    engine_->engine.SetIndexUpdateOptions(UpdateSupport, IsNonZero(UseDateTimeUpdateKey),
                                          IsNonZero(UseDateTimeFraction));
  });
}

HRESULT APICommand::SetOrderGeneralOptions(VARIANT_BOOL SaveDatabaseConnection,
                                           VARIANT_BOOL IgnoreCase, const BSTR* IgnoreCharacters) {
  return Invoke([&] {
    engine_->engine.SetOrderGeneralOptions(IsNonZero(SaveDatabaseConnection), IsNonZero(IgnoreCase),
                                           OptionalArgument(IgnoreCharacters));
  });
}

HRESULT APICommand::SetOrderUpdateOptions(int32_t UpdateSupport, VARIANT_BOOL UseDateTimeUpdateKey,
                                          VARIANT_BOOL UseDateTimeFraction) {
  return Invoke([&] {
    engine_->engine.SetOrderUpdateOptions(UpdateSupport, IsNonZero(UseDateTimeUpdateKey),
                                          IsNonZero(UseDateTimeFraction));
  });
}

HRESULT APICommand::GetIndexLanguageOption(int32_t Option, VARIANT_BOOL GetDefaultValue,
                                           BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetIndexLanguageOption");
    result =
        Utf8ToUtf16(engine_->engine.GetIndexLanguageOption(Option, IsNonZero(GetDefaultValue)));
  });
}

HRESULT APICommand::GetIndexGeneralOption(int32_t Option, VARIANT_BOOL GetDefaultValue,
                                          BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetIndexGeneralOption");
    result = Utf8ToUtf16(engine_->engine.GetIndexGeneralOption(Option, IsNonZero(GetDefaultValue)));
  });
}

HRESULT APICommand::GetIndexUpdateOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetIndexUpdateOption");
    result = Utf8ToUtf16(engine_->engine.GetIndexUpdateOption(Option, IsNonZero(GetDefaultValue)));
  });
}

HRESULT APICommand::GetOrderGeneralOption(int32_t Option, VARIANT_BOOL GetDefaultValue,
                                          BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetOrderGeneralOption");
    result = Utf8ToUtf16(engine_->engine.GetOrderGeneralOption(Option, IsNonZero(GetDefaultValue)));
  });
}

HRESULT APICommand::GetOrderUpdateOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal) {
  return Invoke([&] {
    BSTR& result = ResultArgument(pVal, "GetOrderUpdateOption");
    result = Utf8ToUtf16(engine_->engine.GetOrderUpdateOption(Option, IsNonZero(GetDefaultValue)));
  });
}

HRESULT APICommand::LoadDefaultOrderOptions() {
  return Invoke([&] { engine_->engine.LoadDefaultOrderOptions(); });
}

HRESULT APICommand::SaveDefaultOrderOptions() {
  return Invoke([&] { engine_->engine.SaveDefaultOrderOptions(); });
}

HRESULT APICommand::LoadDefaultIndexOptions() {
  return Invoke([&] { engine_->engine.LoadDefaultIndexOptions(); });
}

HRESULT APICommand::SaveDefaultIndexOptions() {
  return Invoke([&] { engine_->engine.SaveDefaultIndexOptions(); });
}

HRESULT APICommand::SetCurrentObjectName(const BSTR* ObjectName) {
  return Invoke([&] { engine_->engine.SetCurrentObjectName(NarrowArgument(ObjectName)); });
}

}  // namespace qm
