// The text-level steps of parsing a search condition: masking of phrases and
// parentheses, the comparison operator of a condition, the phrase rewrite of
// text values, and the operator that splits an expression. Failures are
// CGiCmdTreeException text errors naming the step.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "text/blank_trim.h"

namespace qm {

class CSeparatorSet;

// Blanks, tabs, carriage returns and line feeds: what TrimBlanks removes.
inline constexpr std::u16string_view kGiBlanks = u" \t\r\n";

// The text with every parenthesis, everything inside parentheses and every
// quoted phrase (quotes included) replaced by 'x', so operators there are not
// seen. Also checks that phrases and parentheses are closed.
std::u16string HideExpW(std::u16string_view text);

// Removes parentheses that enclose the whole text, repeatedly, trimming
// blanks inside. Leaves "(a) OR (b)" alone.
std::u16string RemoveParenthesesW(std::u16string_view text);

struct GiComparison {
  std::size_t position = 0;  // of the first character of the operator
  std::size_t length = 0;    // operator plus modifier run
  int32_t flags = 0;
  int32_t modifier = -1;
};
// The comparison of a condition, found in its masked text.
GiComparison GetEQW(std::u16string_view masked);

// Phrases of a text value become adjacencies of quoted words: 'RED WINE'
// gives 'RED' ## 'WINE'. Outside phrases only blanks, digits and '-' may stand.
std::u16string ReplacePhraseBlankW(std::u16string_view value, const CSeparatorSet& separators);

// Whether value[i] separates words: "#", "*" and "?" are wildcards unless a
// backslash stands before them.
bool IsValueSeparatorAt(std::u16string_view value, std::size_t i,
                        const CSeparatorSet& separators);

struct GiSplit {
  int32_t code = 5;  // kGiOpNone: no operator
  std::u16string left;
  std::u16string right;
};
// The operator of an expression (trimmed, outer parentheses removed) and its
// operands. A negation has only a right operand.
GiSplit FindOperatorW(std::u16string_view text);

// Strips one pair of enclosing single quotes.
std::u16string_view StripQuotes(std::u16string_view text);
// Replaces every doubled single quote by one.
std::u16string UndoubleQuotes(std::u16string_view text);

}  // namespace qm
