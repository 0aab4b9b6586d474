// The language steps a cut word passes through, as the splitter sees them.
#pragma once

#include <string>
#include <string_view>

namespace qm {

// Implemented over the language object; the splitter calls IsStopWord first,
// on the word as cut (upper case, trimmed), and Normalise only for words that
// are not stop words.
class CWordFilter {
 public:
  virtual ~CWordFilter() = default;
  virtual bool IsStopWord(std::u16string_view word) = 0;
  // Writes the normalised form of word into out (replacing its content); an
  // empty result means the word is not written.
  virtual void Normalise(std::u16string_view word, std::u16string& out) = 0;
};

}  // namespace qm
