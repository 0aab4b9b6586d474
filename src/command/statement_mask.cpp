#include "command/statement_mask.h"

#include "command/quoted_text.h"
#include "command/statement_words.h"
#include "platform/text_encoding.h"

namespace qm {

namespace {

bool IsNameChar(char16_t c) {
  return (c >= u'0' && c <= u'9') || (c >= u'A' && c <= u'Z') || (c >= u'a' && c <= u'z') ||
         c == u'_';
}

char16_t AsciiUpper16(char16_t c) { return (c >= u'a' && c <= u'z') ? char16_t(c - 32) : c; }

// Length of keyword matched case-insensitively at text[pos], or 0.
std::size_t MatchKeyword(std::u16string_view text, std::size_t pos, std::u16string_view keyword) {
  if (text.size() - pos < keyword.size()) return 0;
  for (std::size_t k = 0; k < keyword.size(); ++k) {
    if (AsciiUpper16(text[pos + k]) != keyword[k]) return 0;
  }
  return keyword.size();
}

// Where the value starting at pos ends: at ";" or the end of a {...} value. In
// a statement also at the double quote that closes the word (a "" pair inside
// quotes is part of the value) and, outside quotes, at a blank.
std::size_t ValueEnd(std::u16string_view text, std::size_t pos, bool quoted, bool statement) {
  if (pos < text.size() && text[pos] == u'{') {
    for (std::size_t i = pos + 1; i < text.size(); ++i) {
      if (text[i] != u'}') continue;
      if (i + 1 < text.size() && text[i + 1] == u'}') {
        ++i;  // "}}" stands for "}" inside braces
        continue;
      }
      return i + 1;
    }
    return text.size();
  }
  for (std::size_t i = pos; i < text.size(); ++i) {
    const char16_t c = text[i];
    if (c == u';') return i;
    if (!statement) continue;  // a connection string alone: only ";" ends a value
    if (c == u'"') {
      if (quoted && i + 1 < text.size() && text[i + 1] == u'"') {
        ++i;
        continue;
      }
      return i;
    }
    if (!quoted && IsBlank(c)) return i;
  }
  return text.size();
}

std::u16string MaskSecretValues(std::u16string_view text, bool statement) {
  static constexpr std::u16string_view kKeys[] = {u"PASSWORD", u"PWD"};
  std::u16string out;
  out.reserve(text.size());
  bool quoted = false;
  std::size_t i = 0;
  while (i < text.size()) {
    const char16_t c = text[i];
    std::size_t key_length = 0;
    if (i == 0 || !IsNameChar(text[i - 1])) {
      for (auto key : kKeys) {
        if ((key_length = MatchKeyword(text, i, key)) != 0) break;
      }
    }
    if (key_length != 0) {
      std::size_t j = i + key_length;
      while (j < text.size() && (text[j] == u' ' || text[j] == u'\t')) ++j;
      if (j < text.size() && text[j] == u'=') {
        ++j;
        while (j < text.size() && (text[j] == u' ' || text[j] == u'\t')) ++j;
        const std::size_t end = ValueEnd(text, j, quoted, statement);
        out.append(text.substr(i, j - i));
        if (end > j) out.append(kMaskedSecret);
        i = end;
        continue;
      }
    }
    if (c == u'"' && statement) {
      if (quoted && i + 1 < text.size() && text[i + 1] == u'"') {
        out.append(u"\"\"");
        i += 2;
        continue;
      }
      quoted = !quoted;
    }
    out.push_back(c);
    ++i;
  }
  return out;
}

}  // namespace

std::u16string MaskConnectionSecrets(std::u16string_view connection_string) {
  return MaskSecretValues(connection_string, false);
}

std::u16string MaskWordForTrace(std::u16string_view word) {
  return MaskSecretValues(word, true);
}

std::u16string MaskStatementForTrace(std::u16string_view statement) {
  std::u16string text = NormalizeStatement(statement);
  const StatementSplit split = SplitStatement(text);
  if (split.words.size() >= 4) {
    const WordSpan first = split.words[0];
    if (ToUpper(std::u16string_view(text).substr(first.begin, first.end - first.begin)) ==
        u"CONNECT") {
      const WordSpan password = split.words[3];
      text.replace(password.begin, password.end - password.begin, kMaskedSecret);
    }
  }
  return MaskSecretValues(text, true);
}

}  // namespace qm
