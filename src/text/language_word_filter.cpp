#include "text/language_word_filter.h"

#include "text/language.h"

namespace qm {

bool CLanguageWordFilter::IsStopWord(std::u16string_view word) {
  return language_.IsStopWord(word);
}

void CLanguageWordFilter::Normalise(std::u16string_view word, std::u16string& out) {
  language_.Normalise(word, out);
}

}  // namespace qm
