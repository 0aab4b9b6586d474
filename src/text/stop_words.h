// The stop word list of a language: the upper-cased tokens of stop.txt, looked
// up by exact comparison through a hash set.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <unordered_set>

namespace qm::text {

class StopWordList {
 public:
  // Longest stop word kept; longer tokens are cut to this many UTF-16 units.
  static constexpr std::size_t kMaxWordLength = 199;

  // Takes the tokens of the decoded file text (byte-order mark already removed).
  static StopWordList FromText(std::u16string_view text);

  // `word` must already be upper case, as the word splitter delivers it.
  bool Contains(std::u16string_view word) const { return words_.find(word) != words_.end(); }
  std::size_t Size() const { return words_.size(); }

 private:
  struct Hash {
    using is_transparent = void;
    std::size_t operator()(std::u16string_view s) const noexcept {
      return std::hash<std::u16string_view>{}(s);
    }
  };
  std::unordered_set<std::u16string, Hash, std::equal_to<>> words_;
};

}  // namespace qm::text
