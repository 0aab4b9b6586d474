// The conversions the column cache makes between value types, and the strict
// number parsers the reader shares with it. Nothing here wraps or guesses: a
// value that does not fit its target is refused.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "base/value.h"

namespace qm {

// out = from as a value of type `to`. A conversion the table does not allow,
// or a value that does not fit, raises the ShareDatabase error "Could not
// convert column value into appropriate type" naming `method`; a text of
// 10,000 units or more between narrow and wide raises the mixed-text error.
// Only the payload of the new type is written into out (its buffers are reused).
void ConvertColumnValue(const CValue& from, VALUE_TYPE to, CValue& out, const char* method);

// Blanks trimmed, an optional sign, then decimal digits only, within range.
bool ParseInteger64(std::string_view text, int64_t& out);
bool ParseInteger32(std::string_view text, int32_t& out);
// Blanks trimmed, an optional sign, a decimal or exponent number (or inf, nan);
// the whole text must be the number and fit a double.
bool ParseDouble(std::string_view text, double& out);
// A finite double within 32 bits after truncation toward zero.
bool DoubleToInteger32(double value, int32_t& out);

// The shortest text that reads back as the same double ("0.1", "1e+10").
std::string DoubleToText(double value);

}  // namespace qm
