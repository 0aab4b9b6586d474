// Double-quote rules shared by the command language's parsers: separators and
// colons inside double quotes do not count, and a quoted value reads "" as ".
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

// Index of the first ch outside double quotes at or after from, or npos.
std::size_t FindOutsideQuotes(std::u16string_view text, char16_t ch, std::size_t from = 0);

// Cuts text at every separator outside double quotes (n separators give n + 1
// pieces). unterminated tells whether the text ends inside double quotes.
std::vector<std::u16string_view> SplitOutsideQuotes(std::u16string_view text,
                                                    char16_t separator, bool& unterminated);

// Removes one enclosing pair of double quotes, inside which two double quotes
// stand for one. Text not enclosed in double quotes is returned as it is.
std::u16string UnquoteValue(std::u16string_view text);

// Removes leading and trailing spaces.
std::u16string_view TrimSpaces(std::u16string_view text);

// True for the blanks that separate words: space, tab, carriage return, line feed.
constexpr bool IsBlank(char16_t c) { return c == u' ' || c == u'\t' || c == u'\r' || c == u'\n'; }

}  // namespace qm
