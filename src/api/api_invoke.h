// How an API object runs the body of a method: S_OK when it ends, else the
// failure reported through the object's ReportError (the exception family's
// chain, or the fatal-error text for anything else). No exception leaves.
#pragma once

#include <string>

#include "base/exception.h"
#include "quillmere/automation.h"

namespace qm {

inline constexpr const char16_t* kFatalErrorText = u"Fatal error. This error is unrecoverable";

template <class Object, class Body>
HRESULT InvokeMethod(Object& object, Body&& body) {
  try {
    try {
      body();
      return S_OK;
    } catch (const CExceptionBase& e) {
      return object.ReportError(e);
    } catch (...) {
      return object.ReportError(std::u16string(kFatalErrorText));
    }
  } catch (...) {
    // Reporting itself failed (no memory left for the text).
    return DISP_E_EXCEPTION;
  }
}

}  // namespace qm
