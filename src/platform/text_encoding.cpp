#include "platform/text_encoding.h"

#include <unicode/uchar.h>

#include <cstdint>
#include <cstring>

namespace qm {

namespace {

constexpr char32_t kReplacement = 0xFFFD;

bool IsContinuation(unsigned char b) { return (b & 0xC0) == 0x80; }

bool IsEncodable(char32_t c) { return c <= 0x10FFFF && (c < 0xD800 || c > 0xDFFF); }

// Length of the sequence a lead byte announces (1 for anything that is not a lead).
std::size_t SequenceLength(unsigned char b) {
  if ((b & 0xE0) == 0xC0) return 2;
  if ((b & 0xF0) == 0xE0) return 3;
  if ((b & 0xF8) == 0xF0) return 4;
  return 1;
}

}  // namespace

char32_t DecodeUtf8(std::string_view text, std::size_t& pos) {
  const auto* s = reinterpret_cast<const unsigned char*>(text.data());
  const std::size_t n = text.size();
  if (pos >= n) return kReplacement;  // nothing left to decode; pos stays
  const unsigned char b0 = s[pos];
  if (b0 < 0x80) {
    ++pos;
    return b0;
  }
  int extra;
  char32_t cp;
  char32_t min;
  if ((b0 & 0xE0) == 0xC0) {
    extra = 1, cp = b0 & 0x1F, min = 0x80;
  } else if ((b0 & 0xF0) == 0xE0) {
    extra = 2, cp = b0 & 0x0F, min = 0x800;
  } else if ((b0 & 0xF8) == 0xF0) {
    extra = 3, cp = b0 & 0x07, min = 0x10000;
  } else {
    ++pos;
    return kReplacement;
  }
  std::size_t i = pos + 1;
  for (int k = 0; k < extra; ++k, ++i) {
    if (i >= n || !IsContinuation(s[i])) {
      pos = i;  // consume the valid prefix, resume at the offending byte
      return kReplacement;
    }
    cp = (cp << 6) | (s[i] & 0x3F);
  }
  pos = i;
  if (cp < min || cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) return kReplacement;
  return cp;
}

void EncodeUtf8(char32_t c, std::string& out) {
  if (!IsEncodable(c)) c = kReplacement;
  if (c < 0x80) {
    out.push_back(static_cast<char>(c));
  } else if (c < 0x800) {
    out.push_back(static_cast<char>(0xC0 | (c >> 6)));
    out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
  } else if (c < 0x10000) {
    out.push_back(static_cast<char>(0xE0 | (c >> 12)));
    out.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
    out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
  } else {
    out.push_back(static_cast<char>(0xF0 | (c >> 18)));
    out.push_back(static_cast<char>(0x80 | ((c >> 12) & 0x3F)));
    out.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
    out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
  }
}

void EncodeUtf16(char32_t c, std::u16string& out) {
  if (!IsEncodable(c)) c = kReplacement;
  if (c < 0x10000) {
    out.push_back(static_cast<char16_t>(c));
  } else {
    c -= 0x10000;
    out.push_back(static_cast<char16_t>(0xD800 + (c >> 10)));
    out.push_back(static_cast<char16_t>(0xDC00 + (c & 0x3FF)));
  }
}

void AppendUtf8AsUtf16(std::string_view text, std::u16string& out) {
  // No byte gives more than one unit except a four-byte sequence, which gives
  // two: the text's length in units is room enough. Written through a pointer,
  // eight ASCII bytes at a time, as every indexed value passes here.
  const std::size_t start = out.size();
  out.resize(start + text.size());
  char16_t* w = out.data() + start;
  const auto* s = reinterpret_cast<const unsigned char*>(text.data());
  const std::size_t n = text.size();
  std::size_t pos = 0;
  while (pos < n) {
    while (pos + 8 <= n) {
      uint64_t eight;
      std::memcpy(&eight, s + pos, 8);
      if ((eight & 0x8080808080808080ull) != 0) break;
      for (int k = 0; k < 8; ++k) w[k] = s[pos + k];
      w += 8;
      pos += 8;
    }
    if (pos >= n) break;
    if (s[pos] < 0x80) {
      *w++ = s[pos++];
      continue;
    }
    char32_t c = DecodeUtf8(text, pos);
    if (!IsEncodable(c)) c = kReplacement;
    if (c < 0x10000) {
      *w++ = static_cast<char16_t>(c);
    } else {
      c -= 0x10000;
      *w++ = static_cast<char16_t>(0xD800 + (c >> 10));
      *w++ = static_cast<char16_t>(0xDC00 + (c & 0x3FF));
    }
  }
  out.resize(static_cast<std::size_t>(w - out.data()));
}

void AppendUtf16AsUtf8(std::u16string_view text, std::string& out) {
  out.reserve(out.size() + text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    char32_t c = text[i];
    if (c >= 0xD800 && c <= 0xDBFF) {
      if (i + 1 < text.size() && text[i + 1] >= 0xDC00 && text[i + 1] <= 0xDFFF) {
        c = 0x10000 + ((c - 0xD800) << 10) + (text[i + 1] - 0xDC00);
        ++i;
      } else {
        c = kReplacement;
      }
    } else if (c >= 0xDC00 && c <= 0xDFFF) {
      c = kReplacement;
    }
    EncodeUtf8(c, out);
  }
}

std::u16string Utf8ToUtf16(std::string_view text) {
  std::u16string out;
  AppendUtf8AsUtf16(text, out);
  return out;
}

std::string Utf16ToUtf8(std::u16string_view text) {
  std::string out;
  AppendUtf16AsUtf8(text, out);
  return out;
}

char32_t ToUpperCodePoint(char32_t c) {
  if (c < 0x80) return (c >= 'a' && c <= 'z') ? c - 32 : c;
  return static_cast<char32_t>(u_toupper(static_cast<UChar32>(c)));
}

char32_t ToLowerCodePoint(char32_t c) {
  if (c < 0x80) return (c >= 'A' && c <= 'Z') ? c + 32 : c;
  return static_cast<char32_t>(u_tolower(static_cast<UChar32>(c)));
}

namespace {

template <class Map>
std::u16string MapUtf16(std::u16string_view text, Map map) {
  std::u16string out;
  out.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    char32_t c = text[i];
    if (c >= 0xD800 && c <= 0xDBFF && i + 1 < text.size() && text[i + 1] >= 0xDC00 &&
        text[i + 1] <= 0xDFFF) {
      c = 0x10000 + ((c - 0xD800) << 10) + (text[i + 1] - 0xDC00);
      ++i;
      EncodeUtf16(map(c), out);
    } else if (c >= 0xD800 && c <= 0xDFFF) {
      out.push_back(static_cast<char16_t>(c));  // a lone surrogate stays as it is
    } else {
      const char32_t m = map(c);
      // A BMP character keeps its width, so positions stay comparable.
      out.push_back(m < 0x10000 ? static_cast<char16_t>(m) : static_cast<char16_t>(c));
    }
  }
  return out;
}

template <class Map>
std::string MapUtf8(std::string_view text, Map map) {
  std::string out;
  out.reserve(text.size());
  std::size_t pos = 0;
  while (pos < text.size()) {
    EncodeUtf8(map(DecodeUtf8(text, pos)), out);
  }
  return out;
}

}  // namespace

std::u16string ToUpper(std::u16string_view text) { return MapUtf16(text, ToUpperCodePoint); }
std::u16string ToLower(std::u16string_view text) { return MapUtf16(text, ToLowerCodePoint); }
std::string ToUpper(std::string_view utf8) { return MapUtf8(utf8, ToUpperCodePoint); }
std::string ToLower(std::string_view utf8) { return MapUtf8(utf8, ToLowerCodePoint); }

void ToUpperInPlace(std::u16string& text) {
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char16_t ch = text[i];
    if (ch < 0x80) {
      if (ch >= u'a' && ch <= u'z') text[i] = static_cast<char16_t>(ch - 32);
    } else if (ch < 0xD800 || ch > 0xDFFF) {
      const char32_t m = ToUpperCodePoint(ch);
      if (m < 0x10000) text[i] = static_cast<char16_t>(m);
    } else if (ch <= 0xDBFF && i + 1 < text.size() && text[i + 1] >= 0xDC00 &&
               text[i + 1] <= 0xDFFF) {
      // A supplementary character maps within the supplementary planes, so the
      // pair is rewritten in place and the text keeps its length.
      const char32_t c = 0x10000 + ((ch - 0xD800) << 10) + (text[i + 1] - 0xDC00);
      const char32_t m = ToUpperCodePoint(c);
      if (m >= 0x10000 && m <= 0x10FFFF) {
        text[i] = static_cast<char16_t>(0xD800 + ((m - 0x10000) >> 10));
        text[i + 1] = static_cast<char16_t>(0xDC00 + ((m - 0x10000) & 0x3FF));
      }
      ++i;
    }
  }
}

std::string AsciiUpper(std::string_view text) {
  std::string out(text);
  for (auto& ch : out) {
    if (ch >= 'a' && ch <= 'z') ch = static_cast<char>(ch - 32);
  }
  return out;
}

std::size_t Utf8CutLength(std::string_view text, std::size_t max_bytes) {
  if (text.size() <= max_bytes) return text.size();
  // Look back at most three bytes for the lead byte of the character that the
  // cut falls into; cut before it only if its sequence reaches past the cut.
  // Stray continuation bytes belong to no character and are cut anywhere.
  const auto* s = reinterpret_cast<const unsigned char*>(text.data());
  for (std::size_t back = 1; back <= 3 && back <= max_bytes; ++back) {
    const std::size_t lead = max_bytes - back;
    if (IsContinuation(s[lead])) continue;
    return lead + SequenceLength(s[lead]) > max_bytes ? lead : max_bytes;
  }
  return max_bytes;
}

std::size_t Utf16CutLength(std::u16string_view text, std::size_t max_units) {
  if (text.size() <= max_units) return text.size();
  std::size_t n = max_units;
  if (n > 0 && text[n] >= 0xDC00 && text[n] <= 0xDFFF && text[n - 1] >= 0xD800 &&
      text[n - 1] <= 0xDBFF) {
    --n;
  }
  return n;
}

}  // namespace qm
