#include "base/exception.h"

#include "platform/text_encoding.h"
#include "base/error_messages.h"
#include "base/trace.h"

namespace qm {

namespace {

std::u16string ModuleMethodSuffix(std::string_view module, const char* method) {
  std::u16string s = u" (Module:";
  AppendUtf8AsUtf16(module, s);
  if (method != nullptr) {
    s += u",Method:";
    AppendUtf8AsUtf16(method, s);
  }
  s += u")";
  return s;
}

void ReplaceFirst(std::u16string& text, std::u16string_view what, std::u16string_view with) {
  const auto pos = text.find(what);
  if (pos != std::u16string::npos) text.replace(pos, what.size(), with);
}

}  // namespace

std::u16string WidenMessage(std::string_view utf8) { return Utf8ToUtf16(utf8); }

void CExceptionBase::AppendCurrentAndInner(const CExceptionBase* inner) {
  entries_.push_back(current_);
  if (inner != nullptr) {
    entries_.insert(entries_.end(), inner->entries_.begin(), inner->entries_.end());
  }
  RefreshWhat();
}

void CExceptionBase::RefreshWhat() {
  std::u16string text;
  for (const auto& e : entries_) {
    if (!text.empty()) text += u" <- ";
    text += e.text;
  }
  what_ = Utf16ToUtf8(text);
}

void CExceptionBase::BuildGeneral(std::string_view module, const char* method,
                                  const CExceptionBase* inner) {
  error_number_ = 1;
  ErrorEntry general{u"General Error" + ModuleMethodSuffix(module, method), 1, kLevelGeneral};
  entries_.push_back(std::move(general));
  if (inner != nullptr) {
    entries_.insert(entries_.end(), inner->entries_.begin(), inner->entries_.end());
  }
  RefreshWhat();
}

void CExceptionBase::BuildText(std::string_view module, std::u16string_view text,
                               const char* method, const CExceptionBase* inner,
                               std::initializer_list<FormatArg> args) {
  error_number_ = 1;
  std::u16string format(text);
  format += ModuleMethodSuffix(module, method);
  current_ = {FormatWideArgs(format, args, kMaxExceptionText), 1, kLevelWritten};
  AppendCurrentAndInner(inner);
}

void CExceptionBase::BuildNumbered(std::string_view module, int32_t number, const char* method,
                                   const CExceptionBase* inner,
                                   std::initializer_list<FormatArg> args) {
  ErrorEntry looked_up = LookupErrorMessage(number);
  std::u16string text = std::move(looked_up.text);
  ReplaceFirst(text, u"%MODULE", Utf8ToUtf16(module));
  if (method != nullptr) ReplaceFirst(text, u"%METHOD", Utf8ToUtf16(method));
  error_number_ = number;
  current_ = {FormatWideArgs(text, args, kMaxExceptionText), number, looked_up.level};
  AppendCurrentAndInner(inner);
}

void CExceptionBase::BuildUnknown(std::string_view module, const char* method,
                                  const CExceptionBase* inner, std::string_view trace_tag) {
  BuildText(module, WidenMessage(kUnknownExceptionText), method, inner, {});
  Trace(true, trace_tag, "*** UNKNOWN EXCEPTION *** (Method:%S)",
        std::u16string(WidenMessage(method ? method : "")));
}

const std::u16string& CExceptionBase::GetFullText(int32_t max_level) const {
  auto join = [this](int32_t level) {
    std::u16string out;
    for (const auto& e : entries_) {
      if (e.level <= level) {
        out += e.text;
        out += u"\r\n";
      }
    }
    return out;
  };
  std::u16string text = join(max_level);
  if (text.empty() && max_level < kLevelGeneral) text = join(kLevelGeneral);
  if (text.empty()) {
    for (const auto& e : entries_) {
      text += e.text;
      text += u"\r\n";
    }
  }
  full_text_ = std::move(text);
  return full_text_;
}

std::string CExceptionBase::GetFullTextUtf8(int32_t max_level) const {
  return Utf16ToUtf8(GetFullText(max_level));
}

}  // namespace qm
