// APICommand: the command object ("QuillmereAPI.APICommand.1"), through which a
// host builds, updates, inspects and drops indexes. The 43 methods of
// IAPICommand follow in interface order (dispatch identifiers 1 to 43).
//
// Error model: every method returns S_OK, or DISP_E_EXCEPTION with the failure
// as text in the calling thread's error information (GetErrorInfo); the
// result parameter is then untouched. Background jobs (Execute, ExecuteEx,
// CreateFindexEx and CreateOrderEx without blocking) report their failures
// through GetErrorNumber and GetErrorMsg instead.
//
// VARIANT_BOOL arguments: Execute and ExecuteEx run blocking only for -1;
// every other method takes any non-zero value as true.
//
// Text arguments are const BSTR* (see quillmere/automation.h): a null pointer
// is a null text. Result pointers must not be null.
//
// This build works locally only: ConnectToServer, DisconnectFromServer,
// PushIndex and PushOrder fail with a text saying that remote servers are not
// available in it.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "quillmere/api_enums.h"
#include "quillmere/automation.h"

namespace qm {

class CExceptionBase;

class QM_API APICommand {
 public:
  static constexpr const char16_t* kProgId = u"QuillmereAPI.APICommand.1";

  APICommand();
  // Waits for the object's background jobs to end.
  virtual ~APICommand();
  APICommand(const APICommand&) = delete;
  APICommand& operator=(const APICommand&) = delete;

  // 1-2. Runs a command statement; in the background unless Blocking is -1
  // (Execute passes 1, so it always runs in the background).
  HRESULT Execute(const BSTR* Sql);
  HRESULT ExecuteEx(const BSTR* Sql, VARIANT_BOOL Blocking);
  // 3. Stores the DSN, user and password and tests them.
  HRESULT ConnectToDatabase(const BSTR* Dsn, const BSTR* Uid, const BSTR* Pwd);
  // 4-5.
  HRESULT SetGroup(const BSTR* Group);
  HRESULT SetDataPath(const BSTR* Path);
  // 6-7. Remote servers: not available in this build.
  HRESULT ConnectToServer(const BSTR* ServerName);
  HRESULT DisconnectFromServer();
  // 8. Succeeds without effect.
  HRESULT SetProcessRights();
  // 9-11. The last background job's error flag (0 or 1) and message (the
  // message is cleared once read); the running job's progress, 100 when none.
  HRESULT GetErrorNumber(int32_t* pVal);
  HRESULT GetErrorMsg(BSTR* pVal);
  HRESULT GetProgress(int32_t* pVal);
  // 12-13. Information about the findex or order named by SetCurrentObjectName.
  HRESULT GetFindexInfo(int32_t InfoType, BSTR* pVal);
  HRESULT GetOrderInfo(int32_t InfoType, BSTR* pVal);
  // 14.
  HRESULT DropFindex(const BSTR* FindexName);
  // 15. Sets the group, then tells whether the findex opens in it.
  HRESULT FindexExist(const BSTR* FindexName, const BSTR* Group, VARIANT_BOOL* pVal);
  // 16. VARIANT_TRUE when a connection could be opened.
  HRESULT TestDBConnection(VARIANT_BOOL* pVal);
  // 17.
  HRESULT DropOrder(const BSTR* OrderName);
  // 18-21. A findex (order) from an SQL select used as the table.
  HRESULT CreateFindex(const BSTR* IndexName, const BSTR* SQLSelect, const BSTR* IndexColumns,
                       const BSTR* KeyColumn);
  HRESULT CreateFindexEx(const BSTR* IndexName, const BSTR* SQLSelect, const BSTR* IndexColumns,
                         const BSTR* KeyColumn, VARIANT_BOOL Blocking,
                         const BSTR* DateTimeUpdateKey);
  HRESULT CreateOrder(const BSTR* OrderName, const BSTR* SQLSelect, const BSTR* OrderColumns,
                      const BSTR* KeyColumn);
  HRESULT CreateOrderEx(const BSTR* OrderName, const BSTR* SQLSelect, const BSTR* OrderColumns,
                        const BSTR* KeyColumn, VARIANT_BOOL Blocking,
                        const BSTR* DateTimeUpdateKey);
  // 22-23.
  HRESULT SetDBConnectionString(const BSTR* DBConnectionString);
  HRESULT SetDBConnectionStringEx(const BSTR* DBConnectionString, const BSTR* DBDisplayName);
  // 24. "6.14".
  HRESULT GetVersion(BSTR* pVal);
  // 25. Succeeds without effect.
  HRESULT SystemOverwrite(const BSTR* SystemCode);
  // 26-27. Synchronisation servers: not available in this build.
  HRESULT PushIndex(const BSTR* IndexName);
  HRESULT PushOrder(const BSTR* OrderName);
  // 28-33. The current options. A null Separators or IgnoreCharacters leaves
  // them as they are.
  HRESULT SetIndexLanguageOptions(int32_t Language, VARIANT_BOOL UseStemming,
                                  VARIANT_BOOL UsePhonetics, VARIANT_BOOL UseStopWords,
                                  VARIANT_BOOL StripAccents, VARIANT_BOOL UseCharacterTranslation);
  HRESULT SetIndexGeneralOptions(VARIANT_BOOL SupportScore, VARIANT_BOOL SupportPhrases,
                                 VARIANT_BOOL RemoveHtml, const BSTR* Separators,
                                 VARIANT_BOOL AddDefaultSeparators,
                                 VARIANT_BOOL SaveDatabaseConnection);
  HRESULT SetIndexGeneralOptionsEx(VARIANT_BOOL SupportScore, VARIANT_BOOL SupportPhrases,
                                   VARIANT_BOOL RemoveHtml, const BSTR* Separators,
                                   VARIANT_BOOL AddDefaultSeparators,
                                   VARIANT_BOOL SaveDatabaseConnection, int32_t IndexMaxSize,
                                   int32_t IndexStartValue);
  HRESULT SetIndexUpdateOptions(int32_t UpdateSupport, VARIANT_BOOL UseDateTimeUpdateKey,
                                VARIANT_BOOL UseDateTimeFraction);
  HRESULT SetOrderGeneralOptions(VARIANT_BOOL SaveDatabaseConnection, VARIANT_BOOL IgnoreCase,
                                 const BSTR* IgnoreCharacters);
  HRESULT SetOrderUpdateOptions(int32_t UpdateSupport, VARIANT_BOOL UseDateTimeUpdateKey,
                                VARIANT_BOOL UseDateTimeFraction);
  // 34-38. One option as text: the current one with GetDefaultValue, else the
  // one stored with the findex or order named by SetCurrentObjectName.
  HRESULT GetIndexLanguageOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal);
  HRESULT GetIndexGeneralOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal);
  HRESULT GetIndexUpdateOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal);
  HRESULT GetOrderGeneralOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal);
  HRESULT GetOrderUpdateOption(int32_t Option, VARIANT_BOOL GetDefaultValue, BSTR* pVal);
  // 39-42. The group's saved default options (its Config folder).
  HRESULT LoadDefaultOrderOptions();
  HRESULT SaveDefaultOrderOptions();
  HRESULT LoadDefaultIndexOptions();
  HRESULT SaveDefaultIndexOptions();
  // 43.
  HRESULT SetCurrentObjectName(const BSTR* ObjectName);

  // Trace the text (always written, tag "APICommand"), install it as the
  // thread's error information with this class's ProgID, return
  // DISP_E_EXCEPTION. The exception form reports its message chain.
  virtual HRESULT ReportError(const CExceptionBase& error);
  virtual HRESULT ReportError(const std::u16string& text);

 private:
  struct Engine;
  // Runs body under the object's handlers.
  template <class Body>
  HRESULT Invoke(Body&& body);

  // The server name and connected flag of the remote mode join the engine
  // when remote access is built; every call is local until then.
  std::unique_ptr<Engine> engine_;
};

}  // namespace qm
