// The stop word list of a language: the upper-cased tokens of stop.txt, looked
// up by exact comparison through a hash set.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
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
  bool Contains(std::u16string_view word) const {
    // Most words of a text are longer than any stop word, or miss the
    // filter of the list's words: no lookup for them.
    return word.size() <= longest_ && MayContain(word) && words_.find(word) != words_.end();
  }
  std::size_t Size() const { return words_.size(); }

 private:
  // FNV-1a over the code units: every word of every indexed text is looked
  // up, and a general byte hash costs more than the short words it hashes.
  struct Hash {
    using is_transparent = void;
    std::size_t operator()(std::u16string_view s) const noexcept {
      uint64_t h = 14695981039346656037ull;
      for (const char16_t c : s) {
        h ^= c;
        h *= 1099511628211ull;
      }
      return static_cast<std::size_t>(h);
    }
  };
  // One bit per value of a cheap hash of the length and the first and last
  // units; every word of the list has its bit set.
  static std::size_t FilterBit(std::u16string_view s) {
    if (s.empty()) return 0;
    return (s.size() * 0x9E37u ^ s.front() * 0x2F1u ^ s.back() * 0x61u) & (kFilterBits - 1);
  }
  bool MayContain(std::u16string_view s) const {
    const std::size_t bit = FilterBit(s);
    return (filter_[bit / 64] >> (bit % 64)) & 1u;
  }

  static constexpr std::size_t kFilterBits = 1 << 16;
  std::array<uint64_t, kFilterBits / 64> filter_{};
  std::unordered_set<std::u16string, Hash, std::equal_to<>> words_;
  std::size_t longest_ = 0;  // units of the longest stop word
};

}  // namespace qm::text
