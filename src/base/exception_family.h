// Every module's exception class, and its unknown-exception class where the
// module has one, plus Guard(): the wrap-and-rethrow rule at module boundaries.
#pragma once

#include <string>
#include <string_view>
#include <type_traits>

#include "base/exception.h"

namespace qm {

namespace detail {
inline constexpr std::string_view kEngineTraceModules = "SHARELIB,PILIB,GILIB,FILIB";
inline constexpr std::string_view kConverterTraceModules = "SHARELIB,PILIB,GILIB,FILIB,REPLIB";
}  // namespace detail

#define QM_EXCEPTION_MODULE(Name, Text, TraceModules)                            \
  struct Name##Module {                                                          \
    static constexpr std::string_view kName = Text;                              \
    static std::string UnknownTraceTag() {                                       \
      return std::string(TraceModules) + "." + std::string(kName) + "UnknownException"; \
    }                                                                            \
  };                                                                             \
  using C##Name##Exception = CModuleException<Name##Module>;

#define QM_EXCEPTION_MODULE_WITH_UNKNOWN(Name, Text, TraceModules) \
  QM_EXCEPTION_MODULE(Name, Text, TraceModules)                    \
  using C##Name##UnknownException = CModuleUnknownException<Name##Module>;

QM_EXCEPTION_MODULE_WITH_UNKNOWN(Stream, "Stream", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(ECComClient, "ECComClient", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(SyncServers, "SyncServers", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(PiStartPoint, "PiStartPoint", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(PiCmd, "PiCmd", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(HighStructures, "HighStructures", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(PiFIndex, "PiFIndex", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(PiOrder, "PiOrder", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(WinFile, "WinFile", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(PiDelete, "PiDelete", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(PiSort, "PiSort", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(PiOrderSort, "PiOrderSort", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(Value, "Value", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(STDFUN, "STDFUN", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(Collection, "Collection", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(ShareDatabase, "ShareDatabase", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(StringFuncU, "StringFuncU", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(BFile, "BFile", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(MFile, "MFile", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(FreeItem, "FreeItem", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE(Block, "Block", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(GiStartPoint, "GiStartPoint", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(GiCmdTree, "GiCmdTree", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(GiFIndex, "GiFIndex", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(GiRepository, "GiRepository", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(GiOrder, "GiOrder", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(ShareRepository, "ShareRepository", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(ShareCollector, "ShareCollector", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(ShareDefinition, "ShareDefinition", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(Language, "Language", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(DocConverter, "DocConverter", detail::kConverterTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(ComConverter, "ComConverter", detail::kEngineTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(Connection, "Connection", detail::kConverterTraceModules)
QM_EXCEPTION_MODULE_WITH_UNKNOWN(Converter, "Converter", detail::kConverterTraceModules)
QM_EXCEPTION_MODULE(LockManager, "LockManager", detail::kEngineTraceModules)
// The API objects: argument and remote-access failures.
QM_EXCEPTION_MODULE(PiCom, "PiCom", detail::kEngineTraceModules)

// The result-set module writes its unknown-exception line under a tag of its own.
struct GiTreeRowsetModule {
  static constexpr std::string_view kName = "GiTreeRowset";
  static std::string UnknownTraceTag() { return "SHARELIB,PILIB,GILIB,FILIB.GiTreeRowset"; }
};
using CGiTreeRowsetException = CModuleException<GiTreeRowsetModule>;
using CGiTreeRowsetUnknownException = CModuleUnknownException<GiTreeRowsetModule>;

// A data-source warning (an empty result, say) rather than an error.
class CShareDatabaseWarning : public CException {
 public:
  template <class... A>
  static CShareDatabaseWarning Text(std::string_view text, const char* method,
                                    const CExceptionBase* inner, const A&... args) {
    CShareDatabaseWarning w;
    w.BuildText(ShareDatabaseModule::kName, WidenMessage(text), method, inner,
                {FormatArg(args)...});
    return w;
  }
};

#undef QM_EXCEPTION_MODULE_WITH_UNKNOWN
#undef QM_EXCEPTION_MODULE

// Runs body under the module-boundary rule: the module's own exceptions pass on
// unchanged; any other exception of the family becomes the module's general
// error naming `method`, with the cause chained; anything else becomes the
// module's unknown exception, or passes on unchanged if the module has none.
template <class Own, class OwnUnknown = void, class Body>
decltype(auto) Guard(const char* method, Body&& body) {
  try {
    return body();
  } catch (const Own&) {
    throw;
  } catch (const CException& e) {
    throw Own::General(method, &e);
  } catch (...) {
    if constexpr (std::is_void_v<OwnUnknown>) {
      throw;
    } else {
      try {
        throw;
      } catch (const OwnUnknown&) {
        throw;
      } catch (...) {
        throw OwnUnknown::Unknown(method);
      }
    }
  }
}

}  // namespace qm
