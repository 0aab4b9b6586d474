// Random and malformed statements (which reach the column parsers too): the
// translator answers every one with a command record or an error of its own
// family, and the trace text never shows a CONNECT password.
#include <random>
#include <set>
#include <string>

#include "build/statement_mask.h"
#include "translator_fixture.h"

namespace qm::test {
namespace {

const std::u16string kPieces[] = {
    u"CREATE", u"update", u"FINDEX", u"ORDER", u"INDEX", u"ON", u"TABLE", u"COLUMNS", u"KEY",
    u"REBUILD", u"DROP", u"CONNECT", u"SET", u"GROUP", u"CONNECTIONSTRING", u"DELETE", u"FROM",
    u"EMPTY", u"Books", u"t", u"id", u"title", u"17", u"-0", u"99999999999", u"=", u",", u":",
    u"\"", u"\"\"", u"'", u"\r\n", u"\t", u" ", u"PWD=", u"CONTENT_WEIGHT=3", u"{", u"}", u"_ADD_1",
    u"\u00e9t\u00e9", u"\u4e2d"};

std::u16string RandomStatement(std::mt19937& rng) {
  std::u16string s;
  const int pieces = std::uniform_int_distribution<int>(0, 30)(rng);
  for (int i = 0; i < pieces; ++i) {
    if (rng() % 8 == 0) {
      // Any UTF-16 unit, lone surrogates and NUL included.
      s.push_back(static_cast<char16_t>(rng() % 0x10000));
    } else {
      s += kPieces[rng() % std::size(kPieces)];
    }
    if (rng() % 2 == 0) s.push_back(u' ');
  }
  if (rng() % 50 == 0) {  // now and then a statement far past the word limit
    for (int i = 0; i < 250; ++i) s += u" w";
  }
  return s;
}

TEST_F(TranslatorTest, RandomStatementsGiveARecordOrAnErrorOfTheFamily) {
  const std::set<int32_t> known_types = {0, 6, 8, 16, 17, 23, 24, 25, 26, 27, 28, 29};
  const std::set<int32_t> known_errors = {1, 13, 15, 16, 17, 18, 46};
  std::mt19937 rng(20240611);
  for (int round = 0; round < 20000; ++round) {
    const std::u16string statement = RandomStatement(rng);
    SCOPED_TRACE(Utf16ToUtf8(statement));
    try {
      cmd.TranslateW(statement);
      ASSERT_TRUE(known_types.count(cmd.CmdType()));
      ASSERT_LE(cmd.StatementWords(), PiCmd::kMaxWords);
      if (cmd.CmdType() == kCmdFindexDefined) {
        ASSERT_FALSE(findex.Columns.empty());
        ASSERT_FALSE(findex.Columns.begin()->first.empty());
      }
      if (cmd.CmdType() == kCmdOrderDefined) {
        ASSERT_FALSE(order.Columns.empty());
      }
      if (cmd.CmdType() == kCmdDeleteKey) {
        ASSERT_NE(cmd.DeleteKeyValue(), 0);
      }
    } catch (const CPiCmdException& e) {
      ASSERT_TRUE(known_errors.count(e.GetErrorNumber())) << e.GetErrorNumber();
    } catch (const CPiCmdUnknownException&) {
      FAIL() << "unexpected failure inside the translator";
    }

    const std::u16string secret_statement = u"CONNECT d u Zq9secret " + statement;
    ASSERT_EQ(MaskStatementForTrace(secret_statement).find(u"Zq9secret"), std::u16string::npos);
  }
}

}  // namespace
}  // namespace qm::test
