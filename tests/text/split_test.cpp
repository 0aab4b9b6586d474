// Search terms cut at their wildcards.
#include <gtest/gtest.h>

#include <string>

#include "shared/exception_family.h"
#include "text/split.h"

namespace qm {
namespace {

using K = SplitKind;

void ExpectPieces(const CSplit& s, std::initializer_list<CSplitPiece> expected) {
  ASSERT_EQ(s.Pieces().size(), expected.size());
  std::size_t i = 0;
  for (const auto& e : expected) {
    EXPECT_EQ(s.Pieces()[i].text, e.text) << "piece " << i;
    EXPECT_EQ(s.Pieces()[i].kind, e.kind) << "piece " << i;
    EXPECT_EQ(s.Pieces()[i].count, e.count) << "piece " << i;
    ++i;
  }
}

TEST(SplitW, PlainWordsAndEmptyTerm) {
  CSplit s;
  s.SplitW(u"RIVER");
  ExpectPieces(s, {{u"RIVER", K::kLiteral, 0}});
  EXPECT_TRUE(s.IsPlainWord());
  EXPECT_EQ(s.StartKind(), K::kLiteral);

  s.SplitW(u"");
  EXPECT_TRUE(s.Pieces().empty());
  EXPECT_EQ(s.StartKind(), K::kLiteral);
  EXPECT_FALSE(s.IsPlainWord());
}

TEST(SplitW, PiecesAndKinds) {
  CSplit s;
  s.SplitW(u"*RI??ER*S");
  EXPECT_TRUE(s.LeadingAsterisk());
  EXPECT_FALSE(s.TrailingAsterisk());
  ExpectPieces(s, {{u"RI", K::kAfterAsterisk, 0}, {u"ER", K::kAfterQuestionMarks, 2}, {u"S", K::kAfterAsterisk, 0}});
  EXPECT_FALSE(s.IsPlainWord());

  s.SplitW(u"???AB");
  EXPECT_EQ(s.StartKind(), K::kAfterQuestionMarks);
  EXPECT_EQ(s.StartCount(), 3);
  ExpectPieces(s, {{u"AB", K::kAfterQuestionMarks, 3}});

  // A run with an asterisk in it matches any length.
  s.SplitW(u"A?*?B");
  ExpectPieces(s, {{u"A", K::kLiteral, 0}, {u"B", K::kAfterAsterisk, 2}});
}

TEST(SplitW, TrailingWildcards) {
  CSplit s;
  s.SplitW(u"RIVER*");
  EXPECT_TRUE(s.TrailingAsterisk());
  EXPECT_FALSE(s.TrailingQuestionMarks());
  // A prefix pattern is not an exact word.
  EXPECT_FALSE(s.IsPlainWord());
  ExpectPieces(s, {{u"RIVER", K::kLiteral, 0}});

  // A single trailing question mark is kept: the term is not the word RIVE.
  s.SplitW(u"RIVE?");
  EXPECT_TRUE(s.TrailingQuestionMarks());
  EXPECT_EQ(s.TrailingQuestionMarkCount(), 1);
  EXPECT_FALSE(s.IsPlainWord());

  s.SplitW(u"RIV???");
  EXPECT_EQ(s.TrailingQuestionMarkCount(), 3);

  s.SplitW(u"RIV?*?");
  EXPECT_TRUE(s.TrailingAsterisk());
  EXPECT_FALSE(s.TrailingQuestionMarks());
}

TEST(SplitW, EscapedWildcardsAreLiteral) {
  CSplit s;
  s.SplitW(u"A\\*B\\?C\\#D\\E");
  ExpectPieces(s, {{u"A*B?C#DE", K::kLiteral, 0}});
  EXPECT_TRUE(s.IsPlainWord());

  // An escaped question mark at the end is not a trailing wildcard.
  s.SplitW(u"WHY\\?");
  EXPECT_FALSE(s.TrailingQuestionMarks());
  EXPECT_TRUE(s.IsPlainWord());
  ExpectPieces(s, {{u"WHY?", K::kLiteral, 0}});

  s.SplitW(u"A\\??");
  EXPECT_EQ(s.TrailingQuestionMarkCount(), 1);
  ExpectPieces(s, {{u"A?", K::kLiteral, 0}});
}

TEST(SplitW, MoreThanElevenPiecesIsAnError) {
  CSplit s;
  s.SplitW(u"A*B*C*D*E*F*G*H*I*J*K");
  EXPECT_EQ(s.Pieces().size(), 11u);
  try {
    s.SplitW(u"A*B*C*D*E*F*G*H*I*J*K*L");
    FAIL() << "no error";
  } catch (const CStringFuncUException& e) {
    EXPECT_EQ(e.GetCurrentEntry().text, u"Too many words (Module:StringFuncU,Method:CSplit::SplitW)");
  }
  EXPECT_TRUE(s.Pieces().empty());
}

}  // namespace
}  // namespace qm
