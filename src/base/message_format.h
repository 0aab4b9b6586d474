// Type-safe printf-style formatting of messages and trace lines.
//
// Understands "%s", "%S", "%i", "%d" and "%%". Each directive takes the next
// argument actually passed and renders it by its own type (text as text, numbers
// in decimal), so data from outside can never make the formatter read or write
// memory. A directive with no argument left, and anything else after "%", stays
// literal text. The result is cut at a limit without splitting a character.
#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <type_traits>

namespace qm {

class CStr;
class CWStr;

struct FormatArg {
  enum class Kind { Narrow, Wide, Integer, Unsigned };
  Kind kind = Kind::Integer;
  std::string_view narrow;
  std::u16string_view wide;
  long long integer = 0;
  unsigned long long unsigned_integer = 0;

  FormatArg(const char* s) : kind(Kind::Narrow), narrow(s ? s : "") {}
  FormatArg(char* s) : FormatArg(static_cast<const char*>(s)) {}
  FormatArg(const std::string& s) : kind(Kind::Narrow), narrow(s) {}
  FormatArg(std::string_view s) : kind(Kind::Narrow), narrow(s) {}
  FormatArg(const char16_t* s) : kind(Kind::Wide), wide(s ? s : u"") {}
  FormatArg(char16_t* s) : FormatArg(static_cast<const char16_t*>(s)) {}
  FormatArg(const std::u16string& s) : kind(Kind::Wide), wide(s) {}
  FormatArg(std::u16string_view s) : kind(Kind::Wide), wide(s) {}
  FormatArg(const CStr& s);
  FormatArg(const CWStr& s);
  template <class T, std::enable_if_t<std::is_integral_v<T> || std::is_enum_v<T>, int> = 0>
  FormatArg(T v) {
    using U = std::conditional_t<std::is_enum_v<T>, std::underlying_type<T>, std::type_identity<T>>;
    if constexpr (std::is_unsigned_v<typename U::type>) {
      kind = Kind::Unsigned;
      unsigned_integer = static_cast<unsigned long long>(v);
    } else {
      integer = static_cast<long long>(v);
    }
  }
};

// Exception texts are cut at 2,047 UTF-16 units, trace messages at 1,023 bytes.
inline constexpr std::size_t kMaxExceptionText = 2047;
inline constexpr std::size_t kMaxTraceMessage = 1023;

std::u16string FormatWideArgs(std::u16string_view format, std::initializer_list<FormatArg> args,
                              std::size_t max_units);
std::string FormatNarrowArgs(std::string_view format, std::initializer_list<FormatArg> args,
                             std::size_t max_bytes);

template <class... A>
std::u16string FormatWide(std::u16string_view format, std::size_t max_units, const A&... args) {
  return FormatWideArgs(format, {FormatArg(args)...}, max_units);
}

template <class... A>
std::string FormatNarrow(std::string_view format, std::size_t max_bytes, const A&... args) {
  return FormatNarrowArgs(format, {FormatArg(args)...}, max_bytes);
}

}  // namespace qm
