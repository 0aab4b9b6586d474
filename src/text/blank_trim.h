// Trims of the blanks space, line feed, carriage return and tab.
#pragma once

#include <string>
#include <string_view>

namespace qm {

inline constexpr std::size_t kMaxTrimLength = 1999;

// Remove leading (TrimLeftW) or trailing (TrimRightW) blanks in place; a text
// of more than 1999 characters raises the StringFuncU error "String too long".
void TrimLeftW(std::u16string& text);
void TrimRightW(std::u16string& text);

// The view without blanks at either end; no length limit, never throws.
std::u16string_view TrimBlanks(std::u16string_view text);

}  // namespace qm
