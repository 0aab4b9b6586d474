#include "sources/column_text.h"

#include <cstdint>
#include <cstring>

#include "platform/text_encoding.h"

namespace qm {

namespace {

constexpr char32_t kReplacement = 0xFFFD;

bool IsHighSurrogate(char16_t u) { return u >= 0xD800 && u <= 0xDBFF; }
bool IsLowSurrogate(char16_t u) { return u >= 0xDC00 && u <= 0xDFFF; }

// True when the sequence at [start, end) decoded to U+FFFD although it is not
// the encoded replacement character itself.
bool WasInvalid(std::string_view bytes, std::size_t start, std::size_t end, char32_t cp) {
  return cp == kReplacement && bytes.substr(start, end - start) != "\xEF\xBF\xBD";
}

// True when every byte is below 0x80; one branch-free pass the compiler
// turns into vector instructions.
bool IsAscii(std::string_view bytes) {
  unsigned char any = 0;
  for (const char c : bytes) any |= static_cast<unsigned char>(c);
  return any < 0x80;
}

}  // namespace

void AssignColumnText(std::string_view bytes, std::size_t max_chars, std::string& out) {
  // Most values: plain ASCII no longer than the limit, copied as they are.
  if (bytes.size() <= max_chars && IsAscii(bytes)) {
    out.assign(bytes.data(), bytes.size());
    return;
  }
  // Measure the valid prefix and copy it in one go.
  std::size_t pos = 0;
  std::size_t chars = 0;
  while (pos < bytes.size() && chars < max_chars) {
    if (static_cast<unsigned char>(bytes[pos]) < 0x80) {
      ++pos;
    } else {
      std::size_t next = pos;
      const char32_t cp = DecodeUtf8(bytes, next);
      if (WasInvalid(bytes, pos, next, cp)) break;
      pos = next;
    }
    ++chars;
  }
  out.assign(bytes.data(), pos);
  if (pos == bytes.size() || chars == max_chars) return;

  // Slow path from the first invalid sequence on.
  while (pos < bytes.size() && chars < max_chars) {
    EncodeUtf8(DecodeUtf8(bytes, pos), out);
    ++chars;
  }
}

void AssignColumnText(std::u16string_view units, std::size_t max_chars, std::u16string& out) {
  std::size_t pos = 0;
  std::size_t chars = 0;
  bool clean = true;
  while (pos < units.size() && chars < max_chars) {
    const char16_t u = units[pos];
    if (IsHighSurrogate(u) && pos + 1 < units.size() && IsLowSurrogate(units[pos + 1])) {
      pos += 2;
    } else {
      if (IsHighSurrogate(u) || IsLowSurrogate(u)) clean = false;
      ++pos;
    }
    ++chars;
  }
  out.assign(units.data(), pos);
  if (clean) return;
  for (std::size_t i = 0; i < out.size(); ++i) {
    const char16_t u = out[i];
    if (IsHighSurrogate(u) && i + 1 < out.size() && IsLowSurrogate(out[i + 1])) {
      ++i;
    } else if (IsHighSurrogate(u) || IsLowSurrogate(u)) {
      out[i] = static_cast<char16_t>(kReplacement);
    }
  }
}

}  // namespace qm
