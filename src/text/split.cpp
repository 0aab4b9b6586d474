#include "text/split.h"

#include "base/exception_family.h"

namespace qm {

namespace {

bool IsWildcardAt(std::u16string_view term, std::size_t i) {
  return (term[i] == u'*' || term[i] == u'?') && (i == 0 || term[i - 1] != u'\\');
}

std::u16string Unescape(std::u16string_view piece) {
  std::u16string out;
  out.reserve(piece.size());
  for (std::size_t i = 0; i < piece.size(); ++i) {
    if (piece[i] != u'\\') {
      out.push_back(piece[i]);
    } else if (i + 1 < piece.size() &&
               (piece[i + 1] == u'*' || piece[i + 1] == u'?' || piece[i + 1] == u'#')) {
      out.push_back(piece[++i]);
    }
  }
  return out;
}

}  // namespace

void CSplit::SplitW(std::u16string_view term) {
  *this = CSplit();
  if (term.empty()) return;

  for (std::size_t i = term.size(); i > 0 && IsWildcardAt(term, i - 1); --i) {
    if (term[i - 1] == u'*') trailing_asterisk_ = true;
    else ++trailing_question_marks_;
  }
  if (trailing_asterisk_) trailing_question_marks_ = 0;

  if (IsWildcardAt(term, 0)) {
    if (term[0] == u'*') {
      start_kind_ = SplitKind::kAfterAsterisk;
    } else {
      start_kind_ = SplitKind::kAfterQuestionMarks;
      while (static_cast<std::size_t>(start_count_) < term.size() && term[start_count_] == u'?') {
        ++start_count_;
      }
    }
  }

  bool any_wildcard = false;
  bool run_asterisk = false;
  int run_question_marks = 0;
  std::size_t i = 0;
  while (i < term.size()) {
    if (IsWildcardAt(term, i)) {
      any_wildcard = true;
      if (term[i] == u'*') run_asterisk = true;
      else ++run_question_marks;
      ++i;
      continue;
    }
    std::size_t end = i;
    while (end < term.size() && !IsWildcardAt(term, end)) ++end;
    CSplitPiece piece;
    piece.text = Unescape(term.substr(i, end - i));
    i = end;
    piece.kind = run_asterisk               ? SplitKind::kAfterAsterisk
                 : run_question_marks > 0   ? SplitKind::kAfterQuestionMarks
                                            : SplitKind::kLiteral;
    piece.count = run_question_marks;
    if (pieces_.size() == kMaxPieces) {
      *this = CSplit();
      throw CStringFuncUException::Text("Too many words", "CSplit::SplitW", nullptr);
    }
    pieces_.push_back(std::move(piece));
    run_asterisk = false;
    run_question_marks = 0;
  }
  plain_word_ = !any_wildcard && pieces_.size() == 1;
}

}  // namespace qm
