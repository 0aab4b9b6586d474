// Statements go to the trace log without their secrets: the password of
// CONNECT and every PWD= / Password= value are written as "****".
#pragma once

#include <string>
#include <string_view>

namespace qm {

inline constexpr std::u16string_view kMaskedSecret = u"****";

// The normalised statement with its secrets masked.
std::u16string MaskStatementForTrace(std::u16string_view statement);

// One word of a statement with its PWD= / Password= values masked.
std::u16string MaskWordForTrace(std::u16string_view word);

// A connection string with its PWD= / Password= values masked (up to ";",
// or a whole {...} value).
std::u16string MaskConnectionSecrets(std::u16string_view connection_string);

}  // namespace qm
