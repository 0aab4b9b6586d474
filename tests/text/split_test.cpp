// Search terms cut at their wildcards.
#include <gtest/gtest.h>

#include <string>

#include "platform/text_encoding.h"
#include "shared/exception_family.h"
#include "text/split.h"

namespace qm {
namespace {

// "start kind/count | piece kind/count:text ... | flags"
std::string Describe(std::u16string_view term) {
  CSplit s;
  s.SplitW(term);
  std::string out = std::to_string(static_cast<int>(s.StartKind())) + "/" + std::to_string(s.StartCount()) + " |";
  for (const auto& p : s.Pieces()) {
    out += " " + std::to_string(static_cast<int>(p.kind)) + "/" + std::to_string(p.count) + ":" + Utf16ToUtf8(p.text);
  }
  out += " |";
  if (s.TrailingAsterisk()) out += " *";
  if (s.TrailingQuestionMarks()) out += " ?" + std::to_string(s.TrailingQuestionMarkCount());
  if (s.IsPlainWord()) out += " plain";
  return out;
}

TEST(SplitW, PiecesKindsAndFlags) {
  EXPECT_EQ(Describe(u""), "3/0 | |");
  EXPECT_EQ(Describe(u"RIVER"), "3/0 | 3/0:RIVER | plain");
  EXPECT_EQ(Describe(u"*RI??ER*S"), "1/0 | 1/0:RI 2/2:ER 1/0:S |");
  EXPECT_EQ(Describe(u"???AB"), "2/3 | 2/3:AB |");
  // A run that holds an asterisk matches any length.
  EXPECT_EQ(Describe(u"A?*?B"), "3/0 | 3/0:A 1/2:B |");
  // A prefix pattern is not an exact word.
  EXPECT_EQ(Describe(u"RIVER*"), "3/0 | 3/0:RIVER | *");
  EXPECT_EQ(Describe(u"RIV?*?"), "3/0 | 3/0:RIV | *");
  // A single trailing question mark is kept: RIVE? is not the word RIVE.
  EXPECT_EQ(Describe(u"RIVE?"), "3/0 | 3/0:RIVE | ?1");
  EXPECT_EQ(Describe(u"RIV???"), "3/0 | 3/0:RIV | ?3");
}

TEST(SplitW, EscapedWildcardsAreLiteral) {
  EXPECT_EQ(Describe(u"A\\*B\\?C\\#D\\E"), "3/0 | 3/0:A*B?C#DE | plain");
  EXPECT_EQ(Describe(u"WHY\\?"), "3/0 | 3/0:WHY? | plain");
  EXPECT_EQ(Describe(u"A\\??"), "3/0 | 3/0:A? | ?1");
  // A stray backslash still makes a piece: an empty one after the asterisk.
  EXPECT_EQ(Describe(u"A*\\"), "3/0 | 3/0:A 1/0: |");
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
