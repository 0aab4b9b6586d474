// The separator set of an index: which characters cut a text into words.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

// The punctuation part of the default separators; codes 1 to 32 follow it.
inline constexpr std::u16string_view kDefaultSeparatorPunctuation =
    u";,.()\"?!:-{}[]/&*+\\<>=|'`_";

// The default separator list: the punctuation above followed by codes 1 to 32.
std::u16string DefaultSeparators();

// Expands an index's separator option text: "%NNN" escapes, the placeholders
// "<SPACE>", "<TAB>", "<LINE_FEED>" (code 13), "<NEW_LINE>" (code 10) and
// "<ALL ASCII LESS THAN 33>", then the default list when add_defaults is set.
// Order and repetition in the result carry no meaning.
std::u16string BuildSeparators(std::u16string_view option, bool add_defaults);

// A separator text turned into an O(1) membership test: one bit per BMP code
// unit, plus a short list for characters outside the BMP (kept as pairs in the
// text). Immutable once built.
class CSeparatorSet {
 public:
  CSeparatorSet() = default;
  explicit CSeparatorSet(std::u16string_view separators);

  bool Contains(char32_t c) const {
    if (c < 0x10000) return (bits_[c >> 6] >> (c & 63)) & 1u;
    return ContainsSupplementary(c);
  }
  // Whether the character at text[i] is a separator; sets length to its
  // length in code units. A surrogate pair is one character; a lone surrogate
  // is looked up as the unit it is.
  bool IsSeparatorAt(std::u16string_view text, std::size_t i, std::size_t& length) const {
    const char16_t u = text[i];
    if (u < 0xD800 || u > 0xDFFF) {
      length = 1;
      return (bits_[u >> 6] >> (u & 63)) & 1u;
    }
    return SurrogateIsSeparator(text, i, length);
  }

  // The characters that end a sentence when they follow a word.
  static bool IsSentenceEnd(char16_t c) { return c == u'.' || c == u'?' || c == u';' || c == u':'; }
  // The blanks that trims remove and that the sentence-end rule looks for.
  static bool IsBlank(char16_t c) { return c == u' ' || c == u'\n' || c == u'\r' || c == u'\t'; }

 private:
  bool ContainsSupplementary(char32_t c) const;
  bool SurrogateIsSeparator(std::u16string_view text, std::size_t i, std::size_t& length) const;

  std::array<std::uint64_t, 0x10000 / 64> bits_{};
  std::vector<char32_t> supplementary_;  // sorted, unique
};

}  // namespace qm
