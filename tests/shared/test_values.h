// Typed values for the block and header tests, one maker per type.
#pragma once

#include <string_view>

#include "shared/value.h"

namespace qm::test {

inline CValue Value(std::string_view s) { CValue v; v.SetText(s); return v; }
inline CValue Value(std::u16string_view s) { CValue v; v.SetTextW(s); return v; }
inline CValue Value(int32_t i) { CValue v; v.SetInteger(i); return v; }
inline CValue Value(double d) { CValue v; v.SetDouble(d); return v; }
inline CValue Value(const DateTimeValue& d) { CValue v; v.SetDateTime(d); return v; }

}  // namespace qm::test
