#include "text/next_word.h"

#include "platform/text_encoding.h"

namespace qm {

namespace {

constexpr std::size_t kMaxLastWordLength = kMaxWordLength - 1;

bool IsLongerThanOneCharacter(std::u16string_view word) {
  if (word.size() != 2) return word.size() > 2;
  return !(word[0] >= 0xD800 && word[0] <= 0xDBFF && word[1] >= 0xDC00 && word[1] <= 0xDFFF);
}

}  // namespace

NextWordCode NextWord(std::u16string_view& text, CWordBuffer& word, const CSeparatorSet& separators) {
  if (text.empty()) {
    word.Assign({});
    return NextWordCode::kNoMoreWords;
  }
  const std::size_t n = text.size();
  std::size_t length = 0;
  std::size_t start = 0;
  while (start < n && separators.IsSeparatorAt(text, start, length)) start += length;
  std::size_t end = start;
  while (end < n && !separators.IsSeparatorAt(text, end, length)) end += length;

  if (end == n) {
    // Nothing but separators left (the usual case, as callers append a blank),
    // or a run that no separator closes.
    const std::u16string_view rest = start < n ? text.substr(start) : text;
    word.Assign(rest.substr(0, Utf16CutLength(rest, kMaxLastWordLength)));
    text = {};
    return NextWordCode::kLastWord;
  }

  const std::u16string_view run = text.substr(start, end - start);
  word.Assign(run.substr(0, Utf16CutLength(run, kMaxWordLength)));

  const char16_t separator = text[end];
  const std::size_t after = end + length;
  NextWordCode code = NextWordCode::kWord;
  if (CSeparatorSet::IsSentenceEnd(separator) && IsLongerThanOneCharacter(word.View())) {
    for (std::size_t k = after; k < n && separators.IsSeparatorAt(text, k, length); k += length) {
      if (CSeparatorSet::IsBlank(text[k])) {
        code = NextWordCode::kSentenceEnd;
        break;
      }
    }
  }
  text.remove_prefix(after);
  return code;
}

}  // namespace qm
