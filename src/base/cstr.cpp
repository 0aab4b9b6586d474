#include "base/cstr.h"

#include "platform/text_encoding.h"
#include "base/cwstr.h"

namespace qm {

std::u16string CStr::Wide() const { return Utf8ToUtf16(View()); }

std::string CWStr::Narrow() const { return Utf16ToUtf8(View()); }

int CWStr::Find(std::u16string_view other) const {
  const auto pos = View().find(other);
  return pos == std::u16string_view::npos ? -1 : static_cast<int>(pos);
}

int CWStr::FindInList(const std::vector<std::u16string>& list, int& index) const {
  index = -1;
  const std::size_t n = std::min<std::size_t>(list.size(), 100);
  for (std::size_t i = 0; i < n; ++i) {
    if (list[i].empty()) break;
    const auto pos = View().find(list[i]);
    if (pos != std::u16string_view::npos) {
      index = static_cast<int>(i);
      return static_cast<int>(pos);
    }
  }
  return -1;
}

void CWStr::StripEnclosing(char16_t open, char16_t close) {
  if (text_.size() >= 2 && text_.front() == open && text_.back() == close) {
    text_.erase(text_.size() - 1);
    text_.erase(0, 1);
  }
}

bool CWStr::IsSpecialAt(std::size_t position, std::u16string_view set) const {
  if (set.empty() || position >= Length()) return false;
  const char16_t c = text_[position];
  if (set.find(c) == std::u16string_view::npos) return false;
  if (c == u'#' || c == u'*' || c == u'?') return position > 0 && text_[position - 1] == u'\\';
  return true;
}

}  // namespace qm
