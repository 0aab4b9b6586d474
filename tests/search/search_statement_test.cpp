// Search statements: how the bracketed condition becomes a condition tree,
// what is refused, and the SQL rebuilt from the keys a search found.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "base/exception_family.h"
#include "platform/text_encoding.h"
#include "search/cmd_tree.h"
#include "search/condition_shape.h"
#include "support/raised_error.h"
#include "text/language.h"
#include "text/separators.h"

namespace qm {
namespace {

using test::Raised;
using test::Shape;

// The catalogue of these tests: text findexes TITLE, BODY, A, B, C, T with
// the default separators and no stop words; STOPPED the same with English
// stop words; ID an Integer findex.
GiFindexFacts FactsOf(const std::u16string& name) {
  GiFindexFacts facts;
  facts.separators = u" " + std::u16string(kDefaultSeparatorPunctuation);
  facts.findex_type = 2;
  facts.language_options = 0;
  if (name == u"STOPPED") facts.language_options = CLanguage::kUseStopWords;
  if (name == u"ID") facts.findex_type = 1;
  if (name == u"MISSING") {
    throw CGiRepositoryException::Text("Findex %s not found", "OpenRepository", nullptr, name);
  }
  return facts;
}

CGiCmdTree NewCommand() {
  return CGiCmdTree(std::string(QM_SOURCE_DATA_DIR) + "Language/", FactsOf);
}

std::u16string Statement(const std::string& condition) {
  return Utf8ToUtf16("SELECT ID FROM DOCS WHERE [" + condition + "]");
}

std::string ShapeOf(const std::string& condition) {
  CGiCmdTree command = NewCommand();
  command.SplitSqlW(Statement(condition));
  return Shape(command.Root());
}

struct ShapeCase {
  const char* condition;
  const char* shape;
};

TEST(SearchStatement, ConditionsGroupAsTheGrammarSays) {
  const ShapeCase cases[] = {
      {"TITLE='a' OR BODY='b' AND BODY='c'", "OR(TITLE{A},AND(BODY{B},BODY{C}))"},
      {"A='x' AND B='y' AND C='z'", "AND(A{X},AND(B{Y},C{Z}))"},
      {"A='x' || B='y' && C='z'", "OR(A{X},AND(B{Y},C{Z}))"},
      {"(A='x' OR B='y') AND C='z'", "AND(OR(A{X},B{Y}),C{Z})"},
      {"A='x' OR (B='y' AND C='z')", "OR(A{X},AND(B{Y},C{Z}))"},
      {"A='x' FILTER B='y' OR C='z'", "OR(FILTER(A{X},B{Y}),C{Z})"},
      {"A='x' AND B='y' FILTER C='z'", "FILTER(AND(A{X},B{Y}),C{Z})"},
      {"( ( TITLE='x' ) )", "TITLE{X}"},
      {"TITLE = 'word'", "TITLE{WORD}"},
      {"title=word", "TITLE{WORD}"},
      {"BODY='a' NEAR/3 BODY='b'", "NEAR3(BODY{A},BODY{B})"},
      {"BODY='a' NEAR BODY='b'", "NEAR10(BODY{A},BODY{B})"},
      {"TITLE='x OR y'", "TITLE{ADJ(X,ADJ(OR,Y))}"},
      // A findex whose name begins with NOT is no negation.
      {"NOTES='x'", "NOTES{X}"},
      // Inside a value of an Integer findex, operators join values.
      {"ID='5' OR '7'", "ID{OR(5,7)}"},
      {"ID='5' AND NOT '7'", "ID{ANDNOT(5,7)}"},
      {"ID='5' NEAR/2 '7'", "ID{NEAR2(5,7)}"},
  };
  for (const ShapeCase& c : cases) {
    EXPECT_EQ(ShapeOf(c.condition), c.shape) << c.condition;
  }
}

TEST(SearchStatement, NoNegationReachesEvaluation) {
  const ShapeCase cases[] = {
      {"TITLE!='x'", "FILTERNOT(TITLE{*},TITLE{X})"},
      {"TITLE=!'x'", "FILTERNOT(TITLE{*},TITLE{X})"},
      {"TITLE<>'x'", "FILTERNOT(TITLE{*},TITLE{X})"},
      {"NOT TITLE='x'", "FILTERNOT(TITLE{*},TITLE{X})"},
      {"BODY='a' AND TITLE!='x'", "ANDNOT(BODY{A},TITLE{X})"},
      {"BODY='a' AND NOT TITLE='x'", "ANDNOT(BODY{A},TITLE{X})"},
      {"BODY='a' FILTER NOT TITLE='x'", "FILTERNOT(BODY{A},TITLE{X})"},
      {"A='1' AND NOT B='2' AND NOT C='3'", "ANDNOT(A{1},ANDNOT(B{2},C{3}))"},
      {"A='1' OR NOT B='2'", "OR(A{1},FILTERNOT(B{*},B{2}))"},
      {"NOT (B='2' OR C='3')", "FILTERNOT(B{*},OR(B{2},C{3}))"},
      {"NOT NOT A='1'", "FILTERNOT(A{*},FILTERNOT(A{*},A{1}))"},
  };
  for (const ShapeCase& c : cases) {
    EXPECT_EQ(ShapeOf(c.condition), c.shape) << c.condition;
  }
}

TEST(SearchStatement, TextValuesBecomePhrasesOfWords) {
  const ShapeCase cases[] = {
      {"TITLE='a b c'", "TITLE{ADJ(A,ADJ(B,C))}"},
      {"TITLE='  red   wine  '", "TITLE{ADJ(RED,WINE)}"},
      {"TITLE='red, (white) wine.'", "TITLE{ADJ(RED,ADJ(WHITE,WINE))}"},
      {"TITLE='it''s'", "TITLE{IT'S}"},
      {"TITLE='fish*'", "TITLE{FISH*}"},
      {"TITLE='big fi?h'", "TITLE{ADJ(BIG,FI?H)}"},
      {"TITLE='a\\-b'", "TITLE{ADJ(A,B)}"},
      {"STOPPED='the river'", "STOPPED{RIVER}"},
      {"STOPPED='river of the life'", "STOPPED{ADJ(RIVER,LIFE)}"},
      {"ID='a b'", "ID{A B}"},
  };
  for (const ShapeCase& c : cases) {
    EXPECT_EQ(ShapeOf(c.condition), c.shape) << c.condition;
  }
}

TEST(SearchStatement, ALongWordIsCut) {
  const std::string word(250, 'W');
  EXPECT_EQ(ShapeOf("ID='" + word + "'"), "ID{" + std::string(195, 'W') + "}");
  const std::string fits(200, 'W');
  EXPECT_EQ(ShapeOf("ID='" + fits + "'"), "ID{" + fits + "}");
}

TEST(SearchStatement, ComparisonsAndModifiers) {
  const ShapeCase cases[] = {
      {"TITLE>='m'", "TITLE~65:-1{M}"},
      {"TITLE>'m'", "TITLE~64:-1{M}"},
      {"TITLE<'m'", "TITLE~128:-1{M}"},
      {"TITLE<='m'", "TITLE~129:-1{M}"},
      {"TITLE=~'word'", "TITLE~5:-1{WORD}"},
      {"TITLE=^'word'", "TITLE~9:-1{WORD}"},
      {"TITLE=^2 'word'", "TITLE~9:2{WORD}"},
      {"TITLE=~99999'word'", "TITLE~5:99999{WORD}"},
      {"TITLE=|4'red wine'", "TITLE~17:4{ADJ(RED,WINE)}"},
      {"TITLE=?'word'", "TITLE~3:-1{WORD}"},
      {"TITLE=?~7'word'", "TITLE~7:7{WORD}"},
  };
  for (const ShapeCase& c : cases) {
    EXPECT_EQ(ShapeOf(c.condition), c.shape) << c.condition;
  }
}

TEST(SearchStatement, PlainQueriesBecomeConditions) {
  struct Case {
    const char* plain;
    const char* condition;
  };
  const Case cases[] = {
      {"red wine", "T='red' AND T='wine'"},
      {"red AND wine", "T='red' AND T='wine'"},
      {"red OR wine", "T='red' OR T='wine'"},
      {"NOT red", "T='*' AND NOT T='red'"},
      {"red NOT wine", "T='red' AND NOT T='wine'"},
      {"red OR NOT wine", "T='red' OR  NOT T='wine'"},
      {"(red OR white) wine", "(T='red' OR T='white') AND T='wine'"},
      {"~3fish %2chips", "T=|3'fish' AND T=^2'chips'"},
      {"\"red wine\"   bottle", "T='red wine' AND T='bottle'"},
      {"red NEAR/4 wine", "T='red' NEAR/4 T='wine'"},
      {"don't", "T='don''t'"},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(Utf16ToUtf8(CGiCmdTree::ParsePlainQueryW(Utf8ToUtf16(c.plain), u"T")),
              c.condition)
        << c.plain;
  }
  const ShapeCase parsed[] = {
      {"T=$'red wine'", "AND(T{RED},T{WINE})"},
      {"T=$'\"red wine\" OR cheese'", "OR(T{ADJ(RED,WINE)},T{CHEESE})"},
      {"T=$'don''t ~2stop'", "AND(T{DON'T},T~17:2{STOP})"},
      {"T=$'NOT red'", "ANDNOT(T{*},T{RED})"},
  };
  for (const ShapeCase& c : parsed) {
    EXPECT_EQ(ShapeOf(c.condition), c.shape) << c.condition;
  }
}

TEST(SearchStatement, PrintedTrees) {
  struct Case {
    const char* condition;
    const char* printed;
  };
  const Case cases[] = {
      {"TITLE='a' OR BODY='b' AND BODY='c'", "'A' OR ('B' AND 'C')"},
      {"(A='x' OR B='y') AND C='z'", "('X' OR 'Y') AND 'Z'"},
      {"((TITLE='x'))", "'X'"},
      {"TITLE='red wine'", "'RED WINE'"},
      {"A='x' FILTER B='y'", "'X' FILTER 'Y'"},
      {"A='x' AND NOT B='y'", "'X' OPERATOR 'Y'"},
      {"ID='(x'", "'(X'"},
  };
  for (const Case& c : cases) {
    CGiCmdTree command = NewCommand();
    command.SplitSqlW(Statement(c.condition));
    EXPECT_EQ(Utf16ToUtf8(command.TreeToString()), c.printed) << c.condition;
  }
}

TEST(SearchStatement, PartsCountOutsideFiltersAndNegations) {
  struct Case {
    const char* condition;
    int32_t parts;
  };
  const Case cases[] = {
      {"A='x'", 1},
      {"A='x' OR B='y' AND C='z'", 3},
      {"TITLE='red wine'", 1},
      {"A='x' AND NOT B='y'", 1},
      {"NOT A='x'", 0},
      {"A='x' FILTER B='y'", 0},
      {"(A='x' AND B='y') FILTER C='z'", 0},
      {"A='x' OR (B='y' FILTER C='z')", 1},
      {"A='x' NEAR B='y'", 2},
  };
  for (const Case& c : cases) {
    CGiCmdTree command = NewCommand();
    command.SplitSqlW(Statement(c.condition));
    EXPECT_EQ(command.PartCount(), c.parts) << c.condition;
  }
}

TEST(SearchStatement, StatementSplitsAroundTheCondition) {
  struct Case {
    const char* statement;
    const char* head;
    const char* tail;
    bool score;
    const char* order;
    const char* shape;
  };
  const Case cases[] = {
      {"SELECT ID FROM T WHERE [TITLE='x'] AND A=1", "SELECT ID FROM T WHERE ", " AND A=1",
       false, "", "TITLE{X}"},
      {"SELECT [SCORE],ID,TITLE FROM DOCS WHERE [BODY='wine' ORDER BY SCORE]",
       "SELECT SCORE,ID,TITLE FROM DOCS WHERE ", "", true, "SCORE", "BODY{WINE}"},
      {"SELECT [ score ],ID FROM T WHERE [\n TITLE='x'\t] ORDER BY ID",
       "SELECT SCORE,ID FROM T WHERE ", " ORDER BY ID", true, "", "TITLE{X}"},
      {"SELECT ID FROM T WHERE D=#[# AND [TITLE='y']", "SELECT ID FROM T WHERE D=#[# AND ", "",
       false, "", "TITLE{Y}"},
      {"SELECT ID FROM T WHERE N='[x]' AND [TITLE='y']", "SELECT ID FROM T WHERE N='[x]' AND ",
       "", false, "", "TITLE{Y}"},
      {"SELECT ID FROM T WHERE [ID='a]b'] AND D=#2001-01-01#", "SELECT ID FROM T WHERE ",
       " AND D=#2001-01-01#", false, "", "ID{A]B}"},
      {"SELECT ID FROM T WHERE [TITLE='x' order by title desc, score]",
       "SELECT ID FROM T WHERE ", "", false, "TITLE DESC, SCORE", "TITLE{X}"},
      {"SELECT ID FROM T WHERE [TITLE='x' ORDER BY BOOKS.YEAR DESC]", "SELECT ID FROM T WHERE ",
       "", false, "BOOKS.YEAR DESC", "TITLE{X}"},
      {"SELECT ID FROM T WHERE [TITLE='x order y']", "SELECT ID FROM T WHERE ", "", false, "",
       "TITLE{ADJ(X,ADJ(ORDER,Y))}"},
  };
  for (const Case& c : cases) {
    CGiCmdTree command = NewCommand();
    command.SplitSqlW(Utf8ToUtf16(c.statement));
    EXPECT_EQ(Utf16ToUtf8(command.SqlHead()), c.head) << c.statement;
    EXPECT_EQ(Utf16ToUtf8(command.SqlTail()), c.tail) << c.statement;
    EXPECT_EQ(command.HasScoreColumn(), c.score) << c.statement;
    EXPECT_EQ(Utf16ToUtf8(command.OrderList()), c.order) << c.statement;
    EXPECT_EQ(command.HasOrder(), *c.order != '\0') << c.statement;
    EXPECT_EQ(Shape(command.Root()), c.shape) << c.statement;
  }
}

TEST(SearchStatement, OrderListForTheDatabase) {
  CGiCmdTree command = NewCommand();
  command.SplitSqlW(u"SELECT ID FROM T WHERE [TITLE='x' ORDER BY TITLE DESC,SCORE DESC,ID]");
  EXPECT_EQ(Utf16ToUtf8(command.RebuildOrderList(0)), "TITLE DESC,SCORE DESC,ID");
  EXPECT_EQ(Utf16ToUtf8(command.RebuildOrderList(1)), "TITLE DESC,ID");
  command.SplitSqlW(u"SELECT ID FROM T WHERE [TITLE='x' ORDER BY TITLE,SCORE]");
  EXPECT_EQ(Utf16ToUtf8(command.RebuildOrderList(1)), "TITLE");
}

TEST(SearchStatement, SqlRebuiltFromKeys) {
  struct Case {
    const char* statement;
    const char* keys;
    bool score;
    const char* sql;
  };
  const char* scored = "SELECT [SCORE],ID,TITLE FROM DOCS WHERE [BODY='wine' ORDER BY SCORE]";
  const Case cases[] = {
      {scored, "80;(12,17);40;(5);", true,
       "SELECT 80 as SCORE,ID,TITLE FROM DOCS WHERE ID in (12,17)  UNION ALL "
       "SELECT 40 as SCORE,ID,TITLE FROM DOCS WHERE ID in (5) "},
      {scored, "(12,17)", false, "SELECT ID,TITLE FROM DOCS WHERE ID in (12,17) "},
      {scored, "", true, "SELECT 0 as SCORE,ID,TITLE FROM DOCS WHERE 1=2 "},
      {scored, "0;());", true, "SELECT 0 as SCORE,ID,TITLE FROM DOCS WHERE 1=2 "},
      {scored, "()", false, "SELECT ID,TITLE FROM DOCS WHERE 1=2 "},
      {"SELECT ID,[SCORE] FROM T WHERE [BODY='x'] AND Y=1", "()", true,
       "SELECT ID,0 as SCORE FROM T WHERE 1=2  AND Y=1"},
      {"SELECT ID,[SCORE] FROM T WHERE [BODY='x']", "(3)", false,
       "SELECT ID FROM T WHERE ID in (3) "},
      {"SELECT MYSCORE,ID FROM T WHERE [BODY='x']", "(1)", false,
       "SELECT MYSCORE,ID FROM T WHERE ID in (1) "},
  };
  for (const Case& c : cases) {
    CGiCmdTree command = NewCommand();
    command.SplitSqlW(Utf8ToUtf16(c.statement));
    command.RebuildSql(Utf8ToUtf16(c.keys), c.score, u"ID");
    EXPECT_EQ(Utf16ToUtf8(command.Condition()), c.sql) << c.statement << " / " << c.keys;
  }
}

struct ErrorCase {
  std::string statement;
  int32_t number;
  std::string text;
};

TEST(SearchStatement, RefusedStatements) {
  const auto method = [](const char* m) {
    return std::string(" (Module:GiCmdTree,Method:") + m + ")";
  };
  const ErrorCase cases[] = {
      {"SELECT ID FROM T WHERE []", 52, ""},
      {"SELECT ID FROM T WHERE [ \t ]", 52, ""},
      {"SELECT [SCORE],ID FROM T WHERE []", 52, ""},
      {"SELECT ID FROM T", 52, ""},
      {"SELECT ID FROM T WHERE [ ORDER BY ID]", 1,
       "Missing character \"=\", \"<\" or \">\"" + method("GetEQW")},
      {"SELECT ID FROM T WHERE [(TITLE='x']", 1,
       "Parentheses do not match" + method("RemoveParenthesesW")},
      {"SELECT ID FROM T WHERE [TITLE='x')]", 1,
       "Parentheses do not match" + method("HideExpW")},
      {"SELECT ID FROM T WHERE [(A='x') AND (B='y']", 1,
       "Parentheses do not match" + method("HideExpW")},
      {"SELECT ID FROM T WHERE [TITLE='x]", 1,
       "Illegal or missing end of phrase character \"'\"" + method("HideExpW")},
      {"SELECT ID FROM T WHERE [TITLE 'x']", 1,
       "Missing character \"=\", \"<\" or \">\"" + method("GetEQW")},
      {"SELECT ID FROM T WHERE [(B) AND A='x']", 1,
       "Missing character \"=\", \"<\" or \">\"" + method("GetEQW")},
      {"SELECT ID FROM T WHERE [TITLE=~123456'x']", 1,
       "Modifier number has more than 5 digits" + method("GetEQW")},
      {"SELECT ID FROM T WHERE [A='x' NEAR/123456 B='y']", 1,
       "NEAR distance has more than 5 digits" + method("StartBuildTreeW")},
      {"SELECT ID FROM T WHERE [TITLE='a' OR 'b']", 1,
       "Illegal character outside phrase" + method("ReplacePhraseBlankW")},
      {"SELECT ID FROM T WHERE [A/B='x']", 1, "Invalid findex name \"A/B\": "},
      {"SELECT ID FROM T WHERE [A='x' ORDER BY ID, A/B.COL DESC]", 1,
       "Invalid order name \"A/B\": "},
      {"SELECT ID FROM T WHERE [" + std::string(200, 'N') + "='x']", 1,
       "Findex name longer than 199 characters: " + std::string(60, 'N') +
           method("StartBuildTreeW")},
      {"SELECT ID FROM T WHERE [" + std::string(kGiMaxConditionDepth + 5, '(') + "A='x'" +
           std::string(kGiMaxConditionDepth + 5, ')') + "]",
       1, "Search condition nested too deeply" + method("RemoveParenthesesW")},
  };
  for (const ErrorCase& c : cases) {
    CGiCmdTree command = NewCommand();
    const auto raised =
        Raised<CGiCmdTreeException>([&] { command.SplitSqlW(Utf8ToUtf16(c.statement)); });
    EXPECT_EQ(raised.number, c.number) << c.statement;
    EXPECT_EQ(raised.text.substr(0, c.text.size()), c.text) << c.statement;
    EXPECT_FALSE(command.IsParsed()) << c.statement;
  }
}

TEST(SearchStatement, AFailedParseLeavesNoTree) {
  CGiCmdTree command = NewCommand();
  command.SplitSqlW(Statement("TITLE='x'"));
  ASSERT_TRUE(command.IsParsed());
  EXPECT_THROW(command.SplitSqlW(Statement("TITLE='x' AND (")), CGiCmdTreeException);
  EXPECT_FALSE(command.IsParsed());
  const auto raised = Raised<CGiCmdTreeException>([&] { (void)command.TreeToString(); });
  EXPECT_EQ(raised.text,
            "Could not print statement. Statement has not been parsed "
            "(Module:GiCmdTree,Method:TreeToString)");
}

TEST(SearchStatement, LongChainsAreRefusedNotOverflowed) {
  std::string condition = "A='x'";
  for (int i = 0; i < kGiMaxConditionDepth + 10; ++i) condition += " AND A='x'";
  CGiCmdTree command = NewCommand();
  const auto raised =
      Raised<CGiCmdTreeException>([&] { command.SplitSqlW(Statement(condition)); });
  EXPECT_EQ(raised.text.rfind("Search condition nested too deeply", 0), 0u) << raised.text;
}

TEST(SearchStatement, LookupFailuresKeepTheirCause) {
  CGiCmdTree command = NewCommand();
  try {
    command.SplitSqlW(Statement("A='x' OR MISSING='y'"));
    FAIL() << "no error";
  } catch (const CGiCmdTreeException& e) {
    ASSERT_GE(e.GetEntries().size(), 2u);
    EXPECT_EQ(Utf16ToUtf8(e.GetEntries().front().text),
              "General Error (Module:GiCmdTree,Method:StartBuildTreeW)");
    EXPECT_EQ(Utf16ToUtf8(e.GetEntries()[1].text),
              "Findex MISSING not found (Module:GiRepository,Method:OpenRepository)");
  }
}

TEST(SearchStatement, FirstFindexIsFoundLeftFirst) {
  CGiCmdTree command = NewCommand();
  command.SplitSqlW(Statement("(B='1' OR C='2') AND A='3'"));
  EXPECT_EQ(Utf16ToUtf8(CGiCmdTree::FindFirstIndexW(command.Root())), "B");
  const auto word = CGiNode::Word(u"X");
  const auto raised = Raised<CGiCmdTreeException>([&] { CGiCmdTree::FindFirstIndexW(*word); });
  EXPECT_EQ(raised.text, "General Error (Module:GiCmdTree,Method:FindFirstIndexW)");
}

}  // namespace
}  // namespace qm
