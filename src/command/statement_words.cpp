#include "command/statement_words.h"

#include "command/quoted_text.h"

namespace qm {

std::u16string NormalizeStatement(std::u16string_view statement) {
  enum class Quote { None, Double, Single };
  Quote quote = Quote::None;
  std::u16string out;
  out.reserve(statement.size());
  for (std::size_t i = 0; i < statement.size(); ++i) {
    const char16_t c = statement[i];
    if (quote != Quote::None) {
      out.push_back(c);
      if ((quote == Quote::Double && c == u'"') || (quote == Quote::Single && c == u'\'')) {
        quote = Quote::None;
      }
      continue;
    }
    if (c == u'"') {
      quote = Quote::Double;
      out.push_back(c);
    } else if (c == u'\'') {
      quote = Quote::Single;
      out.push_back(c);
    } else if (c == u'=') {
      // Every blank outside quotes is a space by now, so trailing spaces are all
      // that can stand before the "=".
      while (!out.empty() && out.back() == u' ') out.pop_back();
      out.push_back(u'=');
      while (i + 1 < statement.size() && IsBlank(statement[i + 1])) ++i;
    } else if (IsBlank(c)) {
      out.push_back(u' ');
    } else {
      out.push_back(c);
    }
  }
  return out;
}

StatementSplit SplitStatement(std::u16string_view statement) {
  StatementSplit split;
  const std::size_t n = statement.size();
  std::size_t i = 0;
  while (true) {
    while (i < n && IsBlank(statement[i])) ++i;
    if (i == n) break;
    const std::size_t begin = i;
    bool quoted = false;
    for (; i < n; ++i) {
      const char16_t c = statement[i];
      if (c == u'"') {
        quoted = !quoted;
      } else if (!quoted && IsBlank(c)) {
        break;
      }
    }
    split.words.push_back({begin, i});
    if (quoted) split.unterminated_quote = true;
  }
  return split;
}

}  // namespace qm
