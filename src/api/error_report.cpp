#include "api/error_report.h"

#include "base/exception.h"
#include "base/trace.h"

namespace qm {

std::u16string FailureText(const CExceptionBase& error) { return error.GetFullText(100); }

HRESULT ReportErrorText(std::u16string_view text, std::string_view trace_tag,
                        std::u16string_view prog_id) {
  Trace(true, trace_tag, "%S", text);
  ErrorInfo info;
  info.Description = std::u16string(text);
  info.Source = std::u16string(prog_id);
  SetErrorInfo(info);
  return DISP_E_EXCEPTION;
}

}  // namespace qm
