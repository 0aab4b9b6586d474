#include "text/separators.h"

#include <algorithm>

namespace qm {

namespace {

constexpr std::u16string_view kAllAsciiBelow33 = u"<ALL ASCII LESS THAN 33>";

void AppendControlAndSpace(std::u16string& out) {
  for (char16_t c = 1; c <= 32; ++c) out.push_back(c);
}

void ReplaceAll(std::u16string& text, std::u16string_view from, std::u16string_view to) {
  std::u16string out;
  std::size_t pos = 0;
  for (std::size_t hit; (hit = text.find(from, pos)) != std::u16string::npos; pos = hit + from.size()) {
    out.append(text, pos, hit - pos);
    out.append(to);
  }
  if (pos == 0) return;
  out.append(text, pos);
  text = std::move(out);
}

// "%" and three more characters: the three are read as a decimal number from
// their leading digits; a non-zero number stands for the character of that
// code, a zero keeps the "%" as an ordinary character.
std::u16string DecodeEscapes(std::u16string_view text) {
  std::u16string out;
  out.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] == u'%' && i + 3 < text.size()) {
      int code = 0;
      for (std::size_t k = i + 1; k <= i + 3 && text[k] >= u'0' && text[k] <= u'9'; ++k) {
        code = code * 10 + (text[k] - u'0');
      }
      if (code != 0) {
        out.push_back(static_cast<char16_t>(code));
        i += 3;
        continue;
      }
    }
    out.push_back(text[i]);
  }
  return out;
}

}  // namespace

std::u16string DefaultSeparators() {
  std::u16string out(kDefaultSeparatorPunctuation);
  AppendControlAndSpace(out);
  return out;
}

std::u16string BuildSeparators(std::u16string_view option, bool add_defaults) {
  std::u16string text = DecodeEscapes(option);
  ReplaceAll(text, u"<SPACE>", u" ");
  ReplaceAll(text, u"<TAB>", u"\t");
  ReplaceAll(text, u"<LINE_FEED>", u"\r");
  ReplaceAll(text, u"<NEW_LINE>", u"\n");
  if (text.find(kAllAsciiBelow33) != std::u16string::npos) {
    ReplaceAll(text, kAllAsciiBelow33, u"");
    AppendControlAndSpace(text);
  }
  if (add_defaults) text += DefaultSeparators();
  return text;
}

CSeparatorSet::CSeparatorSet(std::u16string_view separators) {
  for (std::size_t i = 0; i < separators.size(); ++i) {
    const char16_t u = separators[i];
    if (u >= 0xD800 && u <= 0xDBFF && i + 1 < separators.size() && separators[i + 1] >= 0xDC00 &&
        separators[i + 1] <= 0xDFFF) {
      supplementary_.push_back(0x10000 + ((char32_t(u) - 0xD800) << 10) + (separators[i + 1] - 0xDC00));
      ++i;
    } else {
      bits_[u >> 6] |= std::uint64_t{1} << (u & 63);
    }
  }
  std::sort(supplementary_.begin(), supplementary_.end());
  supplementary_.erase(std::unique(supplementary_.begin(), supplementary_.end()), supplementary_.end());
}

bool CSeparatorSet::ContainsSupplementary(char32_t c) const {
  return std::binary_search(supplementary_.begin(), supplementary_.end(), c);
}

bool CSeparatorSet::SurrogateIsSeparator(std::u16string_view text, std::size_t i,
                                         std::size_t& length) const {
  const char16_t u = text[i];
  if (u <= 0xDBFF && i + 1 < text.size() && text[i + 1] >= 0xDC00 && text[i + 1] <= 0xDFFF) {
    length = 2;
    return ContainsSupplementary(0x10000 + ((char32_t(u) - 0xD800) << 10) + (text[i + 1] - 0xDC00));
  }
  length = 1;
  return Contains(u);
}

}  // namespace qm
