// CWordPattern: a query word with wildcards, as the lookup matches it against
// the words of a findex. "*" stands for any run of characters (none
// included), "?" for exactly one character, and a backslash makes the next
// character literal wherever it stands. Characters are code points, so a
// narrow (UTF-8) findex and a wide one match alike.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace qm {

// The code points of a wide or a narrow (UTF-8) text: what patterns and the
// similarity distance count as characters.
std::u32string CodePointsOf(std::u16string_view text);
std::u32string CodePointsOf(std::string_view utf8);

class CWordPattern {
 public:
  // Result of Match.
  enum Outcome : int32_t {
    kPastPrefix = 0,  // the word sorts after every word with the literal prefix
    kMatch = 1,
    kNoMatch = 2,     // no match, or a word that sorts before the prefix
  };

  CWordPattern() = default;
  // word: the query word as written (UTF-16), escapes included.
  explicit CWordPattern(std::u16string_view word);

  // True when the word holds an unescaped "*" or "?".
  bool HasWildcards() const { return wildcards_; }
  // The literal characters before the first wildcard, escapes removed.
  const std::u16string& LiteralPrefix() const { return prefix16_; }
  const std::string& LiteralPrefixUtf8() const { return prefix8_; }
  // The whole word without its escapes (the exact word when there is no wildcard).
  const std::u16string& Literal() const { return literal_; }

  Outcome Match(std::u16string_view word) const;
  // A narrow findex's word (UTF-8; invalid bytes become replacement characters).
  Outcome MatchUtf8(std::string_view word) const;

 private:
  struct Piece {
    bool any = false;       // "*"
    bool one = false;       // "?"
    char32_t literal = 0;   // otherwise
  };
  Outcome MatchCodePoints(const std::u32string& word) const;

  std::vector<Piece> pieces_;
  std::u32string prefix32_;
  std::u16string prefix16_;
  std::string prefix8_;
  std::u16string literal_;
  bool wildcards_ = false;
  bool prefix_star_only_ = false;
};

}  // namespace qm
