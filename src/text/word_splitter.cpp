#include "text/word_splitter.h"

#include <cstdint>
#include <cstring>

#include "platform/text_encoding.h"
#include "text/blank_trim.h"
#include "text/remove_blocks.h"

namespace qm {

namespace {

// Upper-cases four units at p when all four are ASCII (false, untouched,
// otherwise). In each 16-bit lane, adding 0x1F sets bit 7 from 'a' up and
// adding 0x05 sets it from '{' up: the lanes holding 'a'..'z' lose 0x20.
bool UpperCaseFourAscii(char16_t* p) {
  uint64_t units;
  std::memcpy(&units, p, sizeof units);
  if ((units & 0xFF80FF80FF80FF80ull) != 0) return false;
  const uint64_t from_a = units + 0x001F001F001F001Full;
  const uint64_t past_z = units + 0x0005000500050005ull;
  const uint64_t lower = from_a & ~past_z & 0x0080008000800080ull;
  units -= lower >> 2;
  std::memcpy(p, &units, sizeof units);
  return true;
}

// Simple upper-case mapping per character; surrogate pairs are mapped as one
// character and a character keeps its width in units, so the text's length
// does not change.
void UpperCaseInPlace(std::u16string& text) {
  const std::size_t n = text.size();
  for (std::size_t i = 0; i < n; ++i) {
    while (i + 4 <= n && UpperCaseFourAscii(text.data() + i)) i += 4;
    if (i >= n) break;
    const char16_t u = text[i];
    if (u < 0x80) {
      if (u >= u'a' && u <= u'z') text[i] = static_cast<char16_t>(u - 32);
    } else if (u < 0xD800 || u > 0xDFFF) {
      const char32_t m = ToUpperCodePoint(u);
      if (m < 0x10000) text[i] = static_cast<char16_t>(m);
    } else if (u <= 0xDBFF && i + 1 < n && text[i + 1] >= 0xDC00 && text[i + 1] <= 0xDFFF) {
      const char32_t c = 0x10000 + ((char32_t(u) - 0xD800) << 10) + (text[i + 1] - 0xDC00);
      const char32_t m = ToUpperCodePoint(c);
      if (m >= 0x10000) {
        text[i] = static_cast<char16_t>(0xD800 + ((m - 0x10000) >> 10));
        text[i + 1] = static_cast<char16_t>(0xDC00 + ((m - 0x10000) & 0x3FF));
      }
      ++i;
    }
  }
}

bool OnlySeparators(std::u16string_view text, const CSeparatorSet& separators) {
  std::size_t length = 0;
  for (std::size_t i = 0; i < text.size(); i += length) {
    if (!separators.IsSeparatorAt(text, i, length)) return false;
  }
  return true;
}

}  // namespace

void CWordSplitter::AppendUtf8(std::string_view utf8) { AppendUtf8AsUtf16(utf8, text_); }

void CWordSplitter::Prepare() {
  UpperCaseInPlace(text_);
  if (remove_html_) {
    RemoveBlocks(text_, u"<SCRIPT", u"</SCRIPT>");
    RemoveBlocks(text_, u"<", u">");
  }
  text_.push_back(u' ');
}

bool CWordSplitter::Next(std::u16string_view& rest, std::int32_t& position, SplitWord& out) {
  for (;;) {
    const NextWordCode code = NextWord(rest, word_, separators_);
    if (code == NextWordCode::kNoMoreWords) return false;
    const bool gap_after = code == NextWordCode::kSentenceEnd || code == NextWordCode::kLastWord;
    const std::u16string_view cut = TrimBlanks(word_.View());
    if (cut.empty() || (code == NextWordCode::kLastWord && OnlySeparators(cut, separators_))) {
      if (gap_after) ++position;
      continue;
    }
    out.cut = cut;
    out.code = code;
    if (filter_ == nullptr) {
      out.form = cut;
    } else if (filter_->IsStopWord(cut)) {
      out.form = {};
    } else {
      filter_->Normalise(cut, form_);
      out.form = form_;
    }
    if (!out.form.empty()) ++position;
    out.position = position;
    if (gap_after) ++position;
    return true;
  }
}

}  // namespace qm
