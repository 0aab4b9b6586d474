// CLanguageWordFilter: a language object seen as the splitter's word filter,
// so the splitter applies the language steps in their order: the stop-word
// test on the word as cut, then the normalisation of the words that remain.
#pragma once

#include <string>
#include <string_view>

#include "text/word_filter.h"

namespace qm {

class CLanguage;

class CLanguageWordFilter final : public CWordFilter {
 public:
  // language must outlive the filter; it is configured (LoadLanguage) by the caller.
  explicit CLanguageWordFilter(CLanguage& language) : language_(language) {}

  bool IsStopWord(std::u16string_view word) override;
  void Normalise(std::u16string_view word, std::u16string& out) override;

 private:
  CLanguage& language_;
};

}  // namespace qm
