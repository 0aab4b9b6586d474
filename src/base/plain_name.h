// Names that reach file and lock names (findexes, orders, object names,
// groups) must be plain names, so no statement or API argument can point a
// file operation outside its folder.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "base/exception.h"

namespace qm {

// A plain name: not empty, at most this many characters, no "/", "\", double
// quote or control character, and neither "." nor "..".
inline constexpr std::size_t kMaxPlainNameLength = 199;

// Empty when name (UTF-8) is plain; otherwise the reason it is not.
std::string_view PlainNameFault(std::string_view name);

inline bool IsPlainName(std::string_view name) { return PlainNameFault(name).empty(); }

// The name as it may be shown in a message: control characters as \xHH (C1
// controls by their code point), cut after 60 characters.
std::string ShowName(std::string_view name);

// Raises Exception's text error "Invalid <what> name "<name>": <reason>"
// naming method when name is not plain.
template <class Exception>
void RequirePlainName(std::string_view what, std::string_view name, const char* method) {
  const std::string_view fault = PlainNameFault(name);
  if (!fault.empty()) {
    throw Exception::Text("Invalid %s name \"%s\": %s", method, nullptr, what, ShowName(name),
                          fault);
  }
}

}  // namespace qm
