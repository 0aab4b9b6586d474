#include "search/condition_text.h"

#include <array>

#include "base/exception_family.h"
#include "search/condition_tree.h"
#include "text/separators.h"

namespace qm {

namespace {

constexpr const char* kParenthesesText = "Parentheses do not match";
// Longest run of modifier digits (and of a NEAR distance) accepted.
constexpr std::size_t kMaxModifierDigits = 5;

bool IsDigit(char16_t c) { return c >= u'0' && c <= u'9'; }

}  // namespace

std::u16string_view StripQuotes(std::u16string_view text) {
  if (text.size() >= 2 && text.front() == u'\'' && text.back() == u'\'') {
    return text.substr(1, text.size() - 2);
  }
  return text;
}

std::u16string UndoubleQuotes(std::u16string_view text) {
  std::u16string out;
  out.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    out.push_back(text[i]);
    if (text[i] == u'\'' && i + 1 < text.size() && text[i + 1] == u'\'') ++i;
  }
  return out;
}

std::u16string HideExpW(std::u16string_view text) {
  std::u16string masked(text);
  int depth = 0;
  bool phrase = false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char16_t c = text[i];
    if (depth == 0 && c == u'\'') {
      masked[i] = u'x';
      if (i + 1 < text.size() && text[i + 1] == u'\'') {
        masked[++i] = u'x';  // a doubled quote neither opens nor closes
      } else {
        phrase = !phrase;
      }
      continue;
    }
    if (!phrase && (c == u'(' || c == u')')) {
      depth += c == u'(' ? 1 : -1;
      // A ")" before its "(" can never be matched later.
      if (depth < 0) throw CGiCmdTreeException::Text(kParenthesesText, "HideExpW", nullptr);
      masked[i] = u'x';
      continue;
    }
    if (depth > 0 || phrase) masked[i] = u'x';
  }
  if (phrase) {
    throw CGiCmdTreeException::Text("Illegal or missing end of phrase character \"'\"",
                                    "HideExpW", nullptr);
  }
  if (depth != 0) throw CGiCmdTreeException::Text(kParenthesesText, "HideExpW", nullptr);
  return masked;
}

std::u16string RemoveParenthesesW(std::u16string_view text) {
  std::u16string current(text);
  int rounds = 0;
  while (current.size() >= 2 && current.front() == u'(') {
    int depth = 0;
    for (std::size_t i = 0; i + 1 < current.size(); ++i) {
      if (current[i] == u'(') ++depth;
      if (current[i] == u')') --depth;
      if (depth == 0) return current;  // "(a) OR (b)": not one enclosing pair
    }
    if (current.back() != u')') {
      throw CGiCmdTreeException::Text(kParenthesesText, "RemoveParenthesesW", nullptr);
    }
    if (++rounds > kGiMaxConditionDepth) {
      throw CGiCmdTreeException::Text("Search condition nested too deeply",
                                      "RemoveParenthesesW", nullptr);
    }
    current = std::u16string(TrimBlanks(std::u16string_view(current).substr(1, current.size() - 2)));
  }
  return current;
}

GiComparison GetEQW(std::u16string_view masked) {
  GiComparison cmp;
  auto at = masked.find(u'>');
  if (at != std::u16string_view::npos) {
    cmp.flags = kGiCmpGreater;
  } else if ((at = masked.find(u'<')) != std::u16string_view::npos) {
    cmp.flags = kGiCmpLess;
  } else if ((at = masked.find(u'=')) != std::u16string_view::npos) {
    cmp.flags = kGiCmpEqual;
  } else {
    throw CGiCmdTreeException::Text("Missing character \"=\", \"<\" or \">\"", "GetEQW",
                                    nullptr);
  }
  cmp.position = at;
  std::size_t end = at + 1;
  if (cmp.flags != kGiCmpEqual) {
    if (end < masked.size() && masked[end] == u'=') {
      cmp.flags |= kGiCmpEqual;
      ++end;
    }
    cmp.length = end - at;
    return cmp;
  }
  for (; end < masked.size(); ++end) {
    const char16_t c = masked[end];
    int32_t bit = 0;
    switch (c) {
      case u'?': cmp.flags |= kGiCmpQuestion; continue;
      case u'$': cmp.flags |= kGiCmpPlainQuery; continue;
      case u'~': bit = kGiCmpSimilarPercent; break;
      case u'^': bit = kGiCmpSimilarDistance; break;
      case u'|': bit = kGiCmpProximity; break;
      default: break;
    }
    if (bit == 0) break;
    cmp.flags |= bit;
    std::size_t digits = 0;
    int32_t number = 0;
    while (end + 1 < masked.size() && IsDigit(masked[end + 1])) {
      if (++digits > kMaxModifierDigits) {
        throw CGiCmdTreeException::Text("Modifier number has more than %i digits", "GetEQW",
                                        nullptr, static_cast<int>(kMaxModifierDigits));
      }
      number = number * 10 + (masked[end + 1] - u'0');
      ++end;
    }
    cmp.modifier = digits > 0 ? number : -1;
  }
  cmp.length = end - at;
  return cmp;
}

bool IsValueSeparatorAt(std::u16string_view value, std::size_t i,
                        const CSeparatorSet& separators) {
  const char16_t c = value[i];
  if (c == u'#' || c == u'*' || c == u'?') {
    if (i == 0 || value[i - 1] != u'\\') return false;
  }
  return separators.Contains(c);
}

std::u16string ReplacePhraseBlankW(std::u16string_view value, const CSeparatorSet& separators) {
  static constexpr std::u16string_view kJoin = u"' ## '";
  std::u16string out;
  out.reserve(value.size() + 16);
  bool phrase = false;
  bool word_open = false;    // characters of the current word were emitted
  bool word_break = false;   // a separator ended the word; join before the next
  for (std::size_t i = 0; i < value.size(); ++i) {
    const char16_t c = value[i];
    if (c == u'\'') {
      if (phrase && i + 1 < value.size() && value[i + 1] == u'\'') {
        if (word_break) out.append(kJoin);
        word_break = false;
        word_open = true;
        out.append(u"''");
        ++i;
        continue;
      }
      phrase = !phrase;
      word_open = false;
      word_break = false;
      out.push_back(c);
      continue;
    }
    if (!phrase) {
      if (c != u' ' && c != u'-' && !IsDigit(c)) {
        throw CGiCmdTreeException::Text("Illegal character outside phrase",
                                        "ReplacePhraseBlankW", nullptr);
      }
      out.push_back(c);
      continue;
    }
    const bool escaped_separator =
        c == u'\\' && i + 1 < value.size() && IsValueSeparatorAt(value, i + 1, separators);
    if (escaped_separator || IsValueSeparatorAt(value, i, separators)) {
      if (escaped_separator) ++i;
      // No empty words: nothing at the phrase's start, its end, or between
      // two separators.
      if (word_open) word_break = true;
      word_open = false;
      continue;
    }
    if (word_break) out.append(kJoin);
    word_break = false;
    word_open = true;
    out.push_back(c);
  }
  return out;
}

GiSplit FindOperatorW(std::u16string_view text) {
  GiSplit split;
  // "NOT" must stand alone: a findex named NOTES is no negation.
  if (text.size() >= 3 && text.substr(0, 3) == u"NOT" &&
      (text.size() == 3 || text[3] == u' ' || text[3] == u'(' || text[3] == u'\t' ||
       text[3] == u'\r' || text[3] == u'\n')) {
    split.code = kGiOpNot;
    split.right = std::u16string(text.substr(3));
    return split;
  }
  struct Operator {
    std::u16string_view text;
    int32_t code;
  };
  static constexpr std::array<Operator, 11> kOperators{{
      {u" || ", kGiOpOr},
      {u" OR ", kGiOpOr},
      {u" FILTER ", kGiOpFilter},
      {u" && ", kGiOpAnd},
      {u" AND ", kGiOpAnd},
      {u" NEAR/", kGiOpNear},
      {u" NEAR ", kGiOpNear},
      {u"!=", kGiOpNot},
      {u"=!", kGiOpNot},
      {u"<>", kGiOpNot},
      {u" ## ", kGiOpAdjacent},
  }};
  const std::u16string masked = HideExpW(text);
  for (const Operator& op : kOperators) {
    const auto at = masked.find(op.text);
    if (at == std::u16string::npos) continue;
    split.code = op.code;
    if (op.code == kGiOpNot) {
      split.right = std::u16string(text.substr(0, at)) + u"=" +
                    std::u16string(text.substr(at + op.text.size()));
      return split;
    }
    split.left = std::u16string(text.substr(0, at));
    split.right = std::u16string(text.substr(at + op.text.size()));
    return split;
  }
  return split;
}

}  // namespace qm
