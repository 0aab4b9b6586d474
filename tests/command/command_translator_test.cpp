#include <string>

#include "translator_fixture.h"

namespace qm::test {
namespace {

TEST_F(TranslatorTest, ColumnWordsAreJoinedWithoutBlanksAcrossLines) {
  Translate("CREATE FINDEX Books ON TABLE t COLUMNS a b KEY id");
  EXPECT_EQ(findex.Columns, (ColumnMap{{"ab", {}}}));
  Translate("CREATE FINDEX Books\r\n\tON TABLE books\n  COLUMNS title:CONTENT_WEIGHT\n =\t3,\n"
            "  body:BASE_URL = \"http://host/docs/\"\nKEY id");
  EXPECT_EQ(findex.Columns, (ColumnMap{{"body", {{"BASE_URL", "http://host/docs/"}}},
                                       {"title", {{"CONTENT_WEIGHT", "3"}}}}));
  // KEY = id becomes the one word KEY=id, so no KEY word is found.
  EXPECT_EQ(Refuse("CREATE FINDEX Books ON TABLE t COLUMNS title KEY = id").number, 13);
}

TEST_F(TranslatorTest, PassThroughSqlKeepsTheHostsText) {
  const std::string sql = "create index ix ON books (title)\n  WHERE kind = 'a = b' AND x = \"q";
  Translate(sql);
  EXPECT_EQ(cmd.CmdType(), kCmdPassThroughSql);
  EXPECT_EQ(Utf16ToUtf8(cmd.PassThroughSql()), sql);
  Translate("CREATE THING x");
  EXPECT_EQ(cmd.CmdType(), kCmdNotRecognised);
  EXPECT_TRUE(cmd.PassThroughSql().empty());
}

TEST_F(TranslatorTest, ConnectSetGroupAndConnectionString) {
  Translate("CONNECT books_dsn EMPTY s3cret extra");
  EXPECT_EQ(cmd.CmdType(), kCmdConnect);
  EXPECT_EQ(connection.UserId, "");
  EXPECT_EQ(connection.Password, "s3cret");
  EXPECT_EQ(connection.Mode, ConnectionMode::Dsn);
  EXPECT_TRUE(connection.IsSet);
  Translate("CONNECT \"My Books\" \"o\"\"brien\"");
  EXPECT_EQ(connection.Dsn, "My Books");
  EXPECT_EQ(connection.UserId, "o\"brien");
  EXPECT_EQ(connection.Password, "");

  Translate("SET GROUP Sales");
  EXPECT_EQ(cmd.CmdType(), kCmdSetGroup);
  EXPECT_EQ(connection.Group, "Sales");
  connection.DisplayName = "old";
  Translate("set connectionstring \"Driver=SQLite3;Database=/data/my books.db;PWD=\"\"x\"\"\"");
  EXPECT_EQ(cmd.CmdType(), kCmdSetConnectionString);
  EXPECT_EQ(connection.ConnectionString, "Driver=SQLite3;Database=/data/my books.db;PWD=\"x\"");
  EXPECT_EQ(connection.DisplayName, "");
  EXPECT_EQ(connection.Mode, ConnectionMode::ConnectionString);
  // Unquoted blanks would silently cut the connection string.
  EXPECT_EQ(Refuse("SET CONNECTIONSTRING Driver=SQLite3;Database=/data/my books.db").number, 16);
}

TEST_F(TranslatorTest, DeleteKeyIsReadInSixtyFourBits) {
  struct Case {
    const char* key;
    int32_t value;  // 0: refused with error 46
  };
  for (const Case& c : {Case{"+42abc", 42}, Case{"-2147483648", INT32_MIN}, Case{"0", 0},
                        Case{"abc", 0}, Case{"4294967297", 0}, Case{"-2147483649", 0}}) {
    SCOPED_TRACE(c.key);
    const std::string statement = std::string("DELETE FROM FINDEX Books ") + c.key;
    if (c.value == 0) {
      EXPECT_EQ(Refuse(statement).number, 46);
      continue;
    }
    Translate(statement);
    EXPECT_EQ(cmd.CmdType(), kCmdDeleteKey);
    EXPECT_EQ(cmd.DeleteKeyValue(), c.value);
  }
  Translate("UPDATE FINDEX Books");
  EXPECT_EQ(cmd.DeleteKeyValue(), 0);  // each translation starts afresh
}

TEST_F(TranslatorTest, RefusedStatementsGiveTheirNumberedError) {
  struct Case {
    const char* statement;
    int32_t number;
  };
  for (const Case& c : {
           Case{" \r\n\t ", 15}, Case{"CREATE FINDEX b ON TABLE t COLUMNS a KEY", 13},
           Case{"CREATE FINDEX \"b", 13}, Case{"DELETE FROM FINDEX b", 13},
           Case{"CREATE ORDER o ON TABLE t COLUMNS a KEY id REBUILD x", 16},
           Case{"CREATE FINDEX b ON TABLE t COLUMNS a:WEIGHT KEY id", 17},
           Case{"CREATE ORDER o ON TABLE t COLUMNS a, KEY id", 17},
           Case{"CREATE FINDEX b AT TABLE t COLUMNS a KEY id", 18},
       }) {
    SCOPED_TRACE(c.statement);
    const Refusal r = Refuse(c.statement);
    EXPECT_EQ(r.number, c.number);
    EXPECT_EQ(r.text, NumberedText(c.number));
  }
}

TEST_F(TranslatorTest, RefusedStatementsGiveTheirWrittenMessage) {
  const std::string suffix = " (Module:PiCmd,Method:TranslateW)\r\n";
  struct Case {
    const char* statement;
    const char* message;
  };
  for (const Case& c : {
           Case{"SELECT * FROM books", "Unknown command"},
           Case{"CREATE FINDEX \"My Books\"", "Spaces are not allowed in index names"},
           Case{"CREATE ORDER \"By\tTitle\" ON", "Spaces are not allowed in order names"},
           Case{"CREATE ORDER o AT TABLE t COLUMNS a KEY id", "Expected keyword <ON>"},
           Case{"CREATE FINDEX b ON TABEL t COLUMNS a KEY id", "Expected keyword <TABLE>"},
           Case{"CREATE ORDER o ON TABLE t COLS a KEY id", "Expected keyword <COLUMNS>"},
       }) {
    SCOPED_TRACE(c.statement);
    const Refusal r = Refuse(c.statement);
    EXPECT_EQ(r.number, 1);
    EXPECT_EQ(r.text, c.message + suffix);
  }
  // The shipped text itself, with module and method filled in.
  EXPECT_EQ(Refuse("DELETE FROM FINDEX Books 0").text,
            "Invalid key in DELETE FROM FINDEX: the key must be a non-zero integer within the "
            "32-bit range (Module:PiCmd,Method:TranslateW)\r\n");
}

TEST_F(TranslatorTest, StatementOfMoreThanTwoHundredWordsIsRefusedWhole) {
  auto statement_with_columns = [](int columns) {
    std::string s = "CREATE FINDEX b ON TABLE t COLUMNS";
    for (int i = 0; i < columns; ++i) s += " c" + std::to_string(i) + ",";
    return s + " last KEY id";
  };
  Translate(statement_with_columns(190));  // 7 + 191 + 2 = 200 words
  EXPECT_EQ(findex.Columns.size(), 191u);
  EXPECT_EQ(Refuse(statement_with_columns(191)).text,
            "Statement has too many words: 201 words found, at most 200 are allowed "
            "(Module:PiCmd,Method:TranslateW)\r\n");
}

}  // namespace
}  // namespace qm::test
