// The first two steps of reading a command statement: normalisation around
// equals signs and splitting into words.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

// Joins "NAME = VALUE" into "NAME=VALUE": blanks before and after every "="
// outside quotes are removed. Single quotes protect "=" like double quotes do.
// Carriage returns, line feeds and tabs outside quotes become spaces, so a
// statement may span lines; inside quotes every character is kept.
std::u16string NormalizeStatement(std::u16string_view statement);

struct WordSpan {
  std::size_t begin = 0;
  std::size_t end = 0;  // one past the last unit
};

struct StatementSplit {
  std::vector<WordSpan> words;
  // The text ends inside double quotes; the last span runs to the end.
  bool unterminated_quote = false;
};

// Cuts a statement into words at blanks outside double quotes. Double quotes
// stay part of their word ("" inside quotes does not end them). Never fails.
StatementSplit SplitStatement(std::u16string_view statement);

}  // namespace qm
