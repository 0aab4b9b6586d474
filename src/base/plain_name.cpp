#include "base/plain_name.h"

#include <cstdint>

namespace qm {

namespace {

bool IsContinuationByte(unsigned char c) { return (c & 0xC0) == 0x80; }

// C0 controls, DEL, and the C1 controls U+0080..U+009F (UTF-8 C2 80..C2 9F).
bool ControlAt(std::string_view name, std::size_t i) {
  const auto c = static_cast<unsigned char>(name[i]);
  if (c < 0x20 || c == 0x7F) return true;
  return c == 0xC2 && i + 1 < name.size() && static_cast<unsigned char>(name[i + 1]) >= 0x80 &&
         static_cast<unsigned char>(name[i + 1]) <= 0x9F;
}

}  // namespace

std::string_view PlainNameFault(std::string_view name) {
  if (name.empty()) return "a name must not be empty";
  if (name == "." || name == "..") return "a name must not be \".\" or \"..\"";
  std::size_t characters = 0;
  for (std::size_t i = 0; i < name.size(); ++i) {
    const char c = name[i];
    if (c == '/' || c == '\\' || c == '"' || ControlAt(name, i)) {
      return "a name must not contain \"/\", \"\\\", a double quote or a control character";
    }
    if (!IsContinuationByte(static_cast<unsigned char>(c))) ++characters;
  }
  if (characters > kMaxPlainNameLength) return "a name must be at most 199 characters long";
  return {};
}

std::string ShowName(std::string_view name) {
  constexpr std::size_t kShown = 60;
  static constexpr char kHex[] = "0123456789ABCDEF";
  std::string out;
  std::size_t characters = 0;
  for (std::size_t i = 0; i < name.size(); ++i) {
    const auto c = static_cast<unsigned char>(name[i]);
    if (!IsContinuationByte(c) && ++characters > kShown) {
      out += "...";
      break;
    }
    if (ControlAt(name, i)) {
      // A C1 control is shown by its second byte, which is its code point.
      const auto code = c == 0xC2 ? static_cast<unsigned char>(name[++i]) : c;
      out += "\\x";
      out += kHex[code >> 4];
      out += kHex[code & 0xF];
    } else {
      out += static_cast<char>(c);
    }
  }
  return out;
}

}  // namespace qm
