// The component-model types of the API objects, as this library gives them on
// Linux: result codes, 16-bit booleans, UTF-16 texts and the calling thread's
// error information.
#pragma once

#include <cstdint>
#include <string>

// What libquillmere exports: the API objects, these functions and the C
// interface of quillmere.h; everything else in it is hidden.
#if defined(__GNUC__)
#define QM_API __attribute__((visibility("default")))
#else
#define QM_API
#endif

namespace qm {

// Every API method returns S_OK or DISP_E_EXCEPTION; nothing else, and no C++
// exception, leaves a method.
using HRESULT = int32_t;
inline constexpr HRESULT S_OK = 0;
inline constexpr HRESULT DISP_E_EXCEPTION = static_cast<HRESULT>(0x80020009u);

// -1 is true, 0 false. Which other values count as true is said per method.
using VARIANT_BOOL = int16_t;
inline constexpr VARIANT_BOOL VARIANT_TRUE = -1;
inline constexpr VARIANT_BOOL VARIANT_FALSE = 0;

// A text argument or result, UTF-16. Text arguments are passed as
// const BSTR*: a null pointer is the null text of the component model. It
// counts as an empty text everywhere, except where a method says that a null
// text leaves a setting unchanged. Results are written to a BSTR the caller
// owns; a failing method leaves its result untouched.
using BSTR = std::u16string;

// The error information a failing method leaves for its thread.
struct ErrorInfo {
  std::u16string Description;  // the failure as text, causes on the lines below
  std::u16string Source;       // the ProgID of the reporting class
  std::u16string HelpFile;     // always empty
  uint32_t HelpContext = 0;    // always 0
  // The interface identifier is the null identifier and is not kept.
};

// Installs info as the calling thread's error information, replacing any.
QM_API void SetErrorInfo(const ErrorInfo& info);
// Takes the calling thread's error information: false when there is none. The
// thread has none afterwards.
QM_API bool GetErrorInfo(ErrorInfo& info);

}  // namespace qm
