#include "text/snowball_stemmer.h"

#include <libstemmer.h>

#include <climits>

#include "platform/text_encoding.h"

namespace qm::text {

void SnowballStemmer::Deleter::operator()(sb_stemmer* stemmer) const { sb_stemmer_delete(stemmer); }

std::unique_ptr<SnowballStemmer> SnowballStemmer::Create(const char* algorithm) {
  sb_stemmer* stemmer = sb_stemmer_new(algorithm, "UTF_8");
  if (stemmer == nullptr) return nullptr;
  return std::unique_ptr<SnowballStemmer>(new SnowballStemmer(stemmer));
}

namespace {

bool IsHighSurrogate(char16_t c) { return c >= 0xD800 && c <= 0xDBFF; }
bool IsLowSurrogate(char16_t c) { return c >= 0xDC00 && c <= 0xDFFF; }

}  // namespace

bool SnowballStemmer::Stem(std::u16string_view word, std::u16string& out) {
  // Lower-case and encode in one pass, code point by code point.
  utf8_.clear();
  for (std::size_t i = 0; i < word.size(); ++i) {
    char32_t c = word[i];
    if (c < 0x80) {
      utf8_.push_back(static_cast<char>(c >= 'A' && c <= 'Z' ? c + 32 : c));
      continue;
    }
    if (IsHighSurrogate(word[i]) && i + 1 < word.size() && IsLowSurrogate(word[i + 1])) {
      c = 0x10000 + ((c - 0xD800) << 10) + (word[i + 1] - 0xDC00);
      ++i;
    } else if (IsHighSurrogate(word[i]) || IsLowSurrogate(word[i])) {
      c = 0xFFFD;  // a lone surrogate cannot be encoded
    }
    EncodeUtf8(ToLowerCodePoint(c), utf8_);
  }
  if (utf8_.size() > static_cast<std::size_t>(INT_MAX)) return false;
  const sb_symbol* stem = sb_stemmer_stem(stemmer_.get(),
                                          reinterpret_cast<const sb_symbol*>(utf8_.data()),
                                          static_cast<int>(utf8_.size()));
  if (stem == nullptr) return false;
  const std::string_view result(reinterpret_cast<const char*>(stem),
                                static_cast<std::size_t>(sb_stemmer_length(stemmer_.get())));
  // Decode and upper-case in one pass.
  out.clear();
  std::size_t pos = 0;
  while (pos < result.size()) {
    const auto b = static_cast<unsigned char>(result[pos]);
    if (b < 0x80) {
      out.push_back(static_cast<char16_t>(b >= 'a' && b <= 'z' ? b - 32 : b));
      ++pos;
      continue;
    }
    EncodeUtf16(ToUpperCodePoint(DecodeUtf8(result, pos)), out);
  }
  return true;
}

}  // namespace qm::text
