#include <gtest/gtest.h>

#include <string>

#include "support/test_support.h"

namespace qm::test {
namespace {

TEST(TranslateTool, PrintsTheCommandRecordWithPasswordsMasked) {
  std::string out;
  ASSERT_EQ(RunProgram({QM_CLI_PATH, "translate", "CREATE FINDEX Books ON TABLE books COLUMNS",
                        "title:CONTENT_WEIGHT=3,body KEY id"},
                       &out),
            0);
  for (const char* line : {"command type: 24 ", "findex: Books\n", "table: books\n",
                           "  title CONTENT_WEIGHT=3\n", "  body\n", "key: id\n",
                           "lock: MORVIL_SYNCHRONIZE_CREATEBooks\n"}) {
    EXPECT_NE(out.find(line), std::string::npos) << line << " in\n" << out;
  }
  ASSERT_EQ(RunProgram({QM_CLI_PATH, "translate", "CONNECT dsn user Hidden1"}, &out), 0);
  EXPECT_NE(out.find("password: ****\n"), std::string::npos);
  EXPECT_EQ(out.find("Hidden"), std::string::npos);
}

TEST(TranslateTool, ErrorTextOnStandardErrorAndUsage) {
  std::string err;
  EXPECT_EQ(RunProgram({"/bin/sh", "-c", "\"$0\" translate \"$1\" 2>&1 >/dev/null", QM_CLI_PATH,
                        "DELETE FROM FINDEX Books 0"},
                       &err),
            1);
  EXPECT_EQ(err,
            "Invalid key in DELETE FROM FINDEX: the key must be a non-zero integer within the "
            "32-bit range (Module:PiCmd,Method:TranslateW)\n");
  EXPECT_EQ(RunProgram({QM_CLI_PATH, "translate"}, &err), 2);
}

}  // namespace
}  // namespace qm::test
