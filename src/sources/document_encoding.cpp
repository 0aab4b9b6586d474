#include "sources/document_encoding.h"

#include "platform/text_encoding.h"

namespace qm {

namespace {

bool StartsWith(std::string_view text, std::string_view prefix) {
  return text.substr(0, prefix.size()) == prefix;
}

std::string Utf16ToUtf8Bytes(std::string_view bytes, bool little_endian) {
  std::u16string units;
  units.reserve(bytes.size() / 2);
  for (std::size_t i = 0; i + 1 < bytes.size(); i += 2) {
    const auto a = static_cast<unsigned char>(bytes[i]);
    const auto b = static_cast<unsigned char>(bytes[i + 1]);
    units.push_back(static_cast<char16_t>(little_endian ? (a | (b << 8)) : ((a << 8) | b)));
  }
  std::string out = Utf16ToUtf8(units);
  // An odd last byte is half a character.
  if (bytes.size() % 2 != 0) EncodeUtf8(0xFFFD, out);
  return out;
}

}  // namespace

std::string DecodeDocumentBytes(std::string_view bytes) {
  if (StartsWith(bytes, "\xEF\xBB\xBF")) bytes.remove_prefix(3);
  else if (StartsWith(bytes, "\xFF\xFE")) return Utf16ToUtf8Bytes(bytes.substr(2), true);
  else if (StartsWith(bytes, "\xFE\xFF")) return Utf16ToUtf8Bytes(bytes.substr(2), false);

  std::string out;
  out.reserve(bytes.size());
  std::size_t pos = 0;
  while (pos < bytes.size()) {
    const auto b = static_cast<unsigned char>(bytes[pos]);
    if (b < 0x80) {
      out.push_back(static_cast<char>(b));
      ++pos;
    } else {
      EncodeUtf8(DecodeUtf8(bytes, pos), out);
    }
  }
  return out;
}

std::string_view FirstCharacters(std::string_view text, std::size_t max_chars) {
  std::size_t pos = 0;
  for (std::size_t n = 0; n < max_chars && pos < text.size(); ++n) {
    ++pos;
    while (pos < text.size() && (static_cast<unsigned char>(text[pos]) & 0xC0) == 0x80) ++pos;
  }
  return text.substr(0, pos);
}

}  // namespace qm
