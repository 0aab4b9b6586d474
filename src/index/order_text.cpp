#include "index/order_text.h"

#include <algorithm>

#include "platform/text_encoding.h"

namespace qm {

namespace {

constexpr int32_t kIgnoreCase = 1;

bool IsContinuation(char c) { return (static_cast<unsigned char>(c) & 0xC0) == 0x80; }

bool IsHighSurrogate(char16_t u) { return u >= 0xD800 && u <= 0xDBFF; }
bool IsLowSurrogate(char16_t u) { return u >= 0xDC00 && u <= 0xDFFF; }

// The code point of text at pos (UTF-16) and its length in units.
char32_t CodePointAt(std::u16string_view text, std::size_t pos, std::size_t& units) {
  const char16_t u = text[pos];
  if (IsHighSurrogate(u) && pos + 1 < text.size() && IsLowSurrogate(text[pos + 1])) {
    units = 2;
    return 0x10000 + ((static_cast<char32_t>(u) - 0xD800) << 10) + (text[pos + 1] - 0xDC00);
  }
  units = 1;
  return u;
}

}  // namespace

OrderTextPreparation::OrderTextPreparation(int32_t general_flags, std::u16string_view ignore_chars)
    : ignore_case_((general_flags & kIgnoreCase) != 0) {
  const std::u16string chars = ignore_case_ ? ToUpper(ignore_chars) : std::u16string(ignore_chars);
  for (std::size_t pos = 0; pos < chars.size();) {
    std::size_t units = 1;
    ignored_.push_back(CodePointAt(chars, pos, units));
    pos += units;
  }
  std::sort(ignored_.begin(), ignored_.end());
  ignored_.erase(std::unique(ignored_.begin(), ignored_.end()), ignored_.end());
}

bool OrderTextPreparation::Ignored(char32_t c) const {
  return std::binary_search(ignored_.begin(), ignored_.end(), c);
}

void OrderTextPreparation::Prepare(std::string& utf8) const {
  if (ignore_case_) utf8 = ToUpper(std::string_view(utf8));
  if (ignored_.empty() || utf8.empty()) return;
  std::size_t begin = 0;
  while (begin < utf8.size()) {
    std::size_t next = begin;
    if (!Ignored(DecodeUtf8(utf8, next))) break;
    begin = next;
  }
  std::size_t end = utf8.size();
  while (end > begin) {
    std::size_t start = end - 1;
    while (start > begin && IsContinuation(utf8[start])) --start;
    std::size_t next = start;
    const char32_t c = DecodeUtf8(utf8, next);
    // A broken sequence decodes shorter than it looks from the back: such
    // bytes are kept, like every character that is not ignored.
    if (next != end || !Ignored(c)) break;
    end = start;
  }
  utf8 = utf8.substr(begin, end - begin);
}

void OrderTextPreparation::Prepare(std::u16string& text) const {
  if (ignore_case_) ToUpperInPlace(text);
  if (ignored_.empty() || text.empty()) return;
  std::size_t begin = 0;
  while (begin < text.size()) {
    std::size_t units = 1;
    if (!Ignored(CodePointAt(text, begin, units))) break;
    begin += units;
  }
  std::size_t end = text.size();
  while (end > begin) {
    std::size_t start = end - 1;
    if (IsLowSurrogate(text[start]) && start > begin && IsHighSurrogate(text[start - 1])) --start;
    std::size_t units = 1;
    if (!Ignored(CodePointAt(text, start, units))) break;
    end = start;
  }
  text = text.substr(begin, end - begin);
}

}  // namespace qm
