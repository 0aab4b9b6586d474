#include "search/word_search.h"

#include "platform/text_encoding.h"

namespace qm {

namespace {

// Sorts after every word that starts with a prefix (the wide findexes hold
// no code unit above it in practice; the scans stop by the prefix anyway).
constexpr char16_t kAfterPrefix = 65000;

CValue TextValue(std::u16string_view text, int32_t findex_type) {
  CValue value;
  if (findex_type == static_cast<int32_t>(VALUE_TYPE::UnicodeString)) {
    value.SetTextW(text);
  } else {
    value.SetText(Utf16ToUtf8(text));
  }
  return value;
}

}  // namespace

CWordSearch CWordSearch::ForText(std::u16string_view word, int32_t findex_type) {
  CWordSearch search;
  search.word = std::u16string(word);
  search.pattern = CWordPattern(word);
  search.exact = !search.pattern.HasWildcards();
  if (search.exact) {
    search.low = TextValue(search.pattern.Literal(), findex_type);
    search.high = search.low;
  } else {
    search.low = TextValue(search.pattern.LiteralPrefix(), findex_type);
    search.high = TextValue(search.pattern.LiteralPrefix() + kAfterPrefix, findex_type);
  }
  return search;
}

}  // namespace qm
