// CSplit: a search term cut into the literal pieces between its wildcards.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace qm {

// How a piece (or the start of the term) is reached from what stands before it.
enum class SplitKind : int {
  kAfterAsterisk = 1,       // any run of characters before it
  kAfterQuestionMarks = 2,  // exactly `count` characters before it
  kLiteral = 3,             // nothing before it
};

struct CSplitPiece {
  std::u16string text;  // unescaped
  SplitKind kind = SplitKind::kLiteral;
  int count = 0;        // question marks in the wildcard run before the piece
};

class CSplit {
 public:
  static constexpr std::size_t kMaxPieces = 11;

  // Cuts term at its unescaped "*" and "?" (a backslash before one makes it
  // literal). A run of wildcards that holds an asterisk counts as an asterisk.
  // More than 11 pieces raise the StringFuncU error "Too many words".
  void SplitW(std::u16string_view term);

  const std::vector<CSplitPiece>& Pieces() const { return pieces_; }
  SplitKind StartKind() const { return start_kind_; }
  int StartCount() const { return start_count_; }
  bool LeadingAsterisk() const { return start_kind_ == SplitKind::kAfterAsterisk; }
  bool TrailingAsterisk() const { return trailing_asterisk_; }
  // One or more unescaped trailing question marks (with no asterisk among them).
  bool TrailingQuestionMarks() const { return trailing_question_marks_ > 0; }
  int TrailingQuestionMarkCount() const { return trailing_question_marks_; }
  // One literal piece and no wildcard anywhere: the term is an exact word.
  bool IsPlainWord() const { return plain_word_; }

 private:
  std::vector<CSplitPiece> pieces_;
  SplitKind start_kind_ = SplitKind::kLiteral;
  int start_count_ = 0;
  bool trailing_asterisk_ = false;
  int trailing_question_marks_ = 0;
  bool plain_word_ = false;
};

}  // namespace qm
