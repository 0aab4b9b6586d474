// CWordSearch: one query word as the lookup takes it, already typed by the
// evaluator for the findex's value type.
//
// low and high bound the values sought, both inclusive: equal for a single
// value (an integer, a double, an exact word), the start and end of a period
// for a date/time. For text the word as written is kept too, as a pattern:
// a word with wildcards is scanned for, and the similarity scan compares the
// word with every word of the findex.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "base/value.h"
#include "search/word_pattern.h"

namespace qm {

struct CWordSearch {
  CValue low;
  CValue high;
  std::u16string word;   // text findexes: the word as written
  CWordPattern pattern;  // text findexes: word as a pattern
  bool exact = true;     // no wildcard: low/high are the value

  // A single value of a numeric or date/time findex, or an exact text value.
  static CWordSearch ForValue(const CValue& value) { return ForRange(value, value); }
  // Every value from low up to high, both included (a date/time's period).
  static CWordSearch ForRange(const CValue& low, const CValue& high) {
    CWordSearch search;
    search.low = low;
    search.high = high;
    return search;
  }
  // A word of a text findex: findex_type 2 (narrow, UTF-8) or 4 (wide). An
  // exact word when it holds no wildcard; otherwise low is its literal prefix.
  static CWordSearch ForText(std::u16string_view word, int32_t findex_type);
};

}  // namespace qm
