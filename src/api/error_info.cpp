// The calling thread's error information, in place of the component model's.
#include <optional>
#include <utility>

#include "quillmere/automation.h"

namespace qm {

namespace {
thread_local std::optional<ErrorInfo> t_error_info;
}  // namespace

void SetErrorInfo(const ErrorInfo& info) { t_error_info = info; }

bool GetErrorInfo(ErrorInfo& info) {
  if (!t_error_info) return false;
  info = std::move(*t_error_info);
  t_error_info.reset();
  return true;
}

}  // namespace qm
