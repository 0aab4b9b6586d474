#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "command/statement_mask.h"
#include "command/statement_words.h"
#include "platform/text_encoding.h"
#include "base/trace.h"
#include "support/test_support.h"
#include "translator_fixture.h"

namespace qm::test {
namespace {

TEST(StatementNormalisation, BlanksAroundEqualsGoOnlyOutsideQuotes) {
  auto normalized = [](std::u16string_view s) { return Utf16ToUtf8(NormalizeStatement(s)); };
  EXPECT_EQ(normalized(u"a  =\r\n\t b = c"), "a=b=c");
  EXPECT_EQ(normalized(u"x = 'p = q' y = \"p = q\""), "x='p = q' y=\"p = q\"");
  EXPECT_EQ(normalized(u"it\"s = 'a'\" = b"), "it\"s = 'a'\"=b");  // ' inside "..." is no quote
  EXPECT_EQ(normalized(u"a\r\nb\tc \"d\r\n\te\""), "a  b c \"d\r\n\te\"");
  const StatementSplit split = SplitStatement(u"a \"b c");
  EXPECT_EQ(split.words.size(), 2u);
  EXPECT_TRUE(split.unterminated_quote);
}

TEST(StatementMasking, PasswordsNeverReachTheTraceText) {
  EXPECT_EQ(Utf16ToUtf8(MaskStatementForTrace(u"connect dsn user TopSecret")),
            "connect dsn user ****");
  EXPECT_EQ(Utf16ToUtf8(MaskStatementForTrace(
                u"SET CONNECTIONSTRING \"DSN=x;pwd = my \"\"pass\"\" word;UID=u\" tail")),
            "SET CONNECTIONSTRING \"DSN=x;pwd = ****;UID=u\" tail");
  EXPECT_EQ(Utf16ToUtf8(MaskStatementForTrace(u"SET CONNECTIONSTRING DSN=x;Password=abc next")),
            "SET CONNECTIONSTRING DSN=x;Password=**** next");
  EXPECT_EQ(Utf16ToUtf8(MaskConnectionSecrets(u"Driver=d;PWD={a;b}}c};PASSWORD=x y;OLDPWD=z")),
            "Driver=d;PWD=****;PASSWORD=****;OLDPWD=z");
}

TEST_F(TranslatorTest, TraceLinesOfStatementsMaskPasswords) {
  ConfiguredHome home;
  const bool saved1 = TraceLevel1, saved3 = TraceLevel3;
  TraceLevel1 = true;
  TraceLevel3 = true;
  Translate("CONNECT mydsn user TopSecret1");
  Translate("SET CONNECTIONSTRING \"DSN=x;PWD=TopSecret2\"");
  Refuse("BOGUS x PWD = TopSecret3");
  TraceLevel1 = saved1;
  TraceLevel3 = saved3;

  std::string log;
  for (const auto& f : std::filesystem::directory_iterator(home.Home() + "Log")) {
    log += ReadFile(f.path().string());
  }
  EXPECT_NE(log.find("cmd.SplitStrW - Spliting. Word: ****"), std::string::npos);
  EXPECT_NE(log.find("Could not find command. Statement: BOGUS x PWD=****, Words: 3"),
            std::string::npos);
  EXPECT_EQ(log.find("TopSecret"), std::string::npos);
}

}  // namespace
}  // namespace qm::test
