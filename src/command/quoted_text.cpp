#include "command/quoted_text.h"

namespace qm {

std::size_t FindOutsideQuotes(std::u16string_view text, char16_t ch, std::size_t from) {
  bool quoted = false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] == u'"') {
      quoted = !quoted;
    } else if (!quoted && text[i] == ch && i >= from) {
      return i;
    }
  }
  return std::u16string_view::npos;
}

std::vector<std::u16string_view> SplitOutsideQuotes(std::u16string_view text,
                                                    char16_t separator, bool& unterminated) {
  std::vector<std::u16string_view> pieces;
  bool quoted = false;
  std::size_t start = 0;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] == u'"') {
      quoted = !quoted;
    } else if (!quoted && text[i] == separator) {
      pieces.push_back(text.substr(start, i - start));
      start = i + 1;
    }
  }
  pieces.push_back(text.substr(start));
  unterminated = quoted;
  return pieces;
}

std::u16string UnquoteValue(std::u16string_view text) {
  if (text.size() < 2 || text.front() != u'"' || text.back() != u'"') {
    return std::u16string(text);
  }
  const std::u16string_view inner = text.substr(1, text.size() - 2);
  std::u16string out;
  out.reserve(inner.size());
  for (std::size_t i = 0; i < inner.size(); ++i) {
    out.push_back(inner[i]);
    if (inner[i] == u'"' && i + 1 < inner.size() && inner[i + 1] == u'"') ++i;
  }
  return out;
}

std::u16string_view TrimSpaces(std::u16string_view text) {
  while (!text.empty() && text.front() == u' ') text.remove_prefix(1);
  while (!text.empty() && text.back() == u' ') text.remove_suffix(1);
  return text;
}

}  // namespace qm
