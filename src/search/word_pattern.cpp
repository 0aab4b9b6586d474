#include "search/word_pattern.h"

#include "platform/text_encoding.h"

namespace qm {

std::u32string CodePointsOf(std::u16string_view text) {
  std::u32string out;
  out.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char16_t u = text[i];
    if (u >= 0xD800 && u <= 0xDBFF && i + 1 < text.size() && text[i + 1] >= 0xDC00 &&
        text[i + 1] <= 0xDFFF) {
      out.push_back(0x10000 + ((static_cast<char32_t>(u) - 0xD800) << 10) + (text[i + 1] - 0xDC00));
      ++i;
    } else {
      out.push_back(u);
    }
  }
  return out;
}

std::u32string CodePointsOf(std::string_view utf8) {
  std::u32string out;
  out.reserve(utf8.size());
  std::size_t pos = 0;
  while (pos < utf8.size()) out.push_back(DecodeUtf8(utf8, pos));
  return out;
}

namespace {

template <class View>
bool StartsWith(View word, View prefix) {
  return word.size() >= prefix.size() && word.substr(0, prefix.size()) == prefix;
}

}  // namespace

CWordPattern::CWordPattern(std::u16string_view word) {
  const std::u32string points = CodePointsOf(word);
  bool in_prefix = true;
  for (std::size_t i = 0; i < points.size(); ++i) {
    Piece piece;
    char32_t c = points[i];
    if (c == U'\\' && i + 1 < points.size()) {
      c = points[++i];
      piece.literal = c;
    } else if (c == U'*') {
      piece.any = true;
    } else if (c == U'?') {
      piece.one = true;
    } else {
      piece.literal = c;
    }
    if (piece.any || piece.one) {
      wildcards_ = true;
      in_prefix = false;
      // A run of stars is one star.
      if (piece.any && !pieces_.empty() && pieces_.back().any) continue;
    } else {
      EncodeUtf16(c, literal_);
      if (in_prefix) prefix32_.push_back(c);
    }
    pieces_.push_back(piece);
  }
  for (char32_t c : prefix32_) {
    EncodeUtf16(c, prefix16_);
    EncodeUtf8(c, prefix8_);
  }
  // Only a star after the prefix: every word with the prefix matches.
  prefix_star_only_ = wildcards_ && pieces_.size() == prefix32_.size() + 1 && pieces_.back().any;
}

CWordPattern::Outcome CWordPattern::Match(std::u16string_view word) const {
  if (!StartsWith(word, std::u16string_view(prefix16_))) {
    return word > std::u16string_view(prefix16_) ? kPastPrefix : kNoMatch;
  }
  if (prefix_star_only_) return kMatch;
  return MatchCodePoints(CodePointsOf(word));
}

CWordPattern::Outcome CWordPattern::MatchUtf8(std::string_view word) const {
  if (!StartsWith(word, std::string_view(prefix8_))) {
    return word > std::string_view(prefix8_) ? kPastPrefix : kNoMatch;
  }
  if (prefix_star_only_) return kMatch;
  return MatchCodePoints(CodePointsOf(word));
}

CWordPattern::Outcome CWordPattern::MatchCodePoints(const std::u32string& word) const {
  // Greedy match with a return to the last star: linear in practice, at most
  // word x pattern steps.
  std::size_t w = 0;
  std::size_t p = 0;
  std::size_t star = std::u32string::npos;
  std::size_t star_w = 0;
  while (w < word.size()) {
    if (p < pieces_.size() && !pieces_[p].any &&
        (pieces_[p].one || pieces_[p].literal == word[w])) {
      ++w;
      ++p;
    } else if (p < pieces_.size() && pieces_[p].any) {
      star = p++;
      star_w = w;
    } else if (star != std::u32string::npos) {
      p = star + 1;
      w = ++star_w;
    } else {
      return kNoMatch;
    }
  }
  while (p < pieces_.size() && pieces_[p].any) ++p;
  return p == pieces_.size() ? kMatch : kNoMatch;
}

}  // namespace qm
