#include "text/stop_words.h"

#include <algorithm>

#include "platform/text_encoding.h"
#include "text/language_file.h"

namespace qm::text {

StopWordList StopWordList::FromText(std::u16string_view text) {
  StopWordList list;
  const auto tokens = SplitUtf16Tokens(text);
  list.words_.reserve(tokens.size());
  for (const auto token : tokens) {
    std::u16string word = ToUpper(token);
    word.resize(Utf16CutLength(word, kMaxWordLength));
    list.longest_ = std::max(list.longest_, word.size());
    const std::size_t bit = FilterBit(word);
    list.filter_[bit / 64] |= uint64_t{1} << (bit % 64);
    list.words_.insert(std::move(word));
  }
  return list;
}

}  // namespace qm::text
