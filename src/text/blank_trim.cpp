#include "text/blank_trim.h"

#include "base/exception_family.h"
#include "text/separators.h"

namespace qm {

namespace {

std::size_t LeadingBlanks(std::u16string_view text) {
  std::size_t i = 0;
  while (i < text.size() && CSeparatorSet::IsBlank(text[i])) ++i;
  return i;
}

std::size_t TrailingBlanks(std::u16string_view text) {
  std::size_t i = text.size();
  while (i > 0 && CSeparatorSet::IsBlank(text[i - 1])) --i;
  return text.size() - i;
}

}  // namespace

void TrimLeftW(std::u16string& text) {
  if (text.size() > kMaxTrimLength) throw CStringFuncUException::Text("String too long", "TrimLeftW", nullptr);
  text.erase(0, LeadingBlanks(text));
}

void TrimRightW(std::u16string& text) {
  if (text.size() > kMaxTrimLength) throw CStringFuncUException::Text("String too long", "TrimRightW", nullptr);
  text.resize(text.size() - TrailingBlanks(text));
}

std::u16string_view TrimBlanks(std::u16string_view text) {
  text.remove_prefix(LeadingBlanks(text));
  text.remove_suffix(TrailingBlanks(text));
  return text;
}

}  // namespace qm
