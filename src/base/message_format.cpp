#include "base/message_format.h"

#include "platform/text_encoding.h"
#include "base/cstr.h"
#include "base/cwstr.h"

namespace qm {

FormatArg::FormatArg(const CStr& s) : kind(Kind::Narrow), narrow(s.View()) {}
FormatArg::FormatArg(const CWStr& s) : kind(Kind::Wide), wide(s.View()) {}

namespace {

bool IsDirective(char32_t c) { return c == 's' || c == 'S' || c == 'i' || c == 'd'; }

void AppendArg(const FormatArg& arg, std::u16string& out) {
  switch (arg.kind) {
    case FormatArg::Kind::Narrow:
      AppendUtf8AsUtf16(arg.narrow, out);
      break;
    case FormatArg::Kind::Wide:
      out.append(arg.wide);
      break;
    case FormatArg::Kind::Integer:
      for (char c : std::to_string(arg.integer)) out.push_back(static_cast<char16_t>(c));
      break;
    case FormatArg::Kind::Unsigned:
      for (char c : std::to_string(arg.unsigned_integer)) out.push_back(static_cast<char16_t>(c));
      break;
  }
}

void AppendArg(const FormatArg& arg, std::string& out) {
  switch (arg.kind) {
    case FormatArg::Kind::Narrow:
      out.append(arg.narrow);
      break;
    case FormatArg::Kind::Wide:
      AppendUtf16AsUtf8(arg.wide, out);
      break;
    case FormatArg::Kind::Integer:
      out.append(std::to_string(arg.integer));
      break;
    case FormatArg::Kind::Unsigned:
      out.append(std::to_string(arg.unsigned_integer));
      break;
  }
}

template <class String, class View>
String FormatImpl(View format, std::initializer_list<FormatArg> args) {
  String out;
  out.reserve(format.size() + 32);
  auto next = args.begin();
  for (std::size_t i = 0; i < format.size(); ++i) {
    const auto c = format[i];
    if (c != '%' || i + 1 >= format.size()) {
      out.push_back(c);
      continue;
    }
    const auto d = format[i + 1];
    if (d == '%') {
      out.push_back(c);
      ++i;
    } else if (IsDirective(static_cast<char32_t>(d)) && next != args.end()) {
      AppendArg(*next++, out);
      ++i;
    } else {
      out.push_back(c);  // no argument left or no directive: literal text
    }
  }
  return out;
}

}  // namespace

std::u16string FormatWideArgs(std::u16string_view format, std::initializer_list<FormatArg> args,
                              std::size_t max_units) {
  auto out = FormatImpl<std::u16string>(format, args);
  out.resize(Utf16CutLength(out, max_units));
  return out;
}

std::string FormatNarrowArgs(std::string_view format, std::initializer_list<FormatArg> args,
                             std::size_t max_bytes) {
  auto out = FormatImpl<std::string>(format, args);
  out.resize(Utf8CutLength(out, max_bytes));
  return out;
}

}  // namespace qm
