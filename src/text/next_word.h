// Word extraction: takes the next word off the front of a text.
#pragma once

#include <array>
#include <cstddef>
#include <string_view>

#include "text/separators.h"

namespace qm {

// A word holds at most 198 UTF-16 units (a 199-unit buffer with its
// terminator); a surrogate pair is never cut.
inline constexpr std::size_t kMaxWordLength = 198;

// What NextWord found; the values are the engine's codes.
enum class NextWordCode : int {
  kLastWord = 0,     // the end of the text came before any separator
  kNoMoreWords = 1,  // the text was empty
  kSentenceEnd = 2,  // a word that ends a sentence
  kWord = 3,         // an ordinary word
};

// A fixed word buffer, so that extraction never allocates.
class CWordBuffer {
 public:
  std::u16string_view View() const { return {data_.data(), length_}; }
  std::size_t Length() const { return length_; }
  void Assign(std::u16string_view text) {
    length_ = text.size() < kMaxWordLength ? text.size() : kMaxWordLength;
    text.copy(data_.data(), length_);
    data_[length_] = 0;
  }

 private:
  std::array<char16_t, kMaxWordLength + 1> data_{};
  std::size_t length_ = 0;
};

// Removes the next word and the one separator after it from the front of text
// (text is a view that moves forward). Separators before the word are skipped.
// The code is kSentenceEnd when the separator is one of ".?;:", the word is
// longer than one character, the next character is again a separator and,
// scanning on through separators, a blank comes before any other character.
// A run of more than 198 non-separator characters gives its first 198 as the
// word and the rest of the run is dropped, so a long run is one word and
// extraction always moves on.
// When no separator follows, the whole rest is taken with kLastWord: the run
// (cut to 197 units) if the rest holds one, else the rest itself, which is then
// made of separators only.
NextWordCode NextWord(std::u16string_view& text, CWordBuffer& word, const CSeparatorSet& separators);

}  // namespace qm
