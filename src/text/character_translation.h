// Custom character translations of a language (lang.txt): ordered (from, to)
// pairs applied to every word in list order.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace qm::text {

class CharacterTranslationList {
 public:
  // Each side of a pair holds at most this many UTF-16 units; longer texts are cut.
  static constexpr std::size_t kMaxTextLength = 199;
  // A translation whose result would reach this length is skipped for the word.
  static constexpr std::size_t kWordLimit = 200;

  // Parses the decoded file text line by line: "from op to" where op is "-"
  // (one pair) or "=" (the pair and its reverse), "#" as to meaning the empty
  // text; "from to" repeats the previous line's operator. False on a line of one
  // token, a two-token line before any operator, a missing third token or a
  // line of more than three tokens.
  static bool Parse(std::u16string_view text, CharacterTranslationList& out);

  // Applies every pair to word in place; scratch is a reusable buffer.
  void Apply(std::u16string& word, std::u16string& scratch) const;

  const std::vector<std::pair<std::u16string, std::u16string>>& Pairs() const { return pairs_; }

 private:
  void Add(std::u16string_view from, std::u16string_view to);

  std::vector<std::pair<std::u16string, std::u16string>> pairs_;
};

}  // namespace qm::text
