// How the API objects take their arguments: texts to narrow (UTF-8) text,
// VARIANT_BOOL to bool, and results back to UTF-16.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "quillmere/automation.h"

namespace qm {

// A null text becomes an empty one.
std::string NarrowArgument(const BSTR* text);
std::u16string WideArgument(const BSTR* text);
// A null text is absent.
std::optional<std::u16string> OptionalArgument(const BSTR* text);

// Execute and ExecuteEx: blocking only for VARIANT_TRUE (-1).
inline bool IsVariantTrue(VARIANT_BOOL value) { return value == VARIANT_TRUE; }
// Every other method: any non-zero value is true.
inline bool IsNonZero(VARIANT_BOOL value) { return value != 0; }
inline VARIANT_BOOL ToVariantBool(bool value) { return value ? VARIANT_TRUE : VARIANT_FALSE; }

// The result of a method; raises PiCom "The result argument of %s is a null
// pointer" naming method when result is null.
template <class T>
T& ResultArgument(T* result, const char* method);
[[noreturn]] void RaiseNullResult(const char* method);

template <class T>
T& ResultArgument(T* result, const char* method) {
  if (result == nullptr) RaiseNullResult(method);
  return *result;
}

}  // namespace qm
