#include "text/language_file.h"

#include "config/win_file.h"

namespace qm::text {

std::string ReadLanguageFile(const std::string& path) {
  WinFile file;
  file.OpenWinFile(path, platform::FileAccess::Read, platform::kFileAttributeNormal,
                   platform::FileDisposition::OpenExisting);
  // The size is a first guess only: the file is read to its end.
  std::string bytes(static_cast<std::size_t>(file.Size()) + 1, '\0');
  std::size_t used = 0;
  for (;;) {
    used += file.Read(bytes.data() + used, bytes.size() - used);
    if (used < bytes.size()) break;
    bytes.resize(bytes.size() * 2);
  }
  bytes.resize(used);
  return bytes;
}

namespace {

template <class Char, class IsBlank>
std::vector<std::basic_string_view<Char>> SplitTokens(std::basic_string_view<Char> text,
                                                      IsBlank is_blank) {
  std::vector<std::basic_string_view<Char>> tokens;
  std::size_t i = 0;
  while (i < text.size()) {
    while (i < text.size() && is_blank(text[i])) ++i;
    const std::size_t start = i;
    while (i < text.size() && !is_blank(text[i])) ++i;
    if (i > start) tokens.push_back(text.substr(start, i - start));
  }
  return tokens;
}

}  // namespace

std::vector<std::string_view> SplitBlankTokens(std::string_view bytes) {
  return SplitTokens(bytes, [](char c) {
    return c == ' ' || c == '\n' || c == '\r' || c == '\f' || c == '\t';
  });
}

bool DecodeUtf16Le(std::string_view bytes, std::u16string& out) {
  out.clear();
  if (bytes.size() % 2 != 0) return false;
  out.reserve(bytes.size() / 2);
  for (std::size_t i = 0; i < bytes.size(); i += 2) {
    const auto lo = static_cast<unsigned char>(bytes[i]);
    const auto hi = static_cast<unsigned char>(bytes[i + 1]);
    out.push_back(static_cast<char16_t>(lo | (hi << 8)));
  }
  // Only a real byte-order mark is skipped: a file saved without one keeps its
  // first character.
  if (!out.empty() && out.front() == u'\xFEFF') out.erase(0, 1);
  return true;
}

std::vector<std::u16string_view> SplitUtf16Tokens(std::u16string_view text) {
  return SplitTokens(text, [](char16_t c) { return c == u' ' || c == u'\n' || c == u'\r'; });
}

}  // namespace qm::text
