#include "api/api_arguments.h"

#include "platform/text_encoding.h"
#include "base/exception_family.h"

namespace qm {

std::string NarrowArgument(const BSTR* text) {
  return text == nullptr ? std::string() : Utf16ToUtf8(*text);
}

std::u16string WideArgument(const BSTR* text) { return text == nullptr ? std::u16string() : *text; }

std::optional<std::u16string> OptionalArgument(const BSTR* text) {
  if (text == nullptr) return std::nullopt;
  return *text;
}

void RaiseNullResult(const char* method) {
  throw CPiComException::Text("The result argument of %s is a null pointer", method, nullptr,
                              method);
}

}  // namespace qm
